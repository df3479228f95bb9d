#include <filesystem>
#include <fstream>
#include <iostream>

#include <CLI/CLI.hpp>

#include "Tools/reportctl/commands/CommandLine.h"
#include "Tools/reportctl/pages/Command.h"
#include "Tools/reportctl/pages/Completions.h"
#include "Tools/reportctl/pages/ManPage.h"

// reportctl_pages DIRECTORY DATE writes reportctl's manual pages and completions. The build runs it; it is
// not installed.
namespace {

using reportctl::pages::Command;

void Write(const std::filesystem::path& file, const std::string& text) {
    std::filesystem::create_directories(file.parent_path());
    std::ofstream stream;
    stream.exceptions(std::ios::failbit | std::ios::badbit);
    stream.open(file, std::ios::binary);
    stream << text;
    stream.close();
}

void WriteAll(const std::filesystem::path& directory, const std::string& date) {
    int unused = 0;
    const auto app = reportctl::commands::MakeCommandLine(unused);
    const Command program = reportctl::pages::Read(*app);
    std::filesystem::remove_all(directory); // so that no page of a removed command stays
    Write(directory / "man1/reportctl.1", reportctl::pages::ManPage(program, date));
    for (const auto& command : program.commands)
        Write(directory / "man1" / (command.Name("-") + ".1"), reportctl::pages::ManPage(command, date));
    Write(directory / "bash/reportctl", reportctl::pages::BashCompletion(program));
    Write(directory / "zsh/_reportctl", reportctl::pages::ZshCompletion(program));
    Write(directory / "fish/reportctl.fish", reportctl::pages::FishCompletion(program));
}

} // namespace

int main(int argc, char** argv) {
    try {
        if (argc != 3)
            throw std::runtime_error("usage: reportctl_pages DIRECTORY DATE");
        WriteAll(argv[1], argv[2]);
        return 0;
    } catch (const std::exception& error) {
        std::cerr << "reportctl_pages: " << error.what() << "\n";
        return 1;
    }
}
