// The command-line tool, run as its users run it: what it prints, writes and answers.

#include "support/process.h"
#include "support/scratch.h"

using support::Finished;
using support::RunTool;
using testing::Test;

namespace {

constexpr int kFine = 0, kBadInput = 1, kUsage = 2, kFileTrouble = 3;
const std::string kTimeline = TAVO_TEST_DATA "/timeline.xml";
const std::string kNotes = TAVO_TEST_DATA "/notes-utf16.xml";

// Both platforms take UTF-8 here: the tool's arguments, and wide paths through the library for the rest.
struct Folder {
    support::ScratchFolder scratch;
    support::WideText wide = scratch.Path();
    std::string operator/(const std::string& name) const {
        std::string path;
        for (const wchar_t* unit = wide; *unit; ++unit) path += static_cast<char>(*unit);
        return path + '/' + name;
    }
    // ASCII names only.
    std::string Put(const std::string& name, const std::string& bytes) const {
        support::Put(support::Widen(*this / name), bytes);
        return *this / name;
    }
    bool Has(const std::string& name) const { return TAVO::Files::OS::_TestFileExists(support::Widen(*this / name)); }
};

std::string Get(const std::string& path) {
    using namespace TAVO::Files::OS;
    CFile file;
    if (!file.Open(support::Widen(path), FileAccessRead | FileAccessShareRead, OpenFileExisting)) return "(no file)";
    std::string bytes(file.GetSize(), 0);
    TAVO::ulong32 done = 0;
    EXPECT_TRUE(file.Read(bytes.data(), static_cast<TAVO::ulong32>(bytes.size()), &done));
    return bytes;
}

bool Contains(const std::string& text, const std::string& part) { return text.find(part) != text.npos; }

// The units of an ASCII text, low byte first or last.
std::string Utf16(const std::string& ascii, bool bigEndian = false) {
    std::string bytes;
    for (const char c : ascii) bytes += bigEndian ? std::string{'\0', c} : std::string{c, '\0'};
    return bytes;
}

void ExpectRun(const Finished& run, int code, const std::string& output, const std::string& errors) {
    EXPECT_EQ(run.code, code);
    EXPECT_EQ(run.output, output);
    EXPECT_TRUE(errors.empty() ? run.errors.empty() : Contains(run.errors, errors)) << run.errors;
}

} // namespace

