// The command-line tool: what can be asked, and the exit codes.

#include "commands.h"
#include "console.h"
#include "streams.h"
#include "value.h"

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
    command
        ->add_option("--as", get.type,
                     "the value that the text has as one of the types int, uint, hex, int64, uint64, "
                     "filetime, double, edouble, rational, bool, timecode, id, binary")
        ->check(CLI::IsMember(ValueTypeNames()).description(""))
        ->type_name("TYPE");

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

constexpr const char* kPositionHelp =
    "a text such as 10:00:00:00, whose separators tell the system, the universal form, or a count: 1200 base units, "
    "25frames, 50fields, 1.5s; write -- before one that begins with -";
constexpr const char* kSystemHelp =
    "a name, a code, or a rate such as 25/1 or, where drop frame exists, 30000/1001/D and 30000/1001/ND";

CLI::Option* AddSystem(CLI::App& command, const char* option, std::string& system) {
    return command.add_option(option, system, kSystemHelp)->type_name("SYSTEM");
}

void AddJson(CLI::App& command, bool& json) { command.add_flag("--json", json, "as JSON"); }

void AddSum(CLI::App& command, Action& action, int (*run)(const TcSumOptions&)) {
    auto& sum = Add<TcSumOptions>(command, action, run);
    command.add_option("A", sum.left, kPositionHelp)->required()->type_name("");
    command.add_option("B", sum.right, "the same; a count is one of A's system")->required()->type_name("");
    AddSystem(command, "--system", sum.system);
    AddJson(command, sum.json);
}

void AddTimecodeCommands(CLI::App& tc, Action& action) {
    tc.require_subcommand(1);

    auto* command = tc.add_subcommand("systems", "Lists the timecode systems");
    AddJson(*command, Add<TcSystemsOptions>(*command, action, TcSystems).json);

    command =
        tc.add_subcommand("convert", "Shows a position in another system: the same base units, aligned, or retimed");
    auto& convert = Add<TcConvertOptions>(*command, action, TcConvert);
    command->add_option("POSITION", convert.text, kPositionHelp)->required()->type_name("");
    AddSystem(*command, "--from", convert.from);
    AddSystem(*command, "--to", convert.to)->required();
    auto* align = command->add_flag("--align", convert.align, "the nearest frame of the other system");
    command->add_flag("--retime", convert.retime, "the same real time")->excludes(align);
    AddJson(*command, convert.json);

    AddSum(*tc.add_subcommand("add", "Adds positions; the result is in the first one's system"), action, TcAdd);
    AddSum(*tc.add_subcommand("sub", "Subtracts positions"), action, TcSub);

    command = tc.add_subcommand("show", "Shows a position in every form");
    auto& show = Add<TcShowOptions>(*command, action, TcShow);
    command->add_option("POSITION", show.text, kPositionHelp)->required()->type_name("");
    AddSystem(*command, "--system", show.system);
    AddJson(*command, show.json);

    command = tc.add_subcommand("table", "Lists the frames around a position, or around the end of minute 0");
    auto& table = Add<TcTableOptions>(*command, action, TcTable);
    command->add_option("POSITION", table.text, kPositionHelp)->type_name("");
    AddSystem(*command, "--system", table.system);
    command->add_option("--frames", table.frames, "how many on each side")
        ->check(CLI::Range(0, 100000))
        ->capture_default_str();
    AddJson(*command, table.json);

    command = tc.add_subcommand("check", "Tells whether texts are valid, invalid or unassigned, and why");
    auto& check = Add<TcCheckOptions>(*command, action, TcCheck);
    command->add_option("TEXT", check.texts, kPositionHelp)->required()->type_name("");
    AddSystem(*command, "--system", check.system);
    AddJson(*command, check.json);
}

void AddRationalCommands(CLI::App& rational, Action& action) {
    rational.require_subcommand(1);
    auto* command = rational.add_subcommand("approx", "Finds the best fraction for a number");
    auto& approx = Add<RationalApproxOptions>(*command, action, RationalApprox);
    command->add_option("X", approx.number, "a decimal number")->required()->type_name("");
    command->add_option("--max-den", approx.maxDenominator, "the largest denominator allowed")
        ->required()
        ->check(CLI::Range(1, 1073741823));
    AddJson(*command, approx.json);
}

constexpr const char* kIdHelp = "15603CD4-AB81-4D6F-B05F-C6BEA760A789 in any case, in braces, or its digits alone";

void AddIdCommands(CLI::App& id, Action& action) {
    id.require_subcommand(1);

    auto* command = id.add_subcommand("new", "Makes new identifiers from the system's random numbers");
    auto& made = Add<IdNewOptions>(*command, action, IdNew);
    command->add_option("--count", made.count, "how many")->check(CLI::Range(1, 1000000))->capture_default_str();
    AddJson(*command, made.json);

    const auto addTexts = [&](const char* name, const char* does, int (*run)(const IdTextOptions&)) {
        auto* reads = id.add_subcommand(name, does);
        auto& options = Add<IdTextOptions>(*reads, action, run);
        reads->add_option("TEXT", options.texts, kIdHelp)->required()->type_name("");
        AddJson(*reads, options.json);
    };
    addTexts("parse", "Tells the identifier in each text, or which character is wrong", IdParse);
    addTexts("format", "Shows the ways to write an identifier", IdFormat);
}

int Run(std::vector<std::string> arguments) {
    CLI::App app("Reads, shows, changes, checks and measures XML, computes timecode, and makes\n"
                 "identifiers, with the library TAVO.\n"
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
    command
        ->add_option("--watch", poolStat.watch,
                     "Look once a second how the library sweeps the pool by itself, so many seconds at most (60)")
        ->type_name("SECONDS")
        ->expected(0, 1)
        ->default_str("60");
    AddTimecodeCommands(*app.add_subcommand("tc", "Timecode: systems and positions"), action);
    AddRationalCommands(*app.add_subcommand("rational", "Fractions"), action);
    AddIdCommands(*app.add_subcommand("id", "Component identifiers"), action);
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
