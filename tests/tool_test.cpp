// The command-line tool, run as its users run it: what it prints, writes and answers.

#include "support/process.h"
#include "support/scratch.h"

#include <algorithm>
#include <sstream>

using support::Finished;
using support::RunTool;

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
};

std::string Get(const std::string& path) { return support::Get(support::Widen(path)); }
bool Contains(const std::string& text, const std::string& part) { return text.find(part) != text.npos; }
bool Tells(const std::string& text, const std::string& part) {
    return part.empty() ? text.empty() : Contains(text, part);
}

// The units of an ASCII text, low byte first or last.
std::string Utf16(const std::string& ascii, bool bigEndian = false) {
    std::string bytes;
    for (const char c : ascii) bytes += bigEndian ? std::string{'\0', c} : std::string{c, '\0'};
    return bytes;
}

void ExpectRun(const Finished& run, int code, const std::string& output, const std::string& errors) {
    EXPECT_EQ(run.code, code);
    EXPECT_EQ(run.output, output);
    EXPECT_TRUE(Tells(run.errors, errors)) << run.errors;
}

// A command's arguments stand between bars.
Finished Call(const std::string& command, const std::string& input = {}) {
    std::vector<std::string> arguments(1);
    for (const char c : command)
        if (c == '|')
            arguments.emplace_back();
        else
            arguments.back() += c;
    return RunTool(arguments, input);
}

struct Row {
    std::string arguments; // behind those that all rows have
    int code;
    std::string output, errors = {}; // parts of what is written; empty for nothing at all
};

void ExpectRows(const std::string& command, const std::string& input, std::initializer_list<Row> rows) {
    for (const Row& row : rows) {
        const Finished run = Call(command + row.arguments, input);
        EXPECT_TRUE(run.code == row.code && Tells(run.output, row.output) && Tells(run.errors, row.errors))
            << command << row.arguments << ": " << run.code << '\n'
            << run.output << run.errors;
    }
}

void ExpectLines(const std::string& command, const std::string& input, std::initializer_list<const char*> lines) {
    const Finished run = Call(command, input);
    EXPECT_TRUE(run.code == kFine && run.errors.empty()) << run.errors;
    for (const char* line : lines) EXPECT_TRUE(Contains(run.output, line)) << line << "in\n" << run.output;
}

} // namespace

TEST(ToolCheck, TellsCodeLineColumnAndOffset) {
    const struct {
        std::string text;
        const char* complaint; // with "line:column: " before it
        const char* words;
    } rows[] = {
        {"", "1:1: error 0 (Bad file) at offset 0: ", "empty"},
        {"<a>\n<b/>\n", "3:1: error 1 (End of file) at offset 9: ", "ends before"},
        {"<!-- don't --><a/>", "1:9: error 3 (Open string) at offset 8: ", "apostrophe"},
        {"\xEF\xBB\xBF<a", "1:3: error 4 (Open enclosure) at offset 5: ", "'>'"},
        {"<a>\r\n&#x41;</a>", "2:1: error 7 (Bad escape) at offset 5: ", "hexadecimal"},
        {"<a>\nxy\xFFz</a>", "2:3: error 13 (Bad character encoding) at offset 6: ", "Latin-1"}, // found by the tool
        {"<a>\xC3", "1:4: error 13 (Bad character encoding) at offset 3: ", "UTF-8"},
        {"<a>\n\xC3\xA9\xE2\x82\xAC<b/></a>", "2:3: error 15 (Mixed content) at offset 9: ", "not both"},
        {"<!-- x -->", "1:11: error 128 (No element) at offset 10: ", "no element"},
        {Utf16("<a>\n\n<b/>x</a>"), "3:5: error 15 (Mixed content) at offset 9: ", "not both"},
        {"\xFF\xFE" + Utf16("<a></b>"), "1:4: error 14 (Bad termination tag) at offset 4: ", "match"},
        {Utf16("<a></b>", true), "1:4: error 14 (Bad termination tag) at offset 3: ", "match"},
        {Utf16("<a>") + std::string("\x3D\xD8\x00\xDE", 4) + Utf16("</b>"), // columns count pairs once
         "1:5: error 15 (Mixed content) at offset 5: ", "not both"},
    };
    for (const auto& row : rows) {
        const Finished run = RunTool({"xml", "check", "-"}, row.text);
        EXPECT_TRUE(run.code == kBadInput && run.errors.empty()) << run.errors;
        EXPECT_EQ(run.output.find(std::string("(standard input):") + row.complaint), 0u) << run.output;
        EXPECT_TRUE(Contains(run.output, row.words)) << run.output;
    }
    ExpectRun(Call("xml|check|-", "\xEF\xBB\xBF<a/>"), kFine, "(standard input): fine\n", "");
    ExpectRows("xml|check|-", "<reel>\n <clip></reel>", {{"", kBadInput, "\n    <reel> <clip>[[*]]</reel>\n"}});
    ExpectRun(Call("xml|check|-", "<a b=\"&amp;\">&lt;&#65;<!-- & --><![CDATA[&]]></a>"), kFine,
              "(standard input): fine\n", "2 references by name");
}