TEST(ToolCheck, TellsCodeLineColumnAndOffset) {
    const struct {
        const char* name;
        std::string text;
        const char* place; // "line:column: error code (title) at offset n: ", empty for a good text
        const char* words;
    } rows[] = {
        {"good", "<a/>", "", ""},
        {"named root only, with a mark", "\xEF\xBB\xBF<a/>", "", ""},
        {"empty", "", "1:1: error 0 (Bad file) at offset 0: ", "empty"},
        {"unclosed element", "<a>\n<b/>\n", "3:1: error 1 (End of file) at offset 9: ", "ends before"},
        {"open comment", "<a><!-- x</a>", "1:4: error 2 (Open comment) at offset 3: ", "no end"},
        {"apostrophe in a comment", "<!-- don't --><a/>", "1:9: error 3 (Open string) at offset 8: ", "apostrophe"},
        {"open tag", "<a b=\"1\"", "1:9: error 4 (Open enclosure) at offset 8: ", "'>'"},
        {"open tag behind a mark", "\xEF\xBB\xBF<a", "1:3: error 4 (Open enclosure) at offset 5: ", "'>'"},
        {"text at top level", "x<a/>", "1:1: error 5 (Invalid tag) at offset 0: ", "name"},
        {"duplicate attribute", "<a b='1' b='2'/>", "1:10: error 6 (Bad attribute) at offset 9: ", "once"},
        {"hexadecimal reference", "<a>\r\n&#x41;</a>", "2:1: error 7 (Bad escape) at offset 5: ", "hexadecimal"},
        {"open CDATA", "<a><![CDATA[x</a>", "1:4: error 9 (Open CDATA section) at offset 3: ", "]]>"},
        {"bare terminator", "<a>x]]></a>", "1:5: error 10 (Bad data terminator) at offset 4: ", "CDATA"},
        {"version", "<?xml version=\"1.1\"?><a/>", "1:1: error 11 (Version != 1.0) at offset 0: ", "1.0"},
        {"encoding", "<?xml version=\"1.0\" encoding=\"Latin-1\"?><a/>",
         "1:1: error 12 (Unsupported encoding specified) at offset 0: ", "UTF-8"},
        {"bad UTF-8, found by the tool", "<a>\nxy\xFFz</a>",
         "2:3: error 13 (Bad character encoding) at offset 6: ", "Latin-1"},
        {"cut UTF-8", "<a>\xC3", "1:4: error 13 (Bad character encoding) at offset 3: ", "UTF-8"},
        {"wrong end tag", "\n <a></b>", "2:5: error 14 (Bad termination tag) at offset 5: ", "match"},
        {"columns count characters, offsets bytes", "<a>\n\xC3\xA9\xE2\x82\xAC<b/></a>",
         "2:3: error 15 (Mixed content) at offset 9: ", "not both"},
        {"surrogate in UTF-8", "<a>\xED\xA0\x80</a>", "1:4: error 16 (Illegal character) at offset 3: ", "surrogate"},
        {"second root", "<a/>\n<b/>", "2:1: error 17 (Root element missing) at offset 5: ", "one"},
        {"no element", "<!-- x -->", "1:11: error 128 (No element) at offset 10: ", "no element"},
        {"UTF-16", Utf16("<a>\n\n<b/>x</a>"), "3:5: error 15 (Mixed content) at offset 9: ", "not both"},
        {"UTF-16 with a mark", "\xFF\xFE" + Utf16("<a></b>"),
         "1:4: error 14 (Bad termination tag) at offset 4: ", "match"},
        {"UTF-16, high byte first", Utf16("<a></b>", true),
         "1:4: error 14 (Bad termination tag) at offset 3: ", "match"},
        {"UTF-16, columns count pairs once", Utf16("<a>") + std::string("\x3D\xD8\x00\xDE", 4) + Utf16("</b>"),
         "1:5: error 15 (Mixed content) at offset 5: ", "not both"},
    };
    for (const auto& row : rows) {
        SCOPED_TRACE(row.name);
        const Finished run = RunTool({"xml", "check", "-"}, row.text);
        if (!*row.place) {
            ExpectRun(run, kFine, "(standard input): fine\n", "");
            continue;
        }
        EXPECT_EQ(run.code, kBadInput);
        EXPECT_EQ(run.errors, "");
        EXPECT_EQ(run.output.find(std::string("(standard input):") + row.place), 0u) << run.output;
        EXPECT_TRUE(Contains(run.output, row.words)) << run.output;
    }
}

TEST(ToolCheck, ShowsTheTextAroundTheError) {
    const Finished run = RunTool({"xml", "check", "-"}, "<reel>\n <clip></reel>");
    EXPECT_TRUE(Contains(run.output, "\n    <reel> <clip>[[*]]</reel>\n")) << run.output;
}

TEST(ToolCheck, StopsOrKeepsGoing) {
    const Folder folder;
    const std::string good = folder.Put("good.xml", "<a/>"), bad = folder.Put("bad.xml", "<a>");
    const std::string none = folder / "none.xml";

    Finished run = RunTool({"xml", "check", good, bad, good});
    EXPECT_EQ(run.code, kBadInput);
    EXPECT_EQ(run.output.find(good + ": fine\n" + bad + ":1:4: error 1 "), 0u) << run.output;
    EXPECT_EQ(run.output.find(": fine"), run.output.rfind(": fine"));

    run = RunTool({"xml", "check", "--keep-going", bad, none, good});
    EXPECT_EQ(run.code, kFileTrouble) << "the worst of all";
    EXPECT_TRUE(Contains(run.output, good + ": fine\n"));
    EXPECT_TRUE(Contains(run.errors, none + ": does not exist"));

    run = RunTool({"xml", "check", none, good});
    ExpectRun(run, kFileTrouble, "", none + ": does not exist");
    ExpectRun(RunTool({"xml", "check", folder / "."}), kFileTrouble, "", "is a folder");
    EXPECT_EQ(RunTool({"xml", "check", folder / "new/none.xml"}).code, kFileTrouble);
    EXPECT_FALSE(TAVO::Files::OS::_TestDirExists(support::Widen(folder / "new"))) << "looking makes no folders";
}

TEST(ToolCheck, TellsAboutNamedReferences) {
    const std::string text = "<a b=\"&amp;\">&lt;&#65;<!-- & --><![CDATA[&]]></a>";
    ExpectRun(RunTool({"xml", "check", "-"}, text), kFine, "(standard input): fine\n", "2 references by name");
}

