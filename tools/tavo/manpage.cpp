#include "definitions.h"
#include "reference.h"

#include <cctype>
#include <TAVO/config.h>

namespace tool {

namespace {

std::string Roff(const std::string& text) {
    const std::string escaped = Replaced(Replaced(text, "\\", "\\e"), "-", "\\-");
    return escaped.find_first_of(".'") == 0 ? "\\&" + escaped : escaped;
}
std::string Bold(const std::string& text) { return "\\fB" + Roff(text) + "\\fR"; }
std::string Italic(const std::string& text) { return "\\fI" + Roff(text) + "\\fR"; }

std::string Synopsis(const Command& command) {
    std::string text = "tavo " + Joined(command.path, " ");
    for (const Argument& argument : command.arguments) {
        if (!argument.isRequired && !argument.names.empty()) continue; // listed below
        std::string item = argument.names.empty() ? "" : argument.names.back() + ' ';
        item += argument.value + (argument.isRepeated ? "..." : "");
        text += argument.isRequired ? ' ' + item : " [" + item + ']';
    }
    return text;
}

std::string Entry(const Argument& argument) {
    std::string head;
    for (const std::string& name : argument.names) head += (head.empty() ? "" : ", ") + Bold(name);
    if (!argument.value.empty()) {
        if (!head.empty()) head += ' ';
        head += argument.hasOptionalValue ? '[' + Italic(argument.value) + ']' : Italic(argument.value);
    }
    const bool tells = !argument.standard.empty() && !argument.hasOptionalValue;
    const std::string standard = tells ? " (" + argument.standard + " without it)" : "";
    return ".TP\n" + head + '\n' + Roff(argument.help + standard) + '\n';
}

struct Example {
    const char* does;
    const char* line;
};
constexpr Example kExamples[] = {
    {"Tells the first error of each document, if there is one:", "tavo xml check timeline.xml notes-utf16.xml"},
    {"Changes a text:", "tavo xml set timeline.xml project/title \"The ferry at seven\" -o changed.xml"},
    {"The nearest frame of another system:", "tavo tc convert 10:00:00:00 --to \"NTSC(DF)\" --align"},
    {"The fraction behind a rate:", "tavo rational approx 29.97002997 --max-den 2000"},
};

} // namespace

std::string ManPage(const CLI::App& app) {
    const Command all = CommandOf(app, {});
    // "Does this.\nExit codes: 0 fine, 1 bad input."
    const Words halves = SplitAt(all.help, "\nExit codes: ");
    std::string does = Replaced(halves.front(), "\n", " ");
    std::string name = does.substr(0, does.rfind('.'));
    name[0] = static_cast<char>(std::tolower(static_cast<unsigned char>(name[0])));

    std::string page = ".TH TAVO 1 \"\" \"TAVO " TAVO_VERSION "\" \"User commands\"\n.SH NAME\ntavo \\- " + Roff(name) +
                       "\n.SH SYNOPSIS\n.B tavo\n\\fICOMMAND\\fR [\\fIARGUMENT\\fR]...\n.SH DESCRIPTION\n" +
                       Roff(does) + "\nEvery command has a " + Bold("--help") + ".\n.SH OPTIONS\n";
    for (const Argument& argument : all.arguments) page += Entry(argument);
    page += ".SH COMMANDS\n";
    ForEach(all, [&](const Command& command) {
        if (!command.below.empty()) return;
        page += ".SS " + Roff(Synopsis(command)) + '\n' + Roff(command.help) + ".\n";
        for (const Argument& argument : command.arguments)
            if (argument.names.empty() || argument.names.back() != "--help") page += Entry(argument);
    });
    page += ".SH EXIT STATUS\n";
    for (const std::string& code : SplitAt(halves.back().substr(0, halves.back().rfind('.')), ", "))
        page += ".TP\n" + Bold(code.substr(0, 1)) + '\n' + Roff(code.substr(2)) + '\n';
    page += ".SH EXAMPLES\n";
    for (const Example& example : kExamples)
        page += (&example == kExamples ? "" : ".PP\n") + Roff(example.does) + "\n.PP\n.nf\n.RS\n" + Roff(example.line) +
                "\n.RE\n.fi\n";
    return page;
}

} // namespace tool