TEST(ToolCheck, StopsOrKeepsGoing) {
    const Folder folder;
    const std::string good = folder.Put("good.xml", "<a/>"), bad = folder.Put("bad.xml", "<a>");
    const std::string none = folder / "none.xml";
    Finished run = RunTool({"xml", "check", good, bad, good});
    EXPECT_EQ(run.code, kBadInput);
    EXPECT_EQ(run.output.find(good + ": fine\n" + bad + ":1:4: error 1 "), 0u) << run.output;
    EXPECT_EQ(run.output.find(": fine"), run.output.rfind(": fine"));
    ExpectRows("xml|check|", "",
               {{"--keep-going|" + bad + '|' + none + '|' + good, kFileTrouble, good + ": fine\n", none + ": does not"},
                {none + '|' + good, kFileTrouble, "", none + ": does not exist"},
                {folder / ".", kFileTrouble, "", "is a folder"},
                {folder / "new/none.xml", kFileTrouble, "", "does not exist"}});
    EXPECT_FALSE(TAVO::Files::OS::_TestDirExists(support::Widen(folder / "new"))) << "looking makes no folders";
}

TEST(ToolTree, OutlinesAndJson) {
    const std::string text = "<a b=\"1\" c=\"&#34;\"><d>x\xC3\xA9<![CDATA[\n\\\t\x01]]></d><e/></a>";
    ExpectRun(Call("xml|tree|-", text), kFine, "a b=\"1\" c=\"\\\"\"\n  d: \"x\xC3\xA9\\n\\\\\\t\\u0001\"\n  e\n", "");
    ExpectRun(Call("xml|tree|--json|-", text), kFine,
              "{\"name\":\"a\",\"attributes\":{\"b\":\"1\",\"c\":\"\\\"\"},\"children\":[\n"
              "{\"name\":\"d\",\"text\":\"x\xC3\xA9\\n\\\\\\t\\u0001\"},\n{\"name\":\"e\"}]}\n",
              "");
    ExpectRun(Call("xml|tree|-", "<a>"), kBadInput, "", ":1:4: error 1 ");
}

TEST(ToolTree, MayBeDeeperThanAnyStack) {
    constexpr std::size_t kDepth = 100000;
    std::string text;
    for (std::size_t i = 0; i < kDepth; ++i) text += "<a>";
    for (std::size_t i = 0; i < kDepth; ++i) text += "</a>";
    EXPECT_TRUE(Contains(Call("xml|tree|-", text).output, "(99999) a\n"));
    EXPECT_EQ(Call("xml|tree|--json|-", text).code, kFine);
    EXPECT_EQ(Call("xml|format|--strict|-|-o|-", text).code, kFine);
}

TEST(ToolGet, FindsTextsAndAttributes) {
    ExpectRows("xml|get|" + kTimeline + '|', "",
               {{"project/title", kFine, "The ferry at six\n"},
                {".|--attribute|version", kFine, "1.2\n"},
                {"project/script", kFine, "if (shot.rate < 25 && !shot.locked) { conform(shot, \"24/1\"); }\n"},
                {".|--attribute|none", kBadInput, "", "has no attribute none"},
                {"bins", kBadInput, "", "10 elements and no text"},
                {"bins/bin/clip/media", kFine, "\n"},
                {"", kUsage, "", "no path"},
                {".|--attribute|1", kUsage, "", "no attribute"}});
}

TEST(ToolGet, ReadsValuesOrNamesTheCharacter) {
    const char* const values[][3] = {
        {"int", " -7 of 9", "-7"},
        {"uint", "-1", "4294967295"},
        {"hex", "FF", "0xff"},
        {"int64", "-9223372036854775808", "-9223372036854775808"},
        {"double", "-1.50e1", "-15"},
        {"edouble", "3ff8000000000000(1.5)", "1.5"},
        {"rational", "50 / 2", "25/1"},
        {"bool", "TRUE", "true"},
        {"timecode", "10:00:00:00 {25/1}Hz", "10:00:00:00 {25/1}Hz"},
        {"id", "00000000-0000-0000-0000-000000000000", "00000000-0000-0000-0000-000000000000"},
        {"binary", "21BA", "12ab"}};
    for (const auto& [type, text, value] : values)
        ExpectRun(Call(std::string("xml|get|-|.|--as|") + type, std::string("<v>") + text + "</v>"), kFine,
                  std::string(value) + '\n', "");
    const char* const faults[][3] = {{"int", "+x7", "character 2 is \"x\", where a digit belongs"},
                                     {"hex", "0xg", "character 3 is \"g\", where a hexadecimal digit"},
                                     {"double", "-.", "it ends where character 3, a digit, belongs"},
                                     {"edouble", "(1.5)", "character 1 is \"(\""},
                                     {"rational", "50:2", "character 3 is \":\", where \"/\" belongs"},
                                     {"rational", "5/\xC3\xA9", "character 3 is \"\xC3\xA9\", where a digit"},
                                     {"bool", "falsch", "character 5 is \"c\", where \"true\" or \"false\""},
                                     {"timecode", "10:00:00:25 {25/1}Hz", "the frames are 25"},
                                     {"timecode", "10:00:00:00", "does not tell the rate"},
                                     {"id", "{15603cd4-ab81-4d6f-b05f-c6bea760a789}", "without braces"},
                                     {"binary", "21B", "it ends where character 4, the second digit"},
                                     {"binary", "", "it ends where character 1, a hexadecimal digit"}};
    for (const auto& [type, text, fault] : faults)
        ExpectRows(std::string("xml|get|-|.|--as|") + type, std::string("<v>") + text + "</v>",
                   {{"", kBadInput, "", fault}});
    ExpectRows("xml|get|" + kTimeline + "|bins/bin/clip|--attribute|", "",
               {{"rate|--as|rational", kFine, "50/1\n"},
                {"rate|--as|number", kUsage, "", "not in"},
                {"name|--as|int", kBadInput, "", "clip name: \"Harbour 01\""}});
}