TEST(ToolTree, OutlinesAndJson) {
    const std::string text = "<a b=\"1\" c=\"&#34;\"><d>x\xC3\xA9<![CDATA[\n\\\t\x01]]></d><e/></a>";
    ExpectRun(RunTool({"xml", "tree", "-"}, text), kFine,
              "a b=\"1\" c=\"\\\"\"\n  d: \"x\xC3\xA9\\n\\\\\\t\\u0001\"\n  e\n", "");
    ExpectRun(RunTool({"xml", "tree", "--json", "-"}, text), kFine,
              "{\"name\":\"a\",\"attributes\":{\"b\":\"1\",\"c\":\"\\\"\"},\"children\":[\n"
              "{\"name\":\"d\",\"text\":\"x\xC3\xA9\\n\\\\\\t\\u0001\"},\n{\"name\":\"e\"}]}\n",
              "");
    ExpectRun(RunTool({"xml", "tree", "-"}, "<a>"), kBadInput, "", ":1:4: error 1 ");
}

TEST(ToolTree, MayBeDeeperThanAnyStack) {
    constexpr std::size_t kDepth = 100000;
    std::string text;
    for (std::size_t i = 0; i < kDepth; ++i) text += "<a>";
    for (std::size_t i = 0; i < kDepth; ++i) text += "</a>";
    const Finished run = RunTool({"xml", "tree", "-"}, text);
    EXPECT_EQ(run.code, kFine);
    EXPECT_TRUE(Contains(run.output, "(99999) a\n"));
    EXPECT_EQ(RunTool({"xml", "tree", "--json", "-"}, text).code, kFine);
    EXPECT_EQ(RunTool({"xml", "format", "--strict", "-", "-o", "-"}, text).code, kFine);
}

TEST(ToolGet, FindsTextsAndAttributes) {
    const struct {
        std::vector<std::string> arguments;
        int code;
        const char* output;
        const char* errors;
    } rows[] = {
        {{kTimeline, "project/title"}, kFine, "The ferry at six\n", ""},
        {{kTimeline, "project/client"},
         kFine,
         "Kv\xC3\xB6ld"
         "ferjan ehf.\n",
         ""},
        {{kTimeline, ".", "--attribute", "version"}, kFine, "1.2\n", ""},
        {{kTimeline, "bins/bin/clip", "--attribute", "rate"}, kFine, "50/1\n", ""},
        {{kTimeline, "project/script"},
         kFine,
         "if (shot.rate < 25 && !shot.locked) { conform(shot, \"24/1\"); }\n",
         ""},
        {{kNotes, "note", "--attribute", "xml:lang"}, kFine, "la\n", ""},
        {{kTimeline, "project/nothing"}, kBadInput, "", "there is no project/nothing"},
        {{kTimeline, "timeline"}, kBadInput, "", "there is no timeline"},
        {{kTimeline, ".", "--attribute", "none"}, kBadInput, "", "has no attribute none"},
        {{kTimeline, "bins"}, kBadInput, "", "10 elements and no text"},
        {{kTimeline, "bins/bin/clip/media"}, kFine, "\n", ""},
        {{kTimeline, "/project"}, kUsage, "", "no path"},
        {{kTimeline, "project/"}, kUsage, "", "no path"},
        {{kTimeline, "project title"}, kUsage, "", "no path"},
        {{kTimeline, ""}, kUsage, "", "no path"},
        {{kTimeline, "a/b\xFF"}, kUsage, "", "no path"},
        {{kTimeline, ".", "--attribute", "1"}, kUsage, "", "no attribute"},
    };
    for (const auto& row : rows) {
        SCOPED_TRACE(testing::PrintToString(row.arguments));
        std::vector<std::string> arguments = {"xml", "get"};
        arguments.insert(arguments.end(), row.arguments.begin(), row.arguments.end());
        ExpectRun(RunTool(arguments), row.code, row.output, row.errors);
    }
}

