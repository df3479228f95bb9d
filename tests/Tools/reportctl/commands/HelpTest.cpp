#include "Tools/reportctl/commands/Help.h"

#include <sstream>

#include <gmock/gmock.h>

#include "Tools/reportctl/commands/CommandLine.h"
#include "tests/Tools/reportctl/support/ReportctlFixture.h"

namespace {

using ::testing::HasSubstr;
using ::testing::Not;

class Help : public ReportctlFixture {
protected:
    /// All commands, those below another one included.
    static std::vector<CLI::App*> CommandsOf(CLI::App& app) {
        std::vector<CLI::App*> all;
        for (auto* command : app.get_subcommands([](CLI::App*) { return true; })) {
            all.push_back(command);
            for (auto* below : CommandsOf(*command))
                all.push_back(below);
        }
        return all;
    }

    int m_exitCode = 0;
    std::unique_ptr<CLI::App> m_app = reportctl::commands::MakeCommandLine(m_exitCode);
};

TEST_F(Help, OfEachCommandHasAnExample) {
    for (auto* command : CommandsOf(*m_app)) {
        if (command->get_parent()->get_name() == "send")
            continue; // its own examples show these two
        EXPECT_THAT(command->help(), HasSubstr("\n  reportctl ")) << command->get_name();
    }
}

TEST_F(Help, FitsATerminalOfEightyColumnsButForExamplesAndNamesOfOptions) {
    for (auto* command : CommandsOf(*m_app)) {
        command->formatter(std::make_shared<reportctl::commands::Help>(80));
        std::istringstream lines(command->help());
        for (std::string line; std::getline(lines, line);) {
            const bool isBroken =
                !line.starts_with("  reportctl ") && !line.starts_with("  tar ") && !line.starts_with("  --");
            EXPECT_TRUE(!isBroken || line.size() <= 80) << line;
        }
    }
}

TEST_F(Help, IsBrokenAtATerminalAndHasALineForEachOptionElsewhere) {
    constexpr auto SENTENCE = "Begin with the lines of this time: 10m, 2h or 90d back from now, or a date";
    EXPECT_THAT(Reportctl("tail --help").output, HasSubstr(SENTENCE));
    const auto shown = Run("script -qec \"stty cols 80; '" REPORTCTL "' tail --help\" /dev/null").output;
    EXPECT_THAT(shown, HasSubstr("Begin with the lines of this time: 10m, 2h or 90d\r\n"));
    EXPECT_THAT(shown, Not(HasSubstr(SENTENCE)));
}

} // namespace