TEST(ToolSet, ChangesTextsAndAttributes) {
    const std::string head = "UTF-8\"?><a x=\"1\"><b>", rest = "</b><c><d/></c></a>";
    ExpectRows("xml|set|-o|-|-|", "<a x=\"1\"><b>old</b><c><d/></c></a>",
               {{"b|\xE6\x97\xA5", kFine, head + "\xE6\x97\xA5" + rest},
                {"b|", kFine, "<a x=\"1\"><b/><c><d/></c></a>"},
                {"b|--|-5", kFine, head + "-5" + rest},
                {".|2|--attribute|x", kFine, "<a x=\"2\"><b>old" + rest},
                {"c/d|2|--attribute|y", kFine, head + "old</b><c><d y=\"2\"/></c></a>"},
                {".||--attribute|x", kFine, "<a><b>old" + rest},
                {"b|p|--pretty", kFine, "\r\n<a x=\"1\">\r\n  <b>p</b>\r\n  <c>\r\n    <d/>\r\n  </c>\r\n</a>\r\n"},
                {"c|text", kBadInput, "", "holds elements"},
                {"b//c|text", kUsage, "", "no path"},
                {"b|\xF4\x80\x80\x80", kBadInput, "", "cannot be kept"},
                {"b|x  y", kFine, head + "x  y" + rest, "1 text reads back differently"},
                {".|&|--attribute|x", kFine, "<a x=\"&amp;\"><b>old" + rest, "comes back as \"<;\""},
                {"b|\xF0\x9F\x98\x80|--strict", kBadInput, "", "not written"}});

    const Folder folder;
    const std::string file = folder.Put("a.xml", "<a><b>1</b></a>");
    ExpectRun(RunTool({"xml", "set", file, "b", "2", "-o", file}), kFine, "", "");
    const std::string changed = Get(file);
    EXPECT_TRUE(Contains(changed, "<a><b>2</b></a>"));
    EXPECT_EQ(RunTool({"xml", "set", file, "b", "x  y", "--strict", "-o", file}).code, kBadInput);
    EXPECT_EQ(RunTool({"xml", "set", file, "q", "3", "-o", file}).code, kBadInput);
    EXPECT_EQ(Get(file), changed) << "left alone on failure";
}

// The tree of each sample stays the same through every form of output, from files and standard input.
TEST(ToolFormat, KeepsTheSamplesInEveryEncoding) {
    const Folder folder;
    const std::string out = folder / "out.xml";
    for (const std::string& sample : {kTimeline, kNotes}) {
        const std::string tree = RunTool({"xml", "tree", sample}).output;
        EXPECT_GT(tree.size(), 500u);
        for (const std::string form : {"utf-8", "utf-16|--pretty", "utf-16-raw", "utf-8|--pretty"}) {
            const std::string command = "xml|format|--strict|--encoding|" + form;
            ExpectRun(Call(command + '|' + sample + "|-o|" + out), kFine, "", "");
            EXPECT_EQ(RunTool({"xml", "tree", out}).output, tree) << form;
            ExpectRun(Call(command + "|-|-o|-", Get(sample)), kFine, Get(out), "");
        }
    }
    const std::string head = "<?xml version=\"1.0\" encoding=\"UTF-16\"?><a>";
    for (const char* encoding : {"utf-16", "utf-16-raw"})
        ExpectRun(RunTool({"xml", "format", "-", "-o", "-", "--encoding", encoding}, "<a>\xC3\xA9</a>"), kFine,
                  Utf16(head) + std::string("\xE9\0", 2) + Utf16("</a>"), "");
}

// Characters above U+FFFF: shown as they came, lost in every output but the raw one, and the tool says so.
TEST(ToolFormat, TellsWhatIsLost) {
    const std::string smile = "\xF0\x9F\x98\x80", pair("\x3D\xD8\x00\xDE", 4), utf8 = "<a>" + smile + "</a>";
    const std::string utf16 = Utf16("<a>") + pair + Utf16("</a>");
    for (const std::string& text : {utf8, utf16}) {
        ExpectRun(Call("xml|get|-|.", text), kFine, smile + '\n', "");
        const std::string lost = "the text \"" + smile + "\" in a, which comes back as \"\\u0001\"";
        ExpectRows("xml|format|-|-o|-|--encoding|", text,
                   {{"utf-8", kFine, "<a>\x01</a>", lost}, {"utf-16", kFine, Utf16("<a>\x01</a>"), lost}});
    }
    ExpectRows("xml|format|-|-o|-|--encoding|utf-16-raw|--strict", utf16, {{"", kFine, pair}});
    const Folder folder;
    EXPECT_EQ(RunTool({"xml", "format", "-", "--strict", "-o", folder / "out.xml"}, utf8).code, kBadInput);
    EXPECT_EQ(Get(folder / "out.xml"), "(no file)");
}

TEST(ToolFiles, MayHaveAnyName) {
    const Folder folder;
    for (const char* name : {"with blank.xml", "\xC3\xA9t\xC3\xA9.xml", "\xE6\x97\xA5\xE6\x9C\xAC.xml",
                             "\xF0\x9F\x98\x80.xml", "-minus.xml"}) {
        const std::string file = folder / name;
        ExpectRun(RunTool({"xml", "format", kNotes, "-o", file}), kFine, "", "");
        ExpectRun(RunTool({"xml", "check", file}), kFine, file + ": fine\n", "");
    }
    EXPECT_EQ(support::List(folder.wide).size(), 5u);
    ExpectRun(RunTool({"xml", "format", kNotes, "-o", folder / "."}), kFileTrouble, "", "cannot be opened for writing");
    ExpectRun(RunTool({"xml", "format", folder / "none", "-o", "-"}), kFileTrouble, "", "does not exist");
}