TEST(ToolSet, ChangesTextsAndAttributes) {
    const std::string start = "<?xml version=\"1.0\" encoding=\"UTF-8\"?>";
    const struct {
        const char* name;
        std::vector<std::string> arguments;
        int code;
        const char* output; // behind the declaration
        const char* errors;
    } rows[] = {
        {"text", {"b", "new"}, kFine, "<a x=\"1\"><b>new</b><c><d/></c></a>", ""},
        {"other scripts", {"b", "\xE6\x97\xA5"}, kFine, "<a x=\"1\"><b>\xE6\x97\xA5</b><c><d/></c></a>", ""},
        {"nothing", {"b", ""}, kFine, "<a x=\"1\"><b/><c><d/></c></a>", ""},
        {"a number below zero", {"b", "--", "-5"}, kFine, "<a x=\"1\"><b>-5</b><c><d/></c></a>", ""},
        {"markup", {"b", "<&>"}, kFine, "<a x=\"1\"><b><![CDATA[<&>]]></b><c><d/></c></a>", ""},
        {"attribute", {".", "2", "--attribute", "x"}, kFine, "<a x=\"2\"><b>old</b><c><d/></c></a>", ""},
        {"new attribute", {"c/d", "2", "--attribute", "y"}, kFine, "<a x=\"1\"><b>old</b><c><d y=\"2\"/></c></a>", ""},
        {"attribute away", {".", "", "--attribute", "x"}, kFine, "<a><b>old</b><c><d/></c></a>", ""},
        {"pretty",
         {"b", "p", "--pretty"},
         kFine,
         "\r\n<a x=\"1\">\r\n  <b>p</b>\r\n  <c>\r\n    <d/>\r\n  </c>\r\n</a>\r\n",
         ""},
        {"elements", {"c", "text"}, kBadInput, nullptr, "holds elements"},
        {"no such place", {"q", "text"}, kBadInput, nullptr, "there is no q"},
        {"bad path", {"b//c", "text"}, kUsage, nullptr, "no path"},
        {"beyond reach", {"b", "\xF4\x80\x80\x80"}, kBadInput, nullptr, "cannot be kept"},
        {"blanks that collapse",
         {"b", "x  y"},
         kFine,
         "<a x=\"1\"><b>x  y</b><c><d/></c></a>",
         "1 text reads back differently"},
        {"the same, strictly", {"b", "x  y", "--strict"}, kBadInput, nullptr, "not written: 1 text reads back"},
        {"references that turn",
         {".", "&", "--attribute", "x"},
         kFine,
         "<a x=\"&amp;\"><b>old</b><c><d/></c></a>",
         "comes back as \"<;\""},
    };
    for (const auto& row : rows) {
        SCOPED_TRACE(row.name);
        std::vector<std::string> arguments = {"xml", "set", "-o", "-", "-"};
        arguments.insert(arguments.end(), row.arguments.begin(), row.arguments.end());
        const Finished run = RunTool(arguments, "<a x=\"1\"><b>old</b><c><d/></c></a>");
        ExpectRun(run, row.code, row.output ? start + row.output : "", row.errors);
    }
}

TEST(ToolSet, WritesInPlaceAndLeavesTheFileAloneOnFailure) {
    const Folder folder;
    const std::string file = folder.Put("a.xml", "<a><b>1</b></a>");
    ExpectRun(RunTool({"xml", "set", file, "b", "2", "-o", file}), kFine, "", "");
    ExpectRun(RunTool({"xml", "get", file, "b"}), kFine, "2\n", "");
    const std::string before = Get(file);
    EXPECT_EQ(RunTool({"xml", "set", file, "b", "x  y", "--strict", "-o", file}).code, kBadInput);
    EXPECT_EQ(RunTool({"xml", "set", file, "q", "3", "-o", file}).code, kBadInput);
    EXPECT_EQ(Get(file), before);
}

// The tree of each sample stays the same through every form of output, from files and standard input.
TEST(ToolFormat, KeepsTheSamplesInEveryEncoding) {
    const Folder folder;
    for (const std::string& sample : {kTimeline, kNotes}) {
        const std::string tree = RunTool({"xml", "tree", sample}).output;
        EXPECT_GT(tree.size(), 500u);
        for (const char* encoding : {"utf-8", "utf-16", "utf-16-raw"})
            for (const bool pretty : {false, true}) {
                SCOPED_TRACE(sample + ' ' + encoding + (pretty ? " pretty" : ""));
                const std::string out = folder / "out.xml";
                std::vector<std::string> arguments = {"xml", "format",   sample,       "-o",
                                                      out,   "--strict", "--encoding", encoding};
                if (pretty) arguments.push_back("--pretty");
                ExpectRun(RunTool(arguments), kFine, "", "");
                EXPECT_EQ(RunTool({"xml", "tree", out}).output, tree);
                arguments[2] = arguments[4] = std::string(1, '-');
                const Finished piped = RunTool(arguments, Get(sample));
                EXPECT_EQ(piped.output, Get(out));
                EXPECT_EQ(RunTool({"xml", "tree", "-"}, piped.output).output, tree);
            }
    }
}

