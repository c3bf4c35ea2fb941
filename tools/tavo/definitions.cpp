#include "definitions.h"

#include "commands.h"
#include "position.h"

namespace tool {

std::string Replaced(std::string text, std::string_view what, std::string_view with) {
    for (std::size_t at = 0; (at = text.find(what, at)) != text.npos; at += with.size())
        text.replace(at, what.size(), with);
    return text;
}

Words SplitAt(const std::string& text, const std::string& separator) {
    Words pieces;
    std::size_t begin = 0;
    for (std::size_t end; (end = text.find(separator, begin)) != text.npos; begin = end + separator.size())
        pieces.push_back(text.substr(begin, end - begin));
    pieces.push_back(text.substr(begin));
    return pieces;
}

std::string Joined(const Words& words, const std::string& separator) {
    std::string text;
    for (const std::string& word : words) text += (text.empty() ? "" : separator) + word;
    return text;
}

namespace {

Words ChoicesOf(const std::string& value, const std::string& type) {
    if (value == "ENCODING") return EncodingNames();
    if (value == "SYSTEM") {
        Words names;
        for (TAVO::ulong32 code = 0; code < kSystems; ++code) names.push_back(NameOf(code));
        return names;
    }
    const auto begin = type.find('{'), end = type.find('}'); // how a list of choices describes itself
    return begin < end && end != type.npos ? SplitAt(type.substr(begin + 1, end - begin - 1), ",") : Words();
}

Argument ArgumentOf(const CLI::Option& option) {
    Argument argument;
    for (const std::string& name : option.get_snames()) argument.names.push_back('-' + name);
    for (const std::string& name : option.get_lnames()) argument.names.push_back("--" + name);
    const std::string type = option.get_type_name();
    if (argument.names.empty()) {
        argument.value = option.get_name(true);
    } else if (option.get_items_expected_max() > 0) {
        argument.value = type.substr(0, type.find(':'));
        if (argument.value == "UINT" || argument.value == "INT") argument.value = "N";
        argument.standard = option.get_default_str();
    }
    argument.help = option.get_description();
    argument.choices = ChoicesOf(argument.value, type);
    argument.isRequired = option.get_required();
    argument.isRepeated = argument.names.empty() && option.get_items_expected_max() > 1;
    argument.hasOptionalValue = option.get_items_expected_min() == 0;
    return argument;
}

} // namespace

Command CommandOf(const CLI::App& app, const Words& path) {
    Command command{path, app.get_description(), {}, {}};
    for (const CLI::Option* option : app.get_options()) command.arguments.push_back(ArgumentOf(*option));
    for (const CLI::App* sub : app.get_subcommands([](const CLI::App*) { return true; })) {
        if (sub->get_group().empty()) continue; // hidden
        Words below = path;
        below.push_back(sub->get_name());
        command.below.push_back(CommandOf(*sub, below));
    }
    return command;
}

void ForEach(const Command& command, const std::function<void(const Command&)>& act) {
    act(command);
    for (const Command& each : command.below) ForEach(each, act);
}

} // namespace tool