TEST(ToolStat, CountsWhatIsThere) {
    ExpectLines("xml|stat|--repeat|3|-", "<a x=\"1\" y=\"1\"><b>1</b><b>2</b><c/></a>",
                {"size                  39 bytes, UTF-8\n", "elements              4, 2 levels deep\n",
                 "attributes            2\n", "texts                 2\n", "distinct strings      7\n",
                 " average of 3\n", " MB/s\n", "per element           ", "strings that were new\n"});
    ExpectLines("xml|stat|" + kTimeline + '|' + kNotes, "",
                {"2 documents\n  size                  67,023 bytes\n", "  elements              772\n"});
    ExpectRows("xml|stat|none.xml|", "", {{kNotes, kFileTrouble, "elements              19,", "does not exist"}});
    ExpectLines("about", "",
                {"version           1.", "platform          Windows\n", "process           tavo", "startup path      /",
                 "AssertBox         off\n", "LogFailedHRESULT  off\n", "BreakOnHRESULT    off\n"});
}

TEST(ToolStat, PoolForgetsWithTheSecondSweep) {
    const Finished run = RunTool({"pool", "stat", kTimeline});
    ASSERT_TRUE(run.code == kFine && run.errors.empty()) << run.errors;
    std::vector<unsigned long> counts;
    std::string output = run.output;
    std::erase(output, ',');
    std::istringstream words(output);
    for (std::string word, number; words >> word; number = word)
        if (word == "strings") counts.push_back(std::stoul(number));
    ASSERT_EQ(counts.size(), 5u) << run.output;
    EXPECT_GT(counts[1], counts[0] + 1000) << "open";
    EXPECT_EQ(counts[2], counts[1]) << "closed";
    EXPECT_EQ(counts[3], counts[2]) << "one sweep";
    EXPECT_EQ(counts[4], counts[0]) << "two sweeps";
}

TEST(ToolTimecode, ListsTheSystems) {
    ExpectLines("tc|systems", "",
                {"   0  PAL               25/1     48     24  :::         none\n",
                 "   5  HDFILM(DF)  24000/1001     50     25  ..,         00 to 01, not each 4th minute\n",
                 "   8  HDNTSC(DF)  60000/1001     20     10  ...         00 to 03, not each 10th minute\n",
                 "No standard knows HDFILM(DF).\n"});
    ExpectLines("tc|systems|--json", "",
                {"{\"code\":9,\"name\":\"PAL(PX)\",\"rate\":\"25/2\",\"frameUnits\":96,\"fieldUnits\":48,"
                 "\"unitSeconds\":0.0008333333333333334,\"drop\":null,\"separators\":\".,:\"},\n",
                 "\"drop\":{\"frames\":4,\"period\":10}"});
}

TEST(ToolTimecode, TakesSystemsByNameCodeAndRate) {
    ExpectRows("tc|show|0|--system|", "",
               {{"ntsc(df)", kFine, "system            2 NTSC(DF)\n"},
                {"30000/1001/D", kFine, "system            2 NTSC(DF)\n"},
                {"25/1/ND", kFine, "system            0 PAL\n"},
                {"5", kFine, "system            5 HDFILM(DF)\n", "warning: no standard knows HDFILM(DF)"},
                {"30000/1001", kUsage, "", "that of NTSC and of NTSC(DF), so write 30000/1001/ND or 30000/1001/D"},
                {"25/1/D", kUsage, "", "no drop frame at this rate"},
                {"30000/1001/X", kUsage, "", "behind the rate stands /D"},
                {"0/0", kUsage, "", "no system has this rate"},
                {"99999999999/1", kUsage, "", "no system has this rate"},
                {"14", kUsage, "", "codes go from 0 to 13"},
                {"29.97", kUsage, "", "give a name, a code, or a rate"},
                {"\xFF", kUsage, "", "\"\xEF\xBF\xBD\" is no system"}});
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
    ExpectLines("tc|show|9223372036854775807|--system|PAL", "",
                {"fields            384307168202282325\n", "days              88959992639\n",
                 "fixed text        >##:##:##:##\n"});
}

TEST(ToolTimecode, ReadsCountsWithUnits) {
    ExpectRows("tc|check|--system|0|", "",
               {{"+1200", kFine, "PAL, 1200 base"},
                {"25frames", kFine, "PAL, 1200 base"},
                {"1.5s", kFine, "PAL, 1800 base"},
                {"89478485fields", kFine, "PAL, 2147483640 base"},
                {"89478486fields", kBadInput, "89478485 at most"},
                {"192153584101141162frames", kFine, "PAL, 9223372036854775776 base"},
                {"192153584101141163frames", kBadInput, "64 bits"},
                {"1.5frames", kBadInput, "only seconds may have a point"},
                {"25bits", kBadInput, "character 3 is \"b\", where a separator behind the hours belongs"},
                {"+", kBadInput, "it ends after character 1, where a digit of the hours belongs"}});
}

