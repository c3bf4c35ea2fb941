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

TEST(ToolTimecode, ListsTheSystems) {
    const Finished run = RunTool({"tc", "systems"});
    EXPECT_EQ(run.code, kFine);
    EXPECT_EQ(run.errors, "");
    for (const char* line :
         {"   0  PAL               25/1     48     24  :::         none\n",
          "   2  NTSC(DF)    30000/1001     40     20  .:.         00 to 01, not each 10th minute\n",
          "   5  HDFILM(DF)  24000/1001     50     25  ..,         00 to 01, not each 4th minute\n",
          "   8  HDNTSC(DF)  60000/1001     20     10  ...         00 to 03, not each 10th minute\n",
          "  13  HD60              60/1     20     10  :.;         none\n", "No standard knows HDFILM(DF).\n"})
        EXPECT_TRUE(Contains(run.output, line)) << line << "in\n" << run.output;
    const Finished json = RunTool({"tc", "systems", "--json"});
    EXPECT_TRUE(Contains(json.output, "{\"code\":9,\"name\":\"PAL(PX)\",\"rate\":\"25/2\",\"frameUnits\":96,"
                                      "\"fieldUnits\":48,\"unitSeconds\":0.0008333333333333334,\"drop\":null,"
                                      "\"separators\":\".,:\"},\n"))
        << json.output;
    EXPECT_TRUE(Contains(json.output, "\"drop\":{\"frames\":4,\"period\":10}"));
}

TEST(ToolTimecode, TakesSystemsByNameCodeAndRate) {
    const struct {
        const char* system;
        const char* name;  // null for what is refused
        const char* error; // part of the complaint
    } rows[] = {
        {"NTSC(DF)", "2 NTSC(DF)", ""},
        {"ntsc(df)", "2 NTSC(DF)", ""},
        {"0", "0 PAL", ""},
        {"13", "13 HD60", ""},
        {"30000/1001/D", "2 NTSC(DF)", ""},
        {"30000/1001/ND", "1 NTSC", ""},
        {"24000/1001/ND", "4 HDFILM", ""},
        {"60000/1001/D", "8 HDNTSC(DF)", ""},
        {"25/1", "0 PAL", ""},
        {"25/1/ND", "0 PAL", ""},
        {"50/2", "0 PAL", ""},
        {"25/2", "9 PAL(PX)", ""},
        {"60/1", "13 HD60", ""},
        {"5", "5 HDFILM(DF)", "warning: no standard knows HDFILM(DF)"},
        {"24000/1001/D", "5 HDFILM(DF)", "warning: no standard knows HDFILM(DF)"},
        {"30000/1001", nullptr, "that of NTSC and of NTSC(DF), so write 30000/1001/ND or 30000/1001/D"},
        {"24000/1001", nullptr, "that of HDFILM and of HDFILM(DF)"},
        {"60000/1001", nullptr, "that of HDNTSC and of HDNTSC(DF)"},
        {"25/1/D", nullptr, "no drop frame at this rate"},
        {"25/2/D", nullptr, "no drop frame at this rate"},
        {"30000/1001/X", nullptr, "behind the rate stands /D"},
        {"29/1", nullptr, "no system has this rate"},
        {"0/0", nullptr, "no system has this rate"},
        {"/", nullptr, "no system has this rate"},
        {"-25/-1", nullptr, "no system has this rate"},
        {"99999999999/1", nullptr, "no system has this rate"},
        {"14", nullptr, "codes go from 0 to 13"},
        {"25", nullptr, "codes go from 0 to 13"},
        {"29.97", nullptr, "give a name, a code, or a rate"},
        {"NTSCDF", nullptr, "give a name, a code, or a rate"},
        {"\xFF", nullptr, "\"\xEF\xBF\xBD\" is no system"},
    };
    for (const auto& row : rows) {
        SCOPED_TRACE(row.system);
        const Finished run = RunTool({"tc", "show", "0", "--system", row.system});
        EXPECT_EQ(run.code, row.name ? kFine : kUsage);
        EXPECT_EQ(run.output.find(std::string("system            ") + (row.name ? row.name : "") + '\n'),
                  row.name ? 0u : run.output.npos);
        EXPECT_TRUE(*row.error ? Contains(run.errors, row.error) : run.errors.empty()) << run.errors;
    }
}