TEST(ToolFormat, WritesTheEncodingsBytes) {
    const std::string text = "<a>\xC3\xA9</a>";
    ExpectRun(RunTool({"xml", "format", "-", "-o", "-"}, text), kFine,
              "<?xml version=\"1.0\" encoding=\"UTF-8\"?><a>\xC3\xA9</a>", "");
    const std::string wide =
        Utf16("<?xml version=\"1.0\" encoding=\"UTF-16\"?><a>") + std::string("\xE9\0", 2) + Utf16("</a>");
    for (const char* encoding : {"utf-16", "utf-16-raw", "UTF-16"}) {
        const bool known = *encoding == 'u';
        ExpectRun(RunTool({"xml", "format", "-", "-o", "-", "--encoding", encoding}, text), known ? kFine : kUsage,
                  known ? wide : "", known ? "" : "--encoding");
    }
}

// Characters above U+FFFF: shown as they came, lost in every output but the raw one, and the tool says so.
TEST(ToolFormat, TellsWhatIsLost) {
    const std::string smile = "\xF0\x9F\x98\x80";
    const std::string utf8 = "<a>" + smile + "</a>";
    const std::string utf16 = Utf16("<a>") + std::string("\x3D\xD8\x00\xDE", 4) + Utf16("</a>");
    for (const std::string& text : {utf8, utf16}) {
        ExpectRun(RunTool({"xml", "get", "-", "."}, text), kFine, smile + '\n', "");
        for (const char* encoding : {"utf-8", "utf-16"}) {
            const Finished run = RunTool({"xml", "format", "-", "-o", "-", "--encoding", encoding}, text);
            EXPECT_EQ(run.code, kFine);
            EXPECT_TRUE(Contains(run.errors, "the text \"" + smile + "\" in a, which comes back as \"\\u0001\""))
                << run.errors;
        }
    }
    const Finished raw = RunTool({"xml", "format", "-", "-o", "-", "--encoding", "utf-16-raw", "--strict"}, utf16);
    EXPECT_EQ(raw.code, kFine);
    EXPECT_TRUE(Contains(raw.output, std::string("\x3D\xD8\x00\xDE", 4)));
    ExpectRun(RunTool({"xml", "set", "-", ".", smile, "-o", "-", "--strict"}, "<a/>"), kBadInput, "", "not written");

    const Folder folder;
    EXPECT_EQ(RunTool({"xml", "format", "-", "--strict", "-o", folder / "out.xml"}, utf8).code, kBadInput);
    EXPECT_FALSE(folder.Has("out.xml"));
}

TEST(ToolFiles, MayHaveAnyName) {
    const Folder folder;
    const char* const names[] = {"plain.xml",
                                 "with blank.xml",
                                 "\xC3\xA9t\xC3\xA9.xml",
                                 "\xE6\x97\xA5\xE6\x9C\xAC.xml",
                                 "\xD7\xA9\xD7\x9C\xD7\x95\xD7\x9D.xml",
                                 "\xF0\x9F\x98\x80.xml",
                                 "-minus.xml"};
    for (const std::string name : names) {
        SCOPED_TRACE(name);
        const std::string file = folder / name;
        ExpectRun(RunTool({"xml", "format", kNotes, "-o", file}), kFine, "", "");
        ExpectRun(RunTool({"xml", "check", file}), kFine, file + ": fine\n", "");
        EXPECT_EQ(RunTool({"xml", "tree", file}).output, RunTool({"xml", "tree", kNotes}).output);
    }
    EXPECT_EQ(support::List(folder.wide).size(), std::size(names));
    ExpectRun(RunTool({"xml", "format", kNotes, "-o", folder / "."}), kFileTrouble, "", "cannot be opened for writing");
    ExpectRun(RunTool({"xml", "format", folder / "none", "-o", "-"}), kFileTrouble, "", "does not exist");
}