TEST(ToolTimecode, ChecksTextsAndTellsWhatIsWrong) {
    const std::string valid = "valid, ", invalid = "invalid: ", none = "unassigned: ";
    const std::pair<std::string, std::string> rows[] = {
        {" 10:00:00:00", valid + "PAL, 43200000 base units"},
        {"-10:00:00:00", valid + "PAL, -43200000 base units"},
        {"10:00:00:00 {30000/1001}Hz/D", valid + "NTSC(DF), 43156800 base units"},
        {"10:00:00:25", invalid + "the frames are 25: PAL counts 00 to 24"},
        {"10.00,01:12", invalid + "the frames are 12: in an odd second PAL(PX) counts 00 to 11"},
        {"10.00,00:12", valid + "PAL(PX)"},
        {"00.01:00.01", "NTSC(DF) skips this label, the minute begins with frame 02"},
        {"00:01:00:00 {24000/1001}Hz/D", invalid + "the frames are 00: HDFILM(DF) skips this label"},
        {"744:00:00:00 {25/1}Hz", invalid + "the hours are 744: they go to 743"},
        {"10:00:00:00+{25/1}Hz", "the mark \"+\" moves by a span that is too large in PAL"},
        {"*##:##:##:##", invalid + "this is how an invalid position"},
        {" --:--:--:--", none + "dashes stand for a position that is not given"},
        {"", none + "it is empty"},
        {"x", none + "character 1 is \"x\", where a digit of the hours belongs"},
        {"10:00:00:\xC3\xA9\x30", "character 10 is \"\xC3\xA9\", where a digit of the frames"},
        {"10:00:00", none + "it ends after character 8, where a separator behind the seconds"},
        {"10.00,00.00", none + "no system has the separators \".\", \",\" and \".\""},
        {"1200", none + "it is a count without fields, and does not tell its system"},
        {"\xFF", none}, // Windows turns it into a character
        {std::string(300, '1') + ':', none + "character 3 is \"1\", where a separator behind"},
        {"10:00:00:00 {25/2}Hz/D", none + "there is no drop frame at the rate 25/2"},
        {"10:00:00:00\xC3\xA9{25/1}Hz", valid + "PAL, 43200000 base units"}, // any mark does
        {"10:00:00:00\xC3\xA9{25\xC3\xA9", "character 16 is \"\xC3\xA9\", where \"/\" within"},
        {"10:-1:00:00 {25/1}Hz", invalid + "the minutes are 4294967295"},
        {"99999999999:0:0:0 {25/1}Hz", "the number of the hours does not fit 32 bits"},
        {"10:00:00:00 {25/1}Hz" + std::string(100, ' '), "47 characters at most, and this one 120"},
    };
    std::vector<std::string> arguments = {"tc", "check", "--"};
    for (const auto& row : rows) arguments.push_back(row.first);
    const Finished run = RunTool(arguments);
    EXPECT_EQ(run.code, kBadInput) << "the worst of all";
    std::istringstream lines(run.output);
    std::string line;
    for (const auto& [text, words] : rows)
        EXPECT_TRUE(std::getline(lines, line) && Contains(line, words)) << text << '\n' << line;
    EXPECT_FALSE(std::getline(lines, line)) << "a line each";
    // With a system: its separators or colons, for drop frame also ';' before the frames.
    ExpectRows("tc|check|--system|", "",
               {{"2|00:01:00:02", kFine, valid + "NTSC(DF), 72000 base units"},
                {"2|00:01:00;02", kFine, valid + "NTSC(DF), 72000 base units"},
                {"2|00:01:00:00", kBadInput, invalid + "the frames are 00: NTSC(DF) skips this label"},
                {"1|00:01:00;02", kBadInput, invalid + "its separators are those of HD30 and not of NTSC"},
                {"0|00,01:00.02", kBadInput, invalid + "its separators are those of no system and not of PAL"},
                {"1|10:00:00:00 {25/1}Hz", kBadInput, invalid + "its rate is that of PAL and not of NTSC"}});
    ExpectRun(RunTool({"tc", "check", "--json", "10:00:00:25"}), kBadInput,
              "[\n{\"text\":\"10:00:00:25\",\"verdict\":\"invalid\",\"reason\":\"the frames are 25: PAL counts 00 to "
              "24\"}\n]\n",
              "");
}

TEST(ToolTimecode, Computes) {
    ExpectRows(
        "tc|", "",
        {{"show|10:00:00:25", kBadInput, "", "the frames are 25"},
         {"convert|10:00:00:00|--to|NTSC(DF)", kFine, "count             43200000\n"},
         {"convert|10:00:00:00|--to|2|--align", kFine, "fixed text         10.00:36.00\n"},
         {"convert|10:00:00:00|--to|2|--retime", kFine, "count             43156843\n"},
         {"convert|25|--from|PAL|--to|FILM|--align", kFine, "count             50\n"},
         {"convert|00.00.01,00|--to|PAL", kFine, "system            0 PAL\n", "warning: no standard knows HDFILM(DF)"},
         {"convert|1200|--to|PAL", kBadInput, "", "does not tell its system"},
         {"convert|10:00:00:00|--to|30000/1001", kUsage, "", "30000/1001/D"},
         {"convert|10:00:00:00|--to|2|--align|--retime", kUsage, "", "--retime"},
         {"convert|9223372036854775807|--from|NTSC|--to|PAL|--retime", kBadInput, "", "64 bits"},
         {"add|00.00:59.29|1frames", kFine, "fixed text         00.01:00.02\n"},
         {"sub|00:00:00:00|00:00:01:00", kFine, "fixed text        -00:00:01:00\n"},
         {"add|1.5s|30frames|--system|HD30", kFine, "seconds           2.5\n"},
         {"add|10:00:00:00|00.00:01.00", kFine, "count             43201200\n", "last differently"},
         {"add|10:00:00:00|x", kBadInput, "", "\"x\" is unassigned: character 1"},
         {"add|9223372036854775807|1|--system|0", kBadInput, "", "64 bits"},
         {"table|00.00:59.29|--frames|1", kFine,
          "    +0           71960   00.00:59.29  00:00:59:29 {30000/1001}Hz/D\n"
          "    +1           72000   00.01:00.02  00:01:00:02 {30000/1001}Hz/D\n"},
         {"table|--system|HDNTSC(DF)|--frames|1", kFine,
          "    -1           71980   00.00.59.59  00:00:59:59 {60000/1001}Hz/D\n"
          "    +0           72000   00.01.00.04  00:01:00:04 {60000/1001}Hz/D\n"},
         {"table|--system|PAL|--frames|0|--json", kFine, "\"count\":72000,"},
         {"table|--system|PAL|--frames|-1", kUsage, "", "--frames"}});
}

