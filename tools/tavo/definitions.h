#pragma once
// The tool's definitions in plain words, for what is made from them.

#include <CLI/CLI.hpp>
#include <functional>
#include <string>
#include <string_view>
#include <vector>

namespace tool {

using Words = std::vector<std::string>;

struct Argument {
    Words names;       // "-o", "--output"; none where the place tells
    std::string value; // what it takes, such as FILE; empty for a flag
    std::string help;
    Words choices; // for the value, where they can be listed
    bool isRequired = false, isRepeated = false, hasOptionalValue = false;
    std::string standard; // the value without it
};

struct Command {
    Words path; // empty for the tool itself
    std::string help;
    std::vector<Argument> arguments;
    std::vector<Command> below;
};

// All that is not hidden.
Command CommandOf(const CLI::App& app, const Words& path = {});

// The command, then what is below it.
void ForEach(const Command& command, const std::function<void(const Command&)>& act);

std::string Replaced(std::string text, std::string_view what, std::string_view with);
std::string Joined(const Words& words, const std::string& separator);
Words SplitAt(const std::string& text, const std::string& separator);

} // namespace tool