TEST(ToolTimecode, ShowsAPositionInEveryForm) {
    ExpectRun(RunTool({"tc", "show", "10.00:00.00"}), kFine,
              "system            2 NTSC(DF)\ncount             43156800\nfields            2157840\n"
              "frames            1078920\nwhole frames      yes\nseconds           35999.96399999999\n"
              "sign              1\ndays              0\nhh                10\nmm                0\n"
              "ss                0\nff                0\nfixed text         10.00:00.00\n"
              "universal text    10:00:00:00 {30000/1001}Hz/D\n",
              "");
    ExpectRun(RunTool({"tc", "show", "--json", "--system", "PAL", "--", "-48"}), kFine,
              "{\"system\":{\"code\":0,\"name\":\"PAL\"},\"count\":-48,\"fields\":-2,\"frames\":-1,"
              "\"wholeFrames\":true,\"seconds\":-0.04,\"sign\":-1,\"days\":0,\"hh\":0,\"mm\":0,\"ss\":0,\"ff\":1,"
              "\"fixedText\":\"-00:00:00:01\",\"universalText\":\"23:59:59:24-{25/1}Hz\"}\n",
              "");
    // Counts beyond 32 bits of fields are not cut.
    const Finished end = RunTool({"tc", "show", "9223372036854775807", "--system", "PAL"});
    EXPECT_TRUE(Contains(end.output, "fields            384307168202282325\n")) << end.output;
    EXPECT_TRUE(Contains(end.output, "days              88959992639\n")) << end.output;
    EXPECT_TRUE(Contains(end.output, "fixed text        >##:##:##:##\n")) << end.output;
}

TEST(ToolTimecode, ReadsCountsWithUnits) {
    const struct {
        const char* text;
        const char* count; // null for what is refused
        const char* error;
    } rows[] = {
        {"1200", "1200", ""},
        {"+1200", "1200", ""},
        {"1200bu", "1200", ""},
        {"25frames", "1200", ""},
        {"50fields", "1200", ""},
        {"1.5s", "1800", ""},
        {"89478485fields", "2147483640", ""},
        {"89478486fields", nullptr, "89478485 at most"},
        {"99999999999999999999fields", nullptr, "64 bits"},
        {"9223372036854775808", nullptr, "64 bits"},
        {"192153584101141162frames", "9223372036854775776", ""},
        {"192153584101141163frames", nullptr, "64 bits"},
        {"1e400s", nullptr, "character 2 is \\\"e\\\""},
        {"99999999999999999999999s", nullptr, "64 bits"},
        {"1.5frames", nullptr, "only seconds may have a point"},
        {"25bits", nullptr, "character 3 is \\\"b\\\", where a separator behind the hours belongs"},
        {"25 frames", nullptr, "character 3 is \\\" \\\""},
        {"+", nullptr, "it ends after character 1, where a digit of the hours belongs"},
    };
    for (const auto& row : rows) {
        SCOPED_TRACE(row.text);
        const Finished run = RunTool({"tc", "check", "--system", "0", "--json", row.text});
        EXPECT_EQ(run.code, row.count ? kFine : kBadInput);
        const std::string wanted = row.count ? std::string("\"count\":") + row.count + ',' : row.error;
        EXPECT_TRUE(Contains(run.output, wanted)) << run.output;
    }
}