TEST(ToolRational, Approximates) {
    ExpectRows("rational|approx|--max-den|", "",
               {{"2000|29.97002997", kFine, "fraction          30000/1001\n"},
                {"113|3.141592653589793", kFine, "fraction          355/113\n"},
                {"112|3.141592653589793", kFine, "fraction          333/106\n"},
                {"3|--|-0.3333", kFine, "fraction          -1/3\n"},
                {"1|1073741825", kBadInput, "", "magnitude goes to 1073741823"},
                {"1|1e999", kBadInput, "", "out of the range"},
                {"1|1x", kBadInput, "", "character 2"},
                {"1|", kBadInput, "", "character 1"},
                {"1073741824|1", kUsage, "", "--max-den"},
                {"9|0.5|--json", kFine,
                 "{\"fraction\":\"1/2\",\"numerator\":1,\"denominator\":2,\"value\":0.5,\"offBy\":0}\n"}});
}

TEST(ToolUsage, HasCodesOfItsOwn) {
    for (const std::string command :
         {"xml", "pool", "nothing", "xml|check", "xml|check|--nothing|x", "xml|get|x", "xml|get|x|y|z", "xml|set|x|y|z",
          "xml|format|x", "xml|format|x|-o|-|--encoding|latin-1", "xml|format|x|-o|-|--encoding|UTF-16",
          "xml|stat|x|--repeat|0", "xml|stat|x|--repeat|x", "rational|approx|1", "id|new|--count|0"}) {
        const Finished run = Call(command);
        EXPECT_TRUE(run.code == kUsage && run.output.empty() && !run.errors.empty()) << command;
    }
    EXPECT_EQ(RunTool({}).code, kUsage);
    for (const char* command : {"--help", "xml|set|--help", "--version"}) ExpectLines(command, "", {"\n"});
}

// Long enough for a progress line on a terminal; but this is none.
TEST(ToolProgress, StaysOutOfFiles) {
    const Finished run = RunTool({"xml", "stat", "--repeat", support::RepeatsFor(1000, kTimeline), kTimeline});
    EXPECT_TRUE(run.code == kFine && run.errors.empty() && !Contains(run.output, "\x1b")) << run.errors;
}

TEST(ToolId, ParsesFormatsAndMakes) {
    const std::string id = "15603CD4-AB81-4D6F-B05F-C6BEA760A789", lower = "15603cd4-ab81-4d6f-b05f-c6bea760a789";
    for (const std::string& text : {id, lower, '{' + id + '}', std::string("15603CD4AB814D6FB05Fc6bea760a789")})
        ExpectRun(RunTool({"id", "parse", text}), kFine, '"' + text + "\": " + id + '\n', "");
    const std::string ends = ": invalid: it ends where character ";
    ExpectRows(
        "id|parse|", "",
        {{"", kBadInput, ends + "1, a hexadecimal digit, belongs; the library reads the null identifier"},
         {id.substr(0, 35), kBadInput, ends + "36, a hexadecimal digit, belongs; the library refuses it"},
         {id + "\xC3\xA9", kBadInput, "character 37 is \"\xC3\xA9\", where the end belongs; the library reads 1"},
         {'{' + id, kBadInput, ends + "38, \"}\", belongs; the library refuses it"},
         {"15603CD4-AB81-4D6FB05F-C6BEA760A789", kBadInput, "character 19 is \"B\", where \"-\" belongs; the"}});
    ExpectRun(RunTool({"id", "format", "--json", lower}), kFine,
              "[\n{\"identifier\":\"" + id + "\",\"lowerCase\":\"" + lower + "\",\"braces\":\"{" + id +
                  "}\",\"digits\":\"15603CD4AB814D6FB05FC6BEA760A789\",\"initializer\":\"{0x15603CD4, 0xAB81, 0x4D6F, "
                  "{0xB0, 0x5F, 0xC6, 0xBE, 0xA7, 0x60, 0xA7, 0x89}}\"}\n]\n",
              "");
    ExpectRun(RunTool({"id", "format", "x"}), kBadInput, "", "no identifier");
    EXPECT_EQ(RunTool({"id", "parse", Call("id|new|--count|3").output.substr(74, 36)}).code, kFine);
}

