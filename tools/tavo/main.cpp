// The command-line tool: what can be asked, and the exit codes.

#include "commands.h"
#include "console.h"
#include "streams.h"

#include <CLI/CLI.hpp>
#include <functional>
#include <TAVO/core.h>

namespace {

using namespace tool;
using Action = std::function<int()>;

// The library's services for as long as the tool runs.
struct Services {
    Services() { TAVO::AppInit(); }
    ~Services() { TAVO::AppExit(); }
};

// Options and what to do with them live as long as the command line that fills them in.
template <class Options> Options& Add(CLI::App& command, Action& action, int (*run)(const Options&)) {
    auto options = std::make_shared<Options>();
    command.callback([options, run, &action] { action = [options, run] { return run(*options); }; });
    return *options;
}

void AddOutput(CLI::App& command, OutputOptions& output) {
    command.add_option("-o,--output", output.file, "where to write; - is standard output")
        ->required()
        ->type_name("FILE");
    command
        .add_option("--encoding", output.encoding, "utf-8 (the default), utf-16, or utf-16-raw, which writes any text")
        ->check(CLI::IsMember(EncodingNames()).description(""))
        ->type_name("NAME");
    command.add_flag("--pretty", output.pretty, "one element per line, indented");
    command.add_flag("--strict", output.strict, "write nothing when some text would not read back as it is");
}

constexpr const char* kFileHelp = "a document; - is standard input";
constexpr const char* kPathHelp = "names from the root's children down, like a/b/c: the first of each; . is the root";

void AddXmlCommands(CLI::App& xml, Action& action) {
    xml.require_subcommand(1);

    auto* command = xml.add_subcommand("check", "Reads documents and tells the first error of each");
    auto& check = Add<CheckOptions>(*command, action, Check);
    command->add_option("FILE", check.files, kFileHelp)->required()->type_name("");
    command->add_flag("--keep-going", check.keepGoing, "go on after a document with an error");

    command = xml.add_subcommand("tree", "Shows a document as an outline");
    auto& tree = Add<TreeOptions>(*command, action, Tree);
    command->add_option("FILE", tree.file, kFileHelp)->required()->type_name("");
    command->add_flag("--json", tree.json, "as JSON");

    command = xml.add_subcommand("get", "Prints the text of an element, or an attribute");
    auto& get = Add<GetOptions>(*command, action, Get);
    command->add_option("FILE", get.file, kFileHelp)->required()->type_name("");
    command->add_option("PATH", get.path, kPathHelp)->required()->type_name("");
    command->add_option("--attribute", get.attribute, "the attribute of this name instead of the text")
        ->type_name("NAME");

    command = xml.add_subcommand("set", "Changes the text of an element, or an attribute, and writes the document");
    auto& set = Add<SetOptions>(*command, action, Set);
    command->add_option("FILE", set.file, kFileHelp)->required()->type_name("");
    command->add_option("PATH", set.path, kPathHelp)->required()->type_name("");
    command->add_option("TEXT", set.text, "the new text; write -- before one that begins with -")
        ->required()
        ->type_name("");
    command->add_option("--attribute", set.attribute, "the attribute of this name; an empty TEXT removes it")
        ->type_name("NAME");
    AddOutput(*command, set.output);

    command = xml.add_subcommand("format", "Writes a document anew");
    auto& format = Add<FormatOptions>(*command, action, Format);
    command->add_option("FILE", format.file, kFileHelp)->required()->type_name("");
    AddOutput(*command, format.output);

    command = xml.add_subcommand("stat", "Counts, weighs and times documents");
    auto& stat = Add<StatOptions>(*command, action, Stat);
    command->add_option("FILE", stat.files, kFileHelp)->required()->type_name("");
    command->add_option("--repeat", stat.repeat, "how often to read each document for the time")
        ->check(CLI::Range(1, 1000000))
        ->capture_default_str();
}

int Run(std::vector<std::string> arguments) {
    CLI::App app("Reads, shows, changes, checks and measures XML with the library TAVO.\n"
                 "Exit codes: 0 fine, 1 bad input, 2 wrong usage, 3 trouble with a file.",
                 "tavo");
    app.allow_windows_style_options(false); // a name may begin with '/'
    app.set_version_flag("--version", TAVO_VERSION);
    app.require_subcommand(1);
    Action action;

    AddXmlCommands(*app.add_subcommand("xml", "Documents"), action);
    auto* pool = app.add_subcommand("pool", "The pool of strings")->require_subcommand(1);
    auto* command = pool->add_subcommand("stat", "Tells what the pool holds before, with and after documents");
    auto& poolStat = Add<PoolStatOptions>(*command, action, PoolStat);
    command->add_option("FILE", poolStat.files, kFileHelp)->type_name("");
    app.add_subcommand("about", "Tells version, process and configuration")->callback([&] { action = About; });

    std::reverse(arguments.begin(), arguments.end()); // the order that the parser wants
    try {
        app.parse(std::move(arguments));
    } catch (const CLI::ParseError& error) {
        return app.exit(error) == 0 ? kFine : kUsage;
    }
    return action();
}

} // namespace

int main(int argc, char** argv) {
    const Services services;
    console::Prepare();
    try {
        return Finish(Run(console::Arguments(argc, argv)));
    } catch (const std::exception& error) {
        Complain(error.what());
        return Finish(kFileTrouble);
    }
}
