#pragma once
// What the tool's own definitions tell: a man page, and completion for shells. Nothing is listed twice.

#include <CLI/CLI.hpp>
#include <string>
#include <vector>

namespace tool {

// The page tavo(1), for man(7)'s macros.
std::string ManPage(const CLI::App& app);

std::vector<std::string> ShellNames();
// The script that makes one of these shells complete the tool's commands, options, systems and files.
std::string Completion(const CLI::App& app, const std::string& shell);

} // namespace tool