TEST(ToolCodec, CodesFilesAndPipes) {
    const Folder folder;
    std::string all;
    for (int byte = 0; byte < 256; ++byte) all += static_cast<char>(byte);
    const std::string source = folder.Put("bytes", all), text = folder / "text";
    for (const std::string code : {"3fff", "hex"}) {
        ExpectRun(Call("codec|encode|" + code + "|" + source + "|-o|" + text), kFine, "", "");
        ExpectRun(Call("codec|decode|" + code + "|" + text), kFine, all, "");
        ExpectRun(Call("codec|decode|" + code, "\xEF\xBB\xBF" + Get(text) + "\r\n"), kFine, all, "");
    }
    ExpectRun(Call("codec|decode|hex|-|--nibbles|low-first", "f1\n 1 0"), kFine, "\x1F\x01", "");
    ExpectRun(Call("codec|decode|hex", "\xFE\xFF" + Utf16("4F4b", true)), kFine, "OK", "");
    ExpectRun(Call("codec|encode|3f", std::string("\0\x0E", 2)), kFine, "\xC4\x81!\x01!!\n",
              "1 of 2 bytes would come back changed, the first at offset 1");
    ExpectRun(Call("codec|encode|3f|--strict|-o|" + text + "3f", "abc"), kBadInput, "", "3 bytes are a multiple of 3");
    EXPECT_EQ(Get(text + "3f"), "(no file)");
}

TEST(ToolCodec, TellsThePlaceOfFaults) {
    const std::string header = "\xCC\x86", unit = "\xE4\x80\x80", utf16 = "\xFF\xFE\x06\x03";
    const struct {
        const char* code;
        std::string text, complaint;
    } rows[] = {
        {"3fff", "\xEF\xBB\xBFx", "1, at offset 3: U+0078 is no header: that is U+0301 to U+0307"},
        {"3fff", header + unit + "a" + unit + unit, "3, at offset 5: U+0061 does not belong there"},
        {"3fff", header + unit + unit + unit + '\n', "5, at offset 11: the text ends within a group of four units"},
        {"3fff", header, "2, at offset 2: the text ends where a padded group belongs"},
        {"3fff", header + unit + "\xE4\x80", "3, at offset 5: E4 80 is truncated"},
        {"3fff", "\xF0\x9F\x98\x80", "1, at offset 0: U+1F600 belongs to no code"},
        {"3fff", utf16 + "@", "2, at offset 4: the text ends within a unit"},
        {"3f", "\xC4\x83", "1, at offset 0: U+0103 stands for a size that is a multiple of 3"},
        {"3f", "\xC4\x82!%!!", "3, at offset 3: U+0025 does not belong there"},
        {"hex", "4F 4", "5, at offset 4: the text ends within a byte"},
    };
    for (const auto& row : rows)
        ExpectRun(Call("codec|decode|" + std::string(row.code), row.text), kBadInput, "", "unit " + row.complaint);
}

TEST(ToolCrc, GivesTheCheckValueOfEachName) {
    const std::string digits = "123456789", json = Call("crc|--list|--json").output;
    const auto valueOf = [&](const std::string& name) { // as the catalogues have it, not computed
        const auto at = json.find("\"check\":", json.find("\"name\":\"" + name + '"')) + 9;
        return json.substr(at, json.find('"', at) - at);
    };
    std::istringstream list(Call("crc|--list").output);
    unsigned names = 0;
    for (std::string name, meaning; list >> name && std::getline(list >> std::ws, meaning); ++names) {
        const bool isAlias = meaning[0] != '-';
        const std::string expected = valueOf(isAlias ? meaning : name) + "  -\n";
        std::replace(meaning.begin(), meaning.end(), ' ', '|');
        EXPECT_EQ(Call("crc|--name|" + name, digits).output, expected) << name;
        EXPECT_EQ(Call("crc|" + (isAlias ? "--name|" + name : meaning), digits).output, expected) << name;
    }
    EXPECT_EQ(names, 32u);
}

TEST(ToolCrc, ReadsFilesAndNumbers) {
    const Folder folder;
    const std::string empty = folder.Put("empty", ""), large = folder.Put("large", std::string(3000000, 'x'));
    ExpectRun(Call("crc|--name|crc-16|" + empty + "|no such file|" + large), kFileTrouble,
              "0000  " + empty + "\n" + "cb0b  " + large + '\n', "no such file: does not exist");
    ExpectRows("crc|", "",
               {{"--name|crc-99", kUsage, "", "\"crc-99\" is no name"},
                {"--width|8", kUsage, "", "--poly HEX"},
                {"--name|crc-8|--refin", kUsage, "", "--name NAME alone"},
                {"--width|8|--poly|107", kUsage, "", "\"107\" is no hexadecimal number of 8 bits"},
                {"--width|8|--poly|0x", kUsage, "", "\"0x\" is no"}});
}

TEST(ToolUrl, EscapesAndNamesWhatIsNot) {
    ExpectRows(
        "url|", "",
        {{"encode|a b/\xC3\xA9", kFine, "a%20b%2F%C3%A9\n"},
         {"encode|--keep|/|a/b", kFine, "a/b\n"},
         {"encode|a%20b", kFine, "a%2520b\n", "escaped already"},
         {"encode|--keep|%|a%20b", kFine, "a%20b\n", "does not decode to itself"},
         {"decode|a%20%zz", kFine, "a %zz\n", "character 5 begins no escape"},
         {"decode|%C3%A9%C3", kFine, "\xC3\xA9\xC3\n", "byte 3 of the decoded text: C3 is truncated"},
         {"decode|a%00b", kBadInput, "", "character 2 begins %00"},
         {"from-path|/home/a b", kFine, "file:////home/a%20b\n"},
         {"from-path|a", kFine, "file:///a\n", "relative"},
         {"from-path|/\xF0\x9F\x98\x80", kBadInput, "", "above U+FFFF"},
         {"from-path|", kBadInput, "", "empty"},
         {"to-path|file:///C:/a%20b", kFine, "C:/a b\n"},
         {"to-path|file:///\xF0\x9F\x98\x80", kBadInput, "", "byte 9 of the decoded text: U+1F600 comes out"},
         {"to-path|file:///a%C3%28", kBadInput, "", "byte 10 of the decoded text: C3 is truncated"},
         {"to-path|file:///%C0%80", kBadInput, "", "a zero ends"},
         {"to-path|file://localhost", kFine, "//localhost\n"},
         {"to-path|file://", kBadInput, "", "nothing stands behind"},
         {"to-path|--json|File:///x|file:/x", kBadInput,
          "[\n{\"url\":\"File:///x\",\"path\":\"/x\"},\n{\"url\":\"file:/x\",\"reason\":\"it does not begin with "
          "file://\"}\n]\n"}});
}

