#pragma once

#include <cstdint>
#include <string>

#include <CLI/CLI.hpp>

#include "Tools/reportctl/store/Reports.h"

/// Options that mean the same in every command.
namespace reportctl::commands {

/// Checks that an option's text is a point in time, in one of terminal::TIME_FORMS.
CLI::Validator IsTime();

/// Reads a text that IsTime let through, in milliseconds since 1970. An age counts from now.
std::int64_t MillisecondsOf(const std::string& time);

/// --since, --until and --event.
struct FilterOptions {
    std::string since;
    std::string until;
    std::string event;

    void AddTo(CLI::App& command);
    store::ReportFilter Read() const;
};

} // namespace reportctl::commands
