#include "Tools/reportctl/commands/FilterOptions.h"

#include <charconv>
#include <optional>
#include <stdexcept>

#include <fmt/format.h>

#include "Tools/reportctl/terminal/TimeArgument.h"

namespace reportctl::commands {
namespace {

terminal::TimePoint Now() {
    return std::chrono::time_point_cast<std::chrono::milliseconds>(std::chrono::system_clock::now());
}

std::string ReasonAgainst(const std::string& text) {
    try {
        terminal::ReadTime(text, Now());
        return {};
    } catch (const std::invalid_argument& error) {
        return error.what();
    }
}

std::optional<std::int64_t> Bound(const std::string& time) {
    return time.empty() ? std::nullopt : std::optional(MillisecondsOf(time));
}

} // namespace

CLI::Validator IsTime() {
    return {ReasonAgainst, "TIME"};
}

CLI::Validator IsWholeNumber(std::int64_t least) {
    const auto reasonAgainst = [least](const std::string& text) {
        std::int64_t number = 0;
        const auto* const textEnd = text.data() + text.size();
        const auto [end, error] = std::from_chars(text.data(), textEnd, number);
        const bool isRight = error == std::errc() && end == textEnd && number >= least;
        return isRight ? "" : fmt::format("\"{}\" is no whole number from {} on", text, least);
    };
    return {reasonAgainst, least == 0 ? "NONNEGATIVE" : "POSITIVE"};
}

std::int64_t MillisecondsOf(const std::string& time) {
    return terminal::MillisecondsOf(terminal::ReadTime(time, Now()));
}

void FilterOptions::AddTo(CLI::App& command) {
    command.add_option("--since", since, std::string("Only from this time on: ") + terminal::TIME_FORMS)
        ->check(IsTime());
    command.add_option("--until", until, "Only before this time, in the same forms")->check(IsTime());
    command.add_option("--event", event, "Only events whose id begins with this");
}

store::ReportFilter FilterOptions::Read() const {
    return {.sinceMs = Bound(since), .untilMs = Bound(until), .eventPrefix = event};
}

} // namespace reportctl::commands