TEST(ToolTimecode, ChecksTextsAndTellsWhatIsWrong) {
    const std::string longest(300, '1');
    const struct {
        std::string text;
        const char* verdict;
        const char* words;
        const char* system = nullptr; // asked for
    } rows[] = {
        {"10:00:00:00", "valid", "PAL, 43200000 base units"},
        {" 10:00:00:00", "valid", "PAL, 43200000 base units"},
        {"-10:00:00:00", "valid", "PAL, -43200000 base units"},
        {"00.01:00.02", "valid", "NTSC(DF), 72000 base units"},
        {"10:00:00:00 {30000/1001}Hz/D", "valid", "NTSC(DF), 43156800 base units"},
        {"10:00:00:00 {25/2}Hz", "valid", "PAL(PX), 43200000 base units"},
        {"10:00:00:24", "valid", "PAL"},
        {"10:00:00:25", "invalid", "the frames are 25: PAL counts 00 to 24"},
        {"10:00:60:00", "invalid", "the seconds are 60: they go from 00 to 59"},
        {"10:60:60:99", "invalid", "the minutes are 60"},
        {"10.00,01:12", "invalid", "the frames are 12: in an odd second PAL(PX) counts 00 to 11"},
        {"10.00,00:12", "valid", "PAL(PX)"},
        {"00.01:00.01", "invalid", "NTSC(DF) skips this label, the minute begins with frame 02"},
        {"00.01.00.03", "invalid", "HDNTSC(DF) skips this label, the minute begins with frame 04"},
        {"00:01:00:00 {24000/1001}Hz/D", "invalid", "HDFILM(DF) skips this label"},
        {"744:00:00:00 {25/1}Hz", "invalid", "the hours are 744: they go to 743"},
        {"00:00:00:30 {30/1}Hz", "invalid", "the frames are 30: HD30 counts 00 to 29"},
        {"10:00:00:00+{25/1}Hz", "invalid", "the mark \"+\" moves by a span that is too large in PAL"},
        {">##:##:##:##", "invalid", "a position of a day or more"},
        {"*##:##:##:##", "invalid", "an invalid position"},
        {"--:--:--:--", "unassigned", "dashes stand for a position that is not given"},
        {" --:--:--:--", "unassigned", "dashes"},
        {"--:--:--:-- {25/1}Hz", "unassigned", "dashes"},
        {"", "unassigned", "it is empty"},
        {"x", "unassigned", "character 1 is \"x\", where a digit of the hours belongs"},
        {"10:00-00:00", "unassigned", "character 6 is \"-\", where a separator behind the minutes belongs"},
        {"10:00:0x:00", "unassigned", "character 8 is \"x\", where a digit of the seconds belongs"},
        {"10:00:00:\xC3\xA9\x30", "unassigned", "character 10 is \"\xC3\xA9\", where a digit of the frames"},
        {"10:00:00", "unassigned", "it ends after character 8, where a separator behind the seconds belongs"},
        {"10:00:00:000", "unassigned", "character 12 is \"0\", where the end belongs"},
        {"-10:00:00:00 ", "unassigned", "character 13 is \" \", where the end belongs"},
        {"10.00,00.00", "unassigned", "no system has the separators \".\", \",\" and \".\""},
        {"10,00:00:00", "unassigned", "no system has the separators \",\", \":\" and \":\""},
        {"1200", "unassigned", "it is a count without fields, and does not tell its system"},
        {"\xFF", "unassigned", ""}, // Windows turns it into a character
        {longest, "unassigned", "it is a count"},
        {longest + ':', "unassigned", "character 3 is \"1\", where a separator behind the hours belongs"},
        {"10:00:00:00 {25/3}Hz", "unassigned", "the rate 25/3 is that of no system"},
        {"10:00:00:00 {25/2}Hz/D", "unassigned", "there is no drop frame at the rate 25/2"},
        {"10:00:00 {25/1}Hz", "unassigned", "character 9 is \" \", where \":\" behind the seconds belongs"},
        {"10:00:00:00{25/1}Hz", "unassigned", "character 13 is \"2\", where \"{\" before the rate belongs"},
        {"10:00:00:00 {25-1}Hz", "unassigned", "character 16 is \"-\", where \"/\" within the rate belongs"},
        {"10:00:00:00\xC3\xA9{25/1}Hz", "valid", "PAL, 43200000 base units"}, // any mark does
        {"10:00:00:00\xC3\xA9{25\xC3\xA9", "unassigned", "character 16 is \"\xC3\xA9\", where \"/\" within"},
        {" +10:\t00:00:00 {25/3}Hz", "unassigned", "the rate 25/3 is that of no system"}, // as the library scans
        {" -10:00:00:30 {25/1}Hz", "invalid", "the frames are 30"},
        {"10:-1:00:00 {25/1}Hz", "invalid", "the minutes are 4294967295"},
        {"{", "unassigned", "character 1 is \"{\", where a number, the hours, belongs"},
        {"99999999999:0:0:0 {25/1}Hz", "invalid", "the number of the hours does not fit 32 bits"},
        {"10:00:00:00 {25/1}Hz" + std::string(100, ' '), "unassigned", "47 characters at most, and this one 120"},
        // With a system: its separators or colons, for drop frame also ';' before the frames.
        {"00:01:00:02", "valid", "NTSC(DF), 72000 base units", "NTSC(DF)"},
        {"00:01:00;02", "valid", "NTSC(DF), 72000 base units", "NTSC(DF)"},
        {"00.01:00.02", "valid", "NTSC(DF), 72000 base units", "NTSC(DF)"},
        {"00:01:00:00", "invalid", "skips this label", "NTSC(DF)"},
        {"00:01:00;02", "invalid", "its separators are those of HD30 and not of NTSC", "NTSC"},
        {"00.01:00.02", "invalid", "its separators are those of NTSC(DF) and not of PAL", "PAL"},
        {"00,01:00.02", "invalid", "its separators are those of no system and not of PAL", "PAL"},
        {"10:00:00:00 {25/1}Hz", "invalid", "its rate is that of PAL and not of NTSC", "NTSC"},
    };
    for (const auto& row : rows) {
        SCOPED_TRACE(row.text);
        std::vector<std::string> arguments = {"tc", "check"};
        if (row.system) arguments.insert(arguments.end(), {"--system", row.system});
        arguments.insert(arguments.end(), {"--", row.text});
        const Finished run = RunTool(arguments);
        const bool valid = row.verdict == std::string("valid");
        EXPECT_EQ(run.code, valid ? kFine : kBadInput);
        EXPECT_TRUE(Contains(run.output, std::string(": ") + row.verdict + (valid ? ", " : ": "))) << run.output;
        EXPECT_TRUE(Contains(run.output, row.words)) << run.output;
        // The other commands answer with the same sentence.
        arguments[1] = "show";
        const Finished show = RunTool(arguments);
        EXPECT_EQ(show.code, run.code);
        EXPECT_EQ(show.output.empty(), !valid);
        EXPECT_TRUE(valid || Contains(show.errors, row.words)) << show.errors;
    }
    EXPECT_EQ(RunTool({"tc", "check", "x", "10:00:00:00"}).code, kBadInput) << "the worst of all";
    ExpectRun(RunTool({"tc", "check", "--json", "10:00:00:25"}), kBadInput,
              "[\n{\"text\":\"10:00:00:25\",\"verdict\":\"invalid\",\"reason\":\"the frames are 25: PAL counts 00 to "
              "24\"}\n]\n",
              "");
}

