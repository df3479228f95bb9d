#pragma once

#include <CLI/CLI.hpp>

namespace reportctl::commands {

/// Writes --help so that its sentences fit the terminal. Examples stay as they are.
class Help : public CLI::Formatter {
public:
    /// 0 columns: nothing is broken, so that a program that reads it finds each option on one line.
    explicit Help(std::size_t columns) : m_columns(columns) {}

    std::string make_option_desc(const CLI::Option* option) const override;
    std::string make_subcommand(const CLI::App* command) const override;
    std::string make_description(const CLI::App* command) const override;
    std::string make_footer(const CLI::App* command) const override;

private:
    std::string Described(const std::string& text) const;

    std::size_t m_columns;
};

} // namespace reportctl::commands
