#include <cstdio>
#include <set>

#include "tests/Modules/OrvekSqlite/SqliteFixture.h"

namespace {

std::string OutputOf(const std::string& command) {
    std::string output;
    FILE* pipe = ::popen(command.c_str(), "r");
    if (pipe == nullptr)
        return output;
    for (int c = std::fgetc(pipe); c != EOF; c = std::fgetc(pipe))
        output += static_cast<char>(c);
    ::pclose(pipe);
    return output;
}

class OrvekSqlitePlugin : public SqliteFixture {};

TEST_F(OrvekSqlitePlugin, ExportsTheTwoFunctionsOfAPluginAndNothingElse) {
    const auto symbols = OutputOf("nm -D --defined-only --format=just-symbols '" + PluginPath() + "' | sort");
    EXPECT_EQ(symbols, "CreateModule\nDestoryModule\n");
}

TEST_F(OrvekSqlitePlugin, MakesObjectsThatAreIndependent) {
    MakeStore(Store());
    Loader second(PluginPath());
    ASSERT_NE(second.GetModule(), nullptr) << second.GetLastError();
    ASSERT_NE(second.GetModule(), Plugin());
    ASSERT_TRUE(Plugin()->Open(Store()) && second.GetModule()->Open(Store()));
    EXPECT_FALSE(Plugin()->ExecSql("nonsense"));
    EXPECT_EQ(second.GetModule()->GetLastErrorMsg(), "");
    EXPECT_TRUE(Plugin()->ExecSql(Insert("a")) && second.GetModule()->ExecSql(Insert("b")));
    EXPECT_EQ(Rows(Store()), "2");
}

} // namespace