TEST(ToolTimecode, Computes) {
    const struct {
        std::vector<std::string> arguments;
        int code;
        const char* output; // a line of it
        const char* errors;
    } rows[] = {
        {{"convert", "10:00:00:00", "--to", "NTSC(DF)"}, kFine, "count             43200000\n", ""},
        {{"convert", "10:00:00:00", "--to", "2", "--align"}, kFine, "fixed text         10.00:36.00\n", ""},
        {{"convert", "10:00:00:00", "--to", "2", "--retime"}, kFine, "count             43156843\n", ""},
        {{"convert", "24", "--from", "PAL", "--to", "FILM", "--align"}, kFine, "count             0\n", ""},
        {{"convert", "25", "--from", "PAL", "--to", "FILM", "--align"}, kFine, "count             50\n", ""},
        {{"convert", "00:00:01:00", "--to", "HDFILM(DF)"},
         kFine,
         "system            5 HDFILM(DF)\n",
         "warning: no standard knows HDFILM(DF)"},
        {{"convert", "00.00.01,00", "--to", "PAL"},
         kFine,
         "system            0 PAL\n",
         "warning: no standard knows HDFILM(DF)"},
        {{"convert", "1200", "--to", "PAL"}, kBadInput, "", "does not tell its system"},
        {{"convert", "10:00:00:00", "--to", "30000/1001"}, kUsage, "", "30000/1001/D"},
        {{"convert", "10:00:00:00", "--to", "2", "--align", "--retime"}, kUsage, "", "--retime"},
        {{"convert", "10:00:00:00"}, kUsage, "", "--to"},
        {{"convert", "9223372036854775807", "--from", "NTSC", "--to", "PAL", "--retime"}, kBadInput, "", "64 bits"},
        {{"add", "10:00:00:00", "25frames"}, kFine, "fixed text         10:00:01:00\n", ""},
        {{"add", "00.00:59.29", "1frames"}, kFine, "fixed text         00.01:00.02\n", ""},
        {{"sub", "00.01:00.02", "1frames"}, kFine, "fixed text         00.00:59.29\n", ""},
        {{"sub", "00:00:00:00", "00:00:01:00"}, kFine, "fixed text        -00:00:01:00\n", ""},
        {{"add", "1.5s", "30frames", "--system", "HD30"}, kFine, "seconds           2.5\n", ""},
        {{"add", "10:00:00:00", "00.00:01.00"}, kFine, "count             43201200\n", "last differently"},
        {{"add", "10:00:00:00", "x"}, kBadInput, "", "\"x\" is unassigned: character 1"},
        {{"add", "1", "1"}, kBadInput, "", "does not tell its system"},
        {{"add", "9223372036854775807", "1", "--system", "0"}, kBadInput, "", "64 bits"},
        {{"add", "10:00:00:00"}, kUsage, "", "B"},
        {{"table", "00.00:59.29", "--frames", "1"},
         kFine,
         "    +0           71960   00.00:59.29  00:00:59:29 {30000/1001}Hz/D\n"
         "    +1           72000   00.01:00.02  00:01:00:02 {30000/1001}Hz/D\n",
         ""},
        {{"table", "--system", "HDNTSC(DF)", "--frames", "1"},
         kFine,
         "    -1           71980   00.00.59.59  00:00:59:59 {60000/1001}Hz/D\n"
         "    +0           72000   00.01.00.04  00:01:00:04 {60000/1001}Hz/D\n",
         ""},
        {{"table", "--system", "PAL", "--frames", "0", "--json"}, kFine, "\"count\":72000,", ""},
        {{"table"}, kUsage, "", "--system"},
        {{"table", "--system", "PAL", "--frames", "-1"}, kUsage, "", "--frames"},
    };
    for (const auto& row : rows) {
        SCOPED_TRACE(testing::PrintToString(row.arguments));
        std::vector<std::string> arguments = {"tc"};
        arguments.insert(arguments.end(), row.arguments.begin(), row.arguments.end());
        const Finished run = RunTool(arguments);
        EXPECT_EQ(run.code, row.code);
        EXPECT_TRUE(row.code == kFine ? Contains(run.output, row.output) : run.output.empty()) << run.output;
        EXPECT_TRUE(*row.errors ? Contains(run.errors, row.errors) : run.errors.empty()) << run.errors;
    }
}

