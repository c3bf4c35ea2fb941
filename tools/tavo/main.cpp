// The command-line tool: what can be asked, and the exit codes.

#include "commands.h"
#include "console.h"
#include "encodings.h"
#include "reference.h"
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
        ->type_name("ENCODING");
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
    command->add_option("--as", get.type, "the value that the library's readers of this type find in the text")
        ->check(CLI::IsMember(ValueTypeNames()))
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

void AddCodecCommands(CLI::App& codec, Action& action) {
    codec.require_subcommand(1);
    const auto add = [&](const char* name, const char* does, const char* fileHelp, int (*run)(const CodecOptions&)) {
        auto* command = codec.add_subcommand(name, does);
        auto& options = Add<CodecOptions>(*command, action, run);
        command->add_option("CODE", options.code, "3f, 3fff or hex")
            ->required()
            ->check(CLI::IsMember(CodecNames()).description(""))
            ->type_name("");
        command->add_option("FILE", options.file, fileHelp)->type_name("");
        command->add_option("-o,--output", options.output, "where to write; - is standard output, the default")
            ->type_name("FILE");
        command
            ->add_option("--nibbles", options.nibbles,
                         "which digit of a byte comes first in hex: high-first (the default), or low-first as the "
                         "library writes bytes into XML")
            ->check(CLI::IsMember(NibbleOrders()).description(""))
            ->type_name("ORDER");
        return std::pair(command, &options);
    };
    const auto [encode, options] =
        add("encode", "Writes bytes as text", "any file; - is standard input, the default", CodecEncode);
    encode->add_flag("--strict", options->strict, "write nothing when the bytes would not come back from 3f");
    add("decode", "Writes the bytes of a text",
        "UTF-8, or UTF-16 or UTF-32 with a mark; - is standard input, the default", CodecDecode);
}

void AddCrc(CLI::App& command, Action& action) {
    auto& crc = Add<CrcOptions>(command, action, Crc);
    command.add_option("FILE", crc.files, "any files; - is standard input, the default")->type_name("");
    const auto addHex = [&](const char* option, std::string& text, const char* help) {
        command.add_option(option, text, help)->type_name("HEX");
    };
    command.add_option("--name", crc.name, "a checksum by its name, such as crc-32")->type_name("NAME");
    command.add_option("--width", crc.width, "or by its numbers: its bits, 1 to 64")
        ->check(CLI::Range(1, 64).description(""))
        ->type_name("BITS");
    addHex("--poly", crc.polynomial, "its polynomial without the top bit, the highest power first");
    addHex("--init", crc.initial, "the value it begins with; 0 without");
    addHex("--xorout", crc.xorOut, "what is combined with the result; 0 without");
    command.add_flag("--refin", crc.reflectIn, "take the lowest bit of each byte first");
    command.add_flag("--refout", crc.reflectOut, "turn the result round, before --xorout");
    command.add_flag("--list", crc.list, "list the names, with the options that they stand for");
    AddJson(command, crc.json);
}

void AddUrlCommands(CLI::App& url, Action& action) {
    url.require_subcommand(1);
    const auto add = [&](const char* name, const char* does, const char* what, const char* help,
                         int (*run)(const UrlTextOptions&)) -> UrlTextOptions& {
        auto* command = url.add_subcommand(name, does);
        auto& options = Add<UrlTextOptions>(*command, action, run);
        command->add_option(what, options.texts, help)->required()->type_name("");
        AddJson(*command, options.json);
        return options;
    };
    auto& encode = add("encode", "Escapes texts: %20 for a blank", "TEXT", "bytes, as they are given", UrlEncode);
    url.get_subcommand("encode")
        ->add_option("--keep", encode.keep, "characters that stay as they are, beside letters, digits and - _ . ~")
        ->type_name("SET");
    add("decode", "Reads escaped texts", "TEXT", "what is no escape stays as it is", UrlDecode);
    add("from-path", "Tells the URLs of paths", "PATH", "any absolute path, of Windows or of POSIX systems",
        UrlFromPath);
    add("to-path", "Tells the paths of URLs", "URL", "begins with file://", UrlToPath);
}