TEST(ToolStat, CountsWhatIsThere) {
    const Finished run = RunTool({"xml", "stat", "--repeat", "3", "-"}, "<a x=\"1\" y=\"1\"><b>1</b><b>2</b><c/></a>");
    EXPECT_EQ(run.code, kFine);
    EXPECT_EQ(run.errors, "");
    for (const char* line : {"size                  39 bytes, UTF-8\n", "elements              4, 2 levels deep\n",
                             "attributes            2\n", "texts                 2\n", "distinct strings      7\n",
                             " average of 3\n", " MB/s\n", "per element           ", "strings that were new\n"})
        EXPECT_TRUE(Contains(run.output, line)) << line << "in\n" << run.output;

    const Finished several = RunTool({"xml", "stat", kTimeline, kNotes});
    EXPECT_EQ(several.code, kFine);
    EXPECT_TRUE(Contains(several.output, "2 documents\n  size                  67,023 bytes\n")) << several.output;
    EXPECT_TRUE(Contains(several.output, "  elements              772\n")) << several.output;
    const Finished mixed = RunTool({"xml", "stat", "none.xml", kNotes});
    EXPECT_EQ(mixed.code, kFileTrouble);
    EXPECT_TRUE(Contains(mixed.output, "elements              19,")) << "the others are counted";
}

TEST(ToolStat, PoolForgetsWithTheSecondSweep) {
    const Finished run = RunTool({"pool", "stat", kTimeline});
    EXPECT_EQ(run.code, kFine);
    EXPECT_EQ(run.errors, "");
    std::vector<unsigned long> counts;
    for (auto place = run.output.find(" strings"); place != run.output.npos;
         place = run.output.find(" strings", place + 1)) {
        std::string number;
        for (auto at = place; at-- > 0 && run.output[at] != ' ';)
            if (run.output[at] != ',') number.insert(0, 1, run.output[at]);
        counts.push_back(std::stoul(number));
    }
    ASSERT_EQ(counts.size(), 5u) << run.output;
    EXPECT_GT(counts[1], counts[0] + 1000) << "open";
    EXPECT_EQ(counts[2], counts[1]) << "closed";
    EXPECT_EQ(counts[3], counts[2]) << "one sweep";
    EXPECT_EQ(counts[4], counts[0]) << "two sweeps";
    EXPECT_EQ(RunTool({"pool", "stat"}).code, kFine);
}

TEST(ToolAbout, TellsTheProcessAndTheSwitches) {
    const Finished run = RunTool({"about"});
    EXPECT_EQ(run.code, kFine);
    for (const char* line :
         {"version           1.", "platform          Windows\n", "process           tavo", "startup path      /",
          "AssertBox         off\n", "LogFailedHRESULT  off\n", "BreakOnHRESULT    off\n"})
        EXPECT_TRUE(Contains(run.output, line)) << line << "in\n" << run.output;
}

TEST(ToolUsage, HasCodesOfItsOwn) {
    const struct {
        std::vector<std::string> arguments;
        int code;
    } rows[] = {
        {{}, kUsage},
        {{"xml"}, kUsage},
        {{"pool"}, kUsage},
        {{"nothing"}, kUsage},
        {{"xml", "check"}, kUsage},
        {{"xml", "check", "--nothing", kNotes}, kUsage},
        {{"xml", "get", kNotes}, kUsage},
        {{"xml", "get", kNotes, "note", "more"}, kUsage},
        {{"xml", "set", kNotes, "note", "text"}, kUsage},
        {{"xml", "format", kNotes}, kUsage},
        {{"xml", "format", kNotes, "-o", "-", "--encoding", "latin-1"}, kUsage},
        {{"xml", "stat", kNotes, "--repeat", "0"}, kUsage},
        {{"xml", "stat", kNotes, "--repeat", "x"}, kUsage},
        {{"--help"}, kFine},
        {{"xml", "set", "--help"}, kFine},
        {{"--version"}, kFine},
    };
    for (const auto& row : rows) {
        SCOPED_TRACE(testing::PrintToString(row.arguments));
        const Finished run = RunTool(row.arguments);
        EXPECT_EQ(run.code, row.code);
        EXPECT_EQ(run.output.empty(), row.code != kFine);
        EXPECT_EQ(run.errors.empty(), row.code == kFine);
    }
}

// Long enough for a progress line on a terminal; but this is none.
TEST(ToolProgress, StaysOutOfFiles) {
    const Finished run = RunTool({"xml", "stat", "--repeat", support::RepeatsFor(1000, kTimeline), kTimeline});
    EXPECT_EQ(run.code, kFine);
    EXPECT_EQ(run.errors, "");
    EXPECT_FALSE(Contains(run.output, "\x1b"));
}