TEST(ToolRational, Approximates) {
    const struct {
        const char* number;
        const char* largest;
        int code;
        const char* words; // the fraction, or part of the complaint
    } rows[] = {
        {"29.97002997", "2000", kFine, "30000/1001"},
        {"29.97", "2000", kFine, "2997/100"},
        {"3.141592653589793", "113", kFine, "355/113"},
        {"3.141592653589793", "112", kFine, "333/106"},
        {"-0.3333", "3", kFine, "-1/3"},
        {"+2", "1", kFine, "2/1"},
        {"1e3", "1", kFine, "1000/1"},
        {"1073741823", "1", kFine, "1073741823/1"},
        {"1073741825", "1", kBadInput, "magnitude goes to 1073741823"},
        {"1e999", "1", kBadInput, "out of the range"},
        {"nan", "1", kBadInput, "no finite number"},
        {"inf", "1", kBadInput, "no finite number"},
        {"1x", "1", kBadInput, "character 2"},
        {"", "1", kBadInput, "character 1"},
        {"1", "0", kUsage, "--max-den"},
        {"1", "1073741824", kUsage, "--max-den"},
    };
    for (const auto& row : rows) {
        SCOPED_TRACE(row.number);
        const Finished run = RunTool({"rational", "approx", "--max-den", row.largest, "--", row.number});
        EXPECT_EQ(run.code, row.code);
        if (row.code == kFine)
            EXPECT_EQ(run.output.find(std::string("fraction          ") + row.words + '\n'), 0u) << run.output;
        else
            EXPECT_TRUE(run.output.empty() && Contains(run.errors, row.words)) << run.output << run.errors;
    }
    ExpectRun(RunTool({"rational", "approx", "0.5", "--max-den", "9", "--json"}), kFine,
              "{\"fraction\":\"1/2\",\"numerator\":1,\"denominator\":2,\"value\":0.5,\"offBy\":0}\n", "");
    EXPECT_EQ(RunTool({"rational", "approx", "1"}).code, kUsage);
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

TEST(ToolId, ParsesFormatsAndMakes) {
    const std::string id = "15603CD4-AB81-4D6F-B05F-C6BEA760A789", lower = "15603cd4-ab81-4d6f-b05f-c6bea760a789";
    for (const std::string& text : {id, lower, '{' + id + '}', std::string("15603CD4AB814D6FB05Fc6bea760a789")})
        ExpectRun(RunTool({"id", "parse", text}), kFine, '"' + text + "\": " + id + '\n', "");
    const std::pair<std::string, const char*> wrong[] = {
        {"", "it ends where character 1, a hexadecimal digit, belongs; the library reads the null identifier"},
        {id.substr(0, 35), "it ends where character 36, a hexadecimal digit, belongs; the library refuses it"},
        {id + "\xC3\xA9", "character 37 is \"\xC3\xA9\", where the end belongs; the library reads 15603CD4-"},
        {'{' + id, "it ends where character 38, \"}\", belongs; the library refuses it"},
        {"15603CD4-AB81-4D6FB05F-C6BEA760A789", "character 19 is \"B\", where \"-\" belongs; the library reads the"},
    };
    for (const auto& [text, reason] : wrong) {
        const Finished run = RunTool({"id", "parse", text});
        EXPECT_TRUE(run.code == kBadInput && Contains(run.output, ": invalid: " + std::string(reason))) << run.output;
    }
    ExpectRun(RunTool({"id", "format", "--json", lower}), kFine,
              "[\n{\"identifier\":\"" + id + "\",\"lowerCase\":\"" + lower + "\",\"braces\":\"{" + id +
                  "}\",\"digits\":\"15603CD4AB814D6FB05FC6BEA760A789\",\"initializer\":\"{0x15603CD4, 0xAB81, 0x4D6F, "
                  "{0xB0, 0x5F, 0xC6, 0xBE, 0xA7, 0x60, 0xA7, 0x89}}\"}\n]\n",
              "");
    ExpectRun(RunTool({"id", "format", "x"}), kBadInput, "", "no identifier");
    const Finished made = RunTool({"id", "new", "--count", "3"});
    EXPECT_EQ(RunTool({"id", "parse", made.output.substr(74, 36)}).code, kFine);
    EXPECT_EQ(RunTool({"id", "new", "--count", "0"}).code, kUsage);
}