void AddTextCommands(CLI::App& text, Action& action) {
    text.require_subcommand(1);
    const auto addEncoding = [](CLI::App& command, const char* option, std::string& name, const char* help) {
        return command.add_option(option, name, help)->check(CLI::IsMember(TextFormatNames()))->type_name("CHARSET");
    };
    constexpr const char* kTextHelp = "a text; - is standard input";
    constexpr const char* kFromHelp = "its encoding; without it the one that its mark tells, else utf-8";

    auto* command = text.add_subcommand("recode", "Writes a text in another encoding");
    auto& recode = Add<TextRecodeOptions>(*command, action, TextRecode);
    command->add_option("FILE", recode.file, kTextHelp)->required()->type_name("");
    addEncoding(*command, "--from", recode.from, kFromHelp);
    addEncoding(*command, "--to", recode.to, "the new one")->required();
    command->add_option("-o,--output", recode.output, "where to write; - is standard output")
        ->required()
        ->type_name("FILE");
    command->add_flag("--strict", recode.strict, "write nothing when some character would come out as another");

    const auto add = [&](const char* name, const char* does, int (*run)(const TextOptions&)) {
        auto* looks = text.add_subcommand(name, does);
        auto& options = Add<TextOptions>(*looks, action, run);
        looks->add_option("FILE", options.files, kTextHelp)->required()->type_name("");
        addEncoding(*looks, "--from", options.from, kFromHelp);
        AddJson(*looks, options.json);
    };
    add("count", "Counts bytes, units and characters, by the standard and by the library", TextCount);
    add("validate", "Tells the first fault by the standard, and what the library makes of the text", TextValidate);
}

void AddPoolCommands(CLI::App& pool, Action& action) {
    pool.require_subcommand(1);
    auto* command = pool.add_subcommand("stat", "Tells what the pool holds before, with and after documents");
    auto& stat = Add<PoolStatOptions>(*command, action, PoolStat);
    command->add_option("FILE", stat.files, kFileHelp)->type_name("");
    command
        ->add_option("--watch", stat.watch,
                     "Look once a second how the library sweeps the pool by itself, so many seconds at most (60)")
        ->type_name("SECONDS")
        ->expected(0, 1)
        ->default_str("60");
}

// For the build, which installs what they print; not listed in the help.
void AddReferenceCommands(const CLI::App& app, CLI::App& help, Action& action) {
    help.group("")->require_subcommand(1);
    const auto add = [&](CLI::App& command, std::function<std::string()> make) {
        command.callback([make, &action] { action = [make] { return Print(make()), kFine; }; });
    };
    add(*help.add_subcommand("man", "Prints the man page"), [&app] { return ManPage(app); });
    auto* completion = help.add_subcommand("completion", "Prints the script that completes commands in a shell");
    const auto shell = std::make_shared<std::string>();
    completion->add_option("SHELL", *shell, "the shell")->required()->check(CLI::IsMember(ShellNames()))->type_name("");
    add(*completion, [&app, shell] { return Completion(app, *shell); });
}

// Everything that can be asked; who adds a command adds it here.
void AddCommands(CLI::App& app, Action& action) {
    app.allow_windows_style_options(false); // a name may begin with '/'
    app.set_version_flag("--version", TAVO_VERSION);
    app.require_subcommand(1);

    AddXmlCommands(*app.add_subcommand("xml", "Documents"), action);
    AddPoolCommands(*app.add_subcommand("pool", "The pool of strings"), action);
    AddTimecodeCommands(*app.add_subcommand("tc", "Timecode: systems and positions"), action);
    AddRationalCommands(*app.add_subcommand("rational", "Fractions"), action);
    AddIdCommands(*app.add_subcommand("id", "Component identifiers"), action);
    AddCodecCommands(*app.add_subcommand("codec", "Bytes as text"), action);
    AddCrc(*app.add_subcommand("crc", "Tells the checksums of files"), action);
    AddUrlCommands(*app.add_subcommand("url", "URLs: escaping, and those of paths"), action);
    AddTextCommands(*app.add_subcommand("text", "Encodings of texts"), action);
    app.add_subcommand("about", "Tells version, process and configuration")->callback([&] { action = About; });
    AddReferenceCommands(app, *app.add_subcommand("help", "The tool's reference"), action);
}

int Run(std::vector<std::string> arguments) {
    CLI::App app("Reads, shows, changes, checks and measures XML, computes timecode and checksums,\n"
                 "makes identifiers, escapes URLs, recodes texts and writes bytes as text, with the\n"
                 "library TAVO.\n"
                 "Exit codes: 0 fine, 1 bad input, 2 wrong usage, 3 trouble with a file.",
                 "tavo");
    Action action;
    AddCommands(app, action);

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
