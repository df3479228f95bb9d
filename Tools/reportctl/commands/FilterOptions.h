#pragma once

#include <cstdint>
#include <string>

#include <CLI/CLI.hpp>

#include "Tools/reportctl/store/Reports.h"

/// Options that several commands share and that mean the same in each of them.
namespace reportctl::commands {

/// Checks that an option's text is a point in time, in one of terminal::TIME_FORMS.
CLI::Validator IsTime();

/// Checks that an option is a whole number from `least` on, and says so: 0 or 1.
CLI::Validator IsWholeNumber(std::int64_t least);

/// The point in time that a text means, in milliseconds since 1970. IsTime must have accepted the text. An
/// age such as 2h counts back from now.
std::int64_t MillisecondsOf(const std::string& time);

/// The options --since, --until and --event.
struct FilterOptions {
    std::string since;
    std::string until;
    std::string event;

    void AddTo(CLI::App& command);
    store::ReportFilter Read() const;
};

} // namespace reportctl::commands