TEST(ToolText, ValidatesByTheStandard) {
    const struct {
        const char* encoding;
        std::string text, told;
    } rows[] = {
        {"utf-8", "a\n\xC3\xA9\xC1\x81",
         ":2:2: invalid utf-8 at byte offset 4: C1 81 is overlong: U+0041 takes 1 byte; "
         "the library reads all of it; 1 character is changed: at 2:2"},
        {"utf-8", "\xF0\x8F\xBF\xBF", "1:1: invalid utf-8 at byte offset 0: F0 8F BF BF is overlong: U+FFFF takes 3"},
        {"utf-8", "\xED\xA0\x80", "ED A0 80 is the surrogate U+D800"},
        {"utf-8", "ab\xE2\x82",
         ":1:3: invalid utf-8 at byte offset 2: E2 82 is truncated: 1 more byte belongs to it; "
         "the library stops at 1:3 (byte offset 2)\n"},
        {"utf-8", "\xF4\x90\x80\x80", "F4 90 80 80 is U+110000, above U+10FFFF"},
        {"utf-8", "\x80", "80 continues a character"},
        {"utf-8", "\xFF", "FF never occurs"},
        {"utf-16", Utf16("a") + std::string("\x00\xDC", 2), "offset 2: DC00 is a lone low surrogate"},
        {"utf-16", "\xFE\xFF" + Utf16("a", true) + std::string("\xD8\x00\x00", 3), "4: D800 is a lone high surrogate"},
        {"utf-16be", Utf16("a", true) + "a", ":1:2: invalid utf-16be at byte offset 2: the text is truncated"},
        {"utf-32", std::string("\x00\xD8\0\0", 4), "0000D800 is a surrogate"},
        {"utf-32be", std::string("\0\x11\0\0", 4), "00110000 is above U+10FFFF"},
    };
    for (const auto& row : rows) {
        const Finished run = RunTool({"text", "validate", "--from", row.encoding, "-"}, row.text);
        EXPECT_TRUE(run.code == kBadInput && Contains(run.output, row.told)) << run.output << run.errors;
    }
    ExpectRows("text|validate|-",
               "\xEF\xBB\xBF"
               "caf\xC3\xA9",
               {{"", kFine, "(standard input): valid utf-8, 4 characters; the library reads all of it\n"}});
    ExpectRows("text|validate|--json|-", "\xFE\xFF\xD8\x3D\xDE",
               {{"", kBadInput,
                 "\"encoding\":\"utf-16\",\"valid\":false,\"line\":1,\"column\":1,\"offset\":2,\"reason\":"
                 "\"D83D is a lone high surrogate"}});
}

TEST(ToolText, CountsAndRecodes) {
    const std::string text = "a\xC3\xA9\xF0\x9F\x98\x80", pair("\x3D\xD8\x00\xDE", 4), ours("\x7D\xD8\x00\xDE", 4);
    ExpectLines("text|count|-", text, {"characters        3\n", "utf16 units       4\n", "lib characters    3\n"});
    ExpectLines("text|count|--from|utf-16|-", pair, {"utf8 bytes        4\n", "lib utf8 bytes    1\n"});
    ExpectRows(
        "text|recode|-|-o|-|--to|", text,
        {{"utf-8", kFine, text},
         {"utf-32be", kFine, std::string("\0\0\0a\0\0\0\xE9\0\1\xF6\0", 12)},
         {"utf-16", kFine, "\xFF\xFE" + Utf16("a\xE9") + ours, "at 1:3 (byte offset 3), U+1F600 is written as U+2F"},
         {"utf-16le|--strict", kBadInput, "", "not written: 1 character is changed"}});
    ExpectRows("text|recode|-|-o|-|--from|utf-16|--to|", "\xFF\xFE" + pair + pair,
               {{"utf-8", kFine, "\1\1",
                 "2 characters are changed; the first at 1:1 (byte offset 2), U+1F600 is read as U+0001"},
                {"utf-16be", kFine, std::string("\0\1\0\1", 4), "changed"}});
    ExpectRows("text|recode|-|-o|-|--to|", "a\xF4\x90\x80\x80",
               {{"utf-8", kBadInput, "", "above U+10FFFF; nothing is"}});
    ExpectRows("text|recode|-|-o|-|", "a\nb",
               {{"--from|ansi|--to|utf-8", kFine, "a\nb"}, {"--to|ansi", kFine, "a\nb"}});
    ExpectRows("text|count|", "", {{"none", kFileTrouble, "", "does not exist"}, {"-|--from|x", kUsage, "", "--from"}});
}
