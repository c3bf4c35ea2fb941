// The command-line tool, run as its users run it: what it prints, writes and answers.

#include "support/log.h"
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
    std::string operator/(const std::string& name) const { return support::Ascii(scratch.Path()) + '/' + name; }
    // ASCII names only.
    std::string Put(const std::string& name, const std::string& bytes) const {
        support::Put(support::Widen(*this / name), bytes);
        return *this / name;
    }
};

std::string Get(const std::string& path) { return support::Get(support::Widen(path)); }
bool Contains(const std::string& text, const std::string& part) { return text.find(part) != text.npos; }
// Empty stands for nothing at all, and what begins with '=' for the whole text.
bool Tells(const std::string& text, const std::string& part) {
    return part.empty() || part[0] == '=' ? text == part.substr(!part.empty()) : Contains(text, part);
}

// The units of an ASCII text, low byte first or last.
std::string Utf16(const std::string& ascii, bool bigEndian = false) {
    std::string bytes;
    for (const char c : ascii) bytes += bigEndian ? std::string{'\0', c} : std::string{c, '\0'};
    return bytes;
}

// A command's arguments stand between bars.
Finished Call(const std::string& command, const std::string& input = {}) {
    std::vector<std::string> arguments;
    std::istringstream stream(command + '|');
    for (std::string each; std::getline(stream, each, '|');) arguments.push_back(each);
    return RunTool(arguments, input);
}

struct Row {
    std::string arguments; // behind those that all rows have
    int code;
    std::string output, errors = {};
};

void ExpectRows(const std::string& command, const std::string& input, const std::vector<Row>& rows) {
    for (const Row& row : rows) {
        const Finished run = Call(command + row.arguments, input);
        EXPECT_TRUE(run.code == row.code && Tells(run.output, row.output) && Tells(run.errors, row.errors))
            << command << row.arguments << ": " << run.code << '\n'
            << run.output << run.errors;
    }
}

} // namespace

TEST(ToolCheck, TellsCodeLineColumnAndOffset) {
    const struct {
        std::string text, complaint, words;
    } rows[] = {
        {"", "1:1: error 0 (Bad file) at offset 0: ", "empty"},
        {"\xEF\xBB\xBF<a", "1:3: error 4 (Open enclosure) at offset 5: ", "'>'"},
        {"<a>\r\n&#x41;</a>", "2:1: error 7 (Bad escape) at offset 5: ", "hexadecimal"},
        {"<a>\nxy\xFFz</a>", "2:3: error 13 (Bad character encoding) at offset 6: ", "Latin-1"}, // found by the tool
        {"<a>\xC3", "1:4: error 13 (Bad character encoding) at offset 3: ", "UTF-8"},
        {"<a>\n\xC3\xA9\xE2\x82\xAC<b/></a>", "2:3: error 15 (Mixed content) at offset 9: ", "not both"},
        {"<!-- x -->", "1:11: error 128 (No element) at offset 10: ", "no element"},
        {Utf16("<a>\n\n<b/>x</a>"), "3:5: error 15 (Mixed content) at offset 9: ", "not both"},
        {Utf16("<a></b>", true), "1:4: error 14 (Bad termination tag) at offset 3: ", "match"},
        {Utf16("<a>") + std::string("\x3D\xD8\x00\xDE", 4) + Utf16("</b>"), // columns count pairs once
         "1:5: error 15 (Mixed content) at offset 5: ", "not both"}};
    for (const auto& row : rows) {
        ExpectRows("xml|check|-", row.text, {{"", kBadInput, "(standard input):" + row.complaint}});
        ExpectRows("xml|check|-", row.text, {{"", kBadInput, row.words}});
    }
    ExpectRows("xml|check|-", "<a b=\"&amp;\">&lt;&#65;<!-- & --><![CDATA[&]]></a>",
               {{"", kFine, "=(standard input): fine\n", "2 references by name"}});
}

TEST(ToolCheck, StopsOrKeepsGoing) {
    const Folder folder;
    const std::string good = folder.Put("good.xml", "<a/>"), bad = folder.Put("bad.xml", "<a>");
    const std::string none = folder / "none.xml", fine = good + ": fine\n", wrong = bad + ":1:4: error 1 (";
    EXPECT_FALSE(Contains(Call("xml|check|" + bad + '|' + good).output, fine));
    ExpectRows("xml|check|", "",
               {{good + '|' + bad + '|' + good, kBadInput, fine + wrong},
                {"--keep-going|" + bad + '|' + none + '|' + good, kFileTrouble, fine, none + ": does not"},
                {none + '|' + good, kFileTrouble, "", none + ": does not exist"},
                {folder / ".", kFileTrouble, "", "is a folder"},
                {folder / "new/none.xml", kFileTrouble, "", "does not exist"}});
    EXPECT_FALSE(TAVO::Files::OS::_TestDirExists(support::Widen(folder / "new"))) << "looking makes no folders";
}

TEST(ToolTree, OutlinesAndJsonDeeperThanAnyStack) {
    ExpectRows("xml|tree|", "<a b=\"1\" c=\"&#34;\"><d>x\xC3\xA9<![CDATA[\n\\\t\x01]]></d><e/></a>",
               {{"-", kFine, "=a b=\"1\" c=\"\\\"\"\n  d: \"x\xC3\xA9\\n\\\\\\t\\u0001\"\n  e\n"},
                {"--json|-", kFine,
                 "={\"name\":\"a\",\"attributes\":{\"b\":\"1\",\"c\":\"\\\"\"},\"children\":[\n"
                 "{\"name\":\"d\",\"text\":\"x\xC3\xA9\\n\\\\\\t\\u0001\"},\n{\"name\":\"e\"}]}\n"}});
    std::string text;
    for (const char* tag : {"<a>", "</a>"})
        for (int depth = 0; depth < 100000; ++depth) text += tag;
    ExpectRows(
        "xml|", text,
        {{"tree|-", kFine, "(99999) a\n"}, {"tree|--json|-", kFine, "{"}, {"format|--strict|-|-o|-", kFine, "<a/>"}});
}

TEST(ToolGet, FindsTextsAndAttributes) {
    ExpectRows("xml|get|" + kTimeline + '|', "",
               {{"project/script", kFine, "if (shot.rate < 25 && !shot.locked) { conform(shot, \"24/1\"); }\n"},
                {".|--attribute|none", kBadInput, "", "has no attribute none"},
                {"bins", kBadInput, "", "10 elements and no text"},
                {"bins/bin/clip/media", kFine, "\n"},
                {"", kUsage, "", "no path"},
                {".|--attribute|1", kUsage, "", "no attribute"},
                {"bins/bin/clip|--attribute|rate|--as|rational", kFine, "=50/1\n"},
                {"bins/bin/clip|--attribute|rate|--as|number", kUsage, "", "not in"},
                {"bins/bin/clip|--attribute|name|--as|int", kBadInput, "", "clip name: \"Harbour 01\""}});
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
    const auto get = [](const char* type, const std::string& text, const Row& row) {
        ExpectRows(std::string("xml|get|-|.|--as|") + type, "<v>" + text + "</v>", {row});
    };
    for (const auto& [type, text, value] : values) get(type, text, {"", kFine, std::string("=") + value + '\n'});
    for (const auto& [type, text, fault] : faults) get(type, text, {"", kBadInput, "", fault});
}

TEST(ToolSet, ChangesTextsAndAttributes) {
    const std::string head = "UTF-8\"?><a x=\"1\"><b>", rest = "</b><c><d/></c></a>";
    ExpectRows("xml|set|-o|-|-|", "<a x=\"1\"><b>old</b><c><d/></c></a>",
               {{"b|\xE6\x97\xA5", kFine, head + "\xE6\x97\xA5" + rest},
                {"b|", kFine, "<a x=\"1\"><b/><c><d/></c></a>"},
                {"b|--|-5", kFine, head + "-5" + rest},
                {".|2|--attribute|x", kFine, "<a x=\"2\"><b>old" + rest},
                {".||--attribute|x", kFine, "<a><b>old" + rest},
                {"b//c|text", kUsage, "", "no path"},
                {"b|\xF4\x80\x80\x80", kBadInput, "", "cannot be kept"},
                {".|&|--attribute|x", kFine, "<a x=\"&amp;\"><b>old" + rest, "comes back as \"<;\""},
                {"b|\xF0\x9F\x98\x80|--strict", kBadInput, "", "not written"}});
    const Folder folder;
    const std::string file = folder.Put("a.xml", "<a><b>1</b></a>");
    ExpectRows("xml|set|" + file + "|-o|" + file, "",
               {{"|b|2", kFine, ""},
                {"|b|x  y|--strict", kBadInput, "", "not written"},
                {"|q|3", kBadInput, "", "there is no q"}});
    EXPECT_TRUE(Contains(Get(file), "<a><b>2</b></a>")) << "left alone on failure";
}

// The tree of each sample stays the same through every form of output, from files and standard input.
TEST(ToolFormat, KeepsTheSamplesInEveryEncoding) {
    const Folder folder;
    const std::string out = folder / "out.xml";
    for (const std::string& sample : {kTimeline, kNotes}) {
        const std::string tree = Call("xml|tree|" + sample).output;
        EXPECT_GT(tree.size(), 500u);
        for (const std::string form : {"utf-8", "utf-16|--pretty", "utf-16-raw", "utf-8|--pretty"}) {
            const std::string command = "xml|format|--strict|--encoding|" + form;
            ExpectRows(command, "", {{'|' + sample + "|-o|" + out, kFine, ""}});
            ExpectRows("xml|tree|" + out, "", {{"", kFine, '=' + tree}});
            ExpectRows(command, Get(sample), {{"|-|-o|-", kFine, '=' + Get(out)}});
        }
    }
}

// Characters above U+FFFF: shown as they came, lost in every output but the raw one, and the tool says so.
TEST(ToolFormat, TellsWhatIsLost) {
    const std::string smile = "\xF0\x9F\x98\x80", pair("\x3D\xD8\x00\xDE", 4), utf8 = "<a>" + smile + "</a>";
    const std::string utf16 = Utf16("<a>") + pair + Utf16("</a>"), format = "format|-|-o|-|--encoding|";
    const std::string lost = "the text \"" + smile + "\" in a, which comes back as \"\\u0001\"";
    for (const std::string& text : {utf8, utf16})
        ExpectRows("xml|", text,
                   {{"get|-|.", kFine, '=' + smile + '\n'},
                    {format + "utf-8", kFine, "<a>\x01</a>", lost},
                    {format + "utf-16", kFine, Utf16("<a>\x01</a>"), lost}});
    ExpectRows("xml|", utf16, {{format + "utf-16-raw|--strict", kFine, Utf16(">") + pair}});
}

TEST(ToolFiles, MayHaveAnyName) {
    const Folder folder;
    for (const char* name : {"with blank.xml", "\xC3\xA9t\xC3\xA9.xml", "\xE6\x97\xA5\xE6\x9C\xAC.xml",
                             "\xF0\x9F\x98\x80.xml", "-minus.xml"}) {
        const std::string file = folder / name;
        ExpectRows(
            "xml|", "",
            {{"format|" + kNotes + "|-o|" + file, kFine, ""}, {"check|" + file, kFine, '=' + file + ": fine\n"}});
    }
    EXPECT_EQ(support::List(folder.scratch.Path()).size(), 5u);
    ExpectRows("xml|", "",
               {{"stat|" + kTimeline + '|' + kNotes, kFine, "2 documents\n  size                  67,023 bytes\n"},
                {"stat|none.xml|" + kNotes, kFileTrouble, "elements              19,", "does not exist"},
                {"format|" + kNotes + "|-o|" + folder / ".", kFileTrouble, "", "cannot be opened for writing"}});
}

TEST(ToolTimecode, TakesSystemsAndCounts) {
    ExpectRows("tc|show|0|--system|", "",
               {{"ntsc(df)", kFine, "system            2 NTSC(DF)\n"},
                {"30000/1001/D", kFine, "system            2 NTSC(DF)\n"},
                {"5", kFine, "system            5 HDFILM(DF)\n", "warning: no standard knows HDFILM(DF)"},
                {"30000/1001", kUsage, "", "that of NTSC and of NTSC(DF), so write 30000/1001/ND or 30000/1001/D"},
                {"25/1/D", kUsage, "", "no drop frame at this rate"},
                {"0/0", kUsage, "", "no system has this rate"},
                {"30000/1001/X", kUsage, "", "behind the rate stands /D"},
                {"14", kUsage, "", "codes go from 0 to 13"},
                {"29.97", kUsage, "", "give a name, a code, or a rate"},
                {"\xFF", kUsage, "", "\"\xEF\xBF\xBD\" is no system"}});
    ExpectRows("tc|check|--system|0|", "",
               {{"+1200", kFine, "PAL, 1200 base"},
                {"1.5s", kFine, "PAL, 1800 base"},
                {"89478485fields", kFine, "PAL, 2147483640 base"},
                {"89478486fields", kBadInput, "89478485 at most"},
                {"192153584101141162frames", kFine, "PAL, 9223372036854775776 base"},
                {"192153584101141163frames", kBadInput, "64 bits"},
                {"1.5frames", kBadInput, "only seconds may have a point"},
                {"+", kBadInput, "it ends after character 1, where a digit of the hours belongs"}});
}

TEST(ToolTimecode, ChecksTextsAndTellsWhatIsWrong) {
    const std::string valid = "valid, ", invalid = "invalid: ", none = "unassigned: ";
    const std::pair<std::string, std::string> rows[] = {
        {"10.00,01:12", invalid + "the frames are 12: in an odd second PAL(PX) counts 00 to 11"},
        {"00:01:00:00 {24000/1001}Hz/D", invalid + "the frames are 00: HDFILM(DF) skips this label"},
        {"744:00:00:00 {25/1}Hz", invalid + "the hours are 744: they go to 743"},
        {"10:00:00:00+{25/1}Hz", "the mark \"+\" moves by a span that is too large in PAL"},
        {" --:--:--:--", none + "dashes stand for a position that is not given"},
        {"x", none + "character 1 is \"x\", where a digit of the hours belongs"},
        {"10:00:00:\xC3\xA9\x30", "character 10 is \"\xC3\xA9\", where a digit of the frames"},
        {"10.00,00.00", none + "no system has the separators \".\", \",\" and \".\""},
        {"1200", none + "it is a count without fields, and does not tell its system"},
        {"\xFF", none}, // Windows turns it into a character
        {std::string(300, '1') + ':', none + "character 3 is \"1\", where a separator behind"},
        {"10:00:00:00\xC3\xA9{25/1}Hz", valid + "PAL, 43200000 base units"}, // any mark does
        {"10:00:00:00\xC3\xA9{25\xC3\xA9", "character 16 is \"\xC3\xA9\", where \"/\" within"},
        {"99999999999:0:0:0 {25/1}Hz", "the number of the hours does not fit 32 bits"},
        {"10:00:00:00 {25/1}Hz" + std::string(100, ' '), "47 characters at most, and this one 120"}};
    std::string command = "tc|check|--";
    for (const auto& row : rows) command += '|' + row.first;
    const Finished run = Call(command);
    EXPECT_EQ(run.code, kBadInput) << "the worst of all";
    std::istringstream lines(run.output);
    std::string line;
    for (const auto& [text, words] : rows)
        EXPECT_TRUE(std::getline(lines, line) && Contains(line, words)) << text << '\n' << line;
    EXPECT_FALSE(std::getline(lines, line)) << "a line each";
    // With a system: its separators or colons, for drop frame also ';' before the frames.
    ExpectRows("tc|check|--system|", "",
               {{"2|00:01:00;02", kFine, valid + "NTSC(DF), 72000 base units"},
                {"2|00:01:00:00", kBadInput, invalid + "the frames are 00: NTSC(DF) skips this label"},
                {"1|00:01:00;02", kBadInput, invalid + "its separators are those of HD30 and not of NTSC"},
                {"1|10:00:00:00 {25/1}Hz", kBadInput, invalid + "its rate is that of PAL and not of NTSC"}});
}

TEST(ToolTimecode, ComputesAndShows) {
    ExpectRows(
        "tc|", "",
        {{"check|--json|10:00:00:25", kBadInput,
          "=[\n{\"text\":\"10:00:00:25\",\"verdict\":\"invalid\",\"reason\":\"the frames are 25: PAL counts 00 to "
          "24\"}\n]\n"},
         {"show|--json|--system|PAL|--|-48", kFine,
          "={\"system\":{\"code\":0,\"name\":\"PAL\"},\"count\":-48,\"fields\":-2,\"frames\":-1,"
          "\"wholeFrames\":true,\"seconds\":-0.04,\"sign\":-1,\"days\":0,\"hh\":0,\"mm\":0,\"ss\":0,\"ff\":1,"
          "\"fixedText\":\"-00:00:00:01\",\"universalText\":\"23:59:59:24-{25/1}Hz\"}\n"},
         // counts beyond 32 bits of fields are not cut
         {"show|9223372036854775807|--system|PAL", kFine, "fields            384307168202282325\n"},
         {"show|9223372036854775807|--system|PAL", kFine, "days              88959992639\n"},
         {"show|10:00:00:25", kBadInput, "", "the frames are 25"},
         {"systems|--json", kFine,
          "{\"code\":9,\"name\":\"PAL(PX)\",\"rate\":\"25/2\",\"frameUnits\":96,\"fieldUnits\":48,"
          "\"unitSeconds\":0.0008333333333333334,\"drop\":null,\"separators\":\".,:\"},\n"},
         {"convert|10:00:00:00|--to|NTSC(DF)", kFine, "count             43200000\n"},
         {"convert|00.00.01,00|--to|PAL", kFine, "system            0 PAL\n", "warning: no standard knows HDFILM(DF)"},
         {"convert|1200|--to|PAL", kBadInput, "", "does not tell its system"},
         {"convert|10:00:00:00|--to|2|--align|--retime", kUsage, "", "--retime"},
         {"convert|9223372036854775807|--from|NTSC|--to|PAL|--retime", kBadInput, "", "64 bits"},
         {"add|1.5s|30frames|--system|HD30", kFine, "seconds           2.5\n"},
         {"add|10:00:00:00|00.00:01.00", kFine, "count             43201200\n", "last differently"},
         {"add|10:00:00:00|x", kBadInput, "", "\"x\" is unassigned: character 1"},
         {"table|--system|HDNTSC(DF)|--frames|1", kFine,
          "    -1           71980   00.00.59.59  00:00:59:59 {60000/1001}Hz/D\n"
          "    +0           72000   00.01.00.04  00:01:00:04 {60000/1001}Hz/D\n"},
         {"table|--system|PAL|--frames|0|--json", kFine, "\"count\":72000,"},
         {"table|--system|PAL|--frames|-1", kUsage, "", "--frames"}});
    ExpectRows("rational|approx|--max-den|", "",
               {{"3|--|-0.3333", kFine, "fraction          -1/3\n"},
                {"1|", kBadInput, "", "character 1"},
                {"1|1e999", kBadInput, "", "out of the range"},
                {"1|1073741825", kBadInput, "", "magnitude goes to 1073741823"},
                {"1|1x", kBadInput, "", "character 2"},
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
    ExpectRows("", "", {{"--help", kFine, "\n"}, {"xml|set|--help", kFine, "\n"}, {"--version", kFine, "\n"}});
}

// Long enough for a progress line on a terminal; but this is none.
TEST(ToolProgress, StaysOutOfFiles) {
    const Finished run = Call("xml|stat|" + kTimeline + "|--repeat|" + support::RepeatsFor(1000, kTimeline));
    EXPECT_TRUE(run.code == kFine && run.errors.empty() && !Contains(run.output, "\x1b")) << run.errors;
}

TEST(ToolId, ParsesFormatsAndMakes) {
    const std::string id = "15603CD4-AB81-4D6F-B05F-C6BEA760A789", ends = ": invalid: it ends where character ";
    for (const std::string& text : {id, '{' + id + '}', std::string("15603CD4AB814D6FB05Fc6bea760a789")})
        ExpectRows("id|parse|", "", {{text, kFine, "=\"" + text + "\": " + id + '\n'}});
    ExpectRows("id|", "",
               {{"parse|", kBadInput, ends + "1, a hexadecimal digit, belongs; the library reads the null identifier"},
                {"parse|" + id + "\xC3\xA9", kBadInput,
                 "character 37 is \"\xC3\xA9\", where the end belongs; the library reads 1"},
                {"parse|{" + id, kBadInput, ends + "38, \"}\", belongs; the library refuses it"},
                {"format|x", kBadInput, "", "no identifier"},
                {"parse|" + Call("id|new|--count|3").output.substr(74, 36), kFine, "-4"}});
}

TEST(ToolCodec, CodesFilesAndPipes) {
    const Folder folder;
    std::string all;
    for (int byte = 0; byte < 256; ++byte) all += static_cast<char>(byte);
    const std::string source = folder.Put("bytes", all), text = folder / "text";
    for (const std::string code : {"3fff", "hex"}) {
        ExpectRows("codec|encode|" + code, "", {{"|" + source + "|-o|" + text, kFine, ""}});
        ExpectRows("codec|decode|" + code, "\xEF\xBB\xBF" + Get(text) + "\r\n",
                   {{"|" + text, kFine, '=' + all}, {"", kFine, '=' + all}});
    }
    ExpectRows("codec|decode|hex", "\xFE\xFF" + Utf16("4F4b", true), {{"", kFine, "=OK"}});
    ExpectRows("codec|encode|3f", std::string("\0\x0E", 2),
               {{"", kFine, "=\xC4\x81!\x01!!\n", "1 of 2 bytes would come back changed, the first at offset 1"}});
}

TEST(ToolCodec, TellsThePlaceOfFaults) {
    const std::string header = "\xCC\x86", unit = "\xE4\x80\x80", utf16 = "\xFF\xFE\x06\x03";
    const struct {
        std::string code, text, complaint;
    } rows[] = {{"3fff", "\xEF\xBB\xBFx", "1, at offset 3: U+0078 is no header: that is U+0301 to U+0307"},
                {"3fff", header + unit + unit + unit + '\n', "5, at offset 11: the text ends within a group of four"},
                {"3fff", header + unit + "\xE4\x80", "3, at offset 5: E4 80 is truncated"},
                {"3fff", "\xF0\x9F\x98\x80", "1, at offset 0: U+1F600 belongs to no code"},
                {"3fff", utf16 + "@", "2, at offset 4: the text ends within a unit"},
                {"3f", "\xC4\x83", "1, at offset 0: U+0103 stands for a size that is a multiple of 3"},
                {"3f", "\xC4\x82!%!!", "3, at offset 3: U+0025 does not belong there"},
                {"hex", "4F 4", "5, at offset 4: the text ends within a byte"}};
    for (const auto& row : rows)
        ExpectRows("codec|decode|", row.text, {{row.code, kBadInput, "", "unit " + row.complaint}});
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
        const std::string expected = '=' + valueOf(isAlias ? meaning : name) + "  -\n";
        std::replace(meaning.begin(), meaning.end(), ' ', '|');
        ExpectRows("crc|", digits,
                   {{"--name|" + name, kFine, expected}, {isAlias ? "--name|" + name : meaning, kFine, expected}});
    }
    EXPECT_EQ(names, 32u);
    const Folder folder;
    const std::string empty = folder.Put("empty", ""), large = folder.Put("large", std::string(3000000, 'x'));
    ExpectRows("crc|", "",
               {{"--name|crc-16|" + empty + "|no such file|" + large, kFileTrouble,
                 "=0000  " + empty + "\ncb0b  " + large + '\n', "no such file: does not exist"},
                {"--name|crc-99", kUsage, "", "\"crc-99\" is no name"},
                {"--width|8", kUsage, "", "--poly HEX"},
                {"--name|crc-8|--refin", kUsage, "", "--name NAME alone"},
                {"--width|8|--poly|107", kUsage, "", "\"107\" is no hexadecimal number of 8 bits"}});
}

TEST(ToolUrl, EscapesAndNamesWhatIsNot) {
    ExpectRows("url|", "",
               {{"encode|a%20b", kFine, "a%2520b\n", "escaped already"},
                {"encode|--keep|%|a%20b", kFine, "a%20b\n", "does not decode to itself"},
                {"decode|%C3%A9%C3", kFine, "\xC3\xA9\xC3\n", "byte 3 of the decoded text: C3 is truncated"},
                {"from-path|a", kFine, "file:///a\n", "relative"},
                {"from-path|", kBadInput, "", "empty"},
                {"from-path|/\xF0\x9F\x98\x80", kBadInput, "", "above U+FFFF"},
                {"to-path|file:///\xF0\x9F\x98\x80", kBadInput, "", "byte 9 of the decoded text: U+1F600 comes out"},
                {"to-path|file:///%C0%80", kBadInput, "", "a zero ends"},
                {"to-path|file://localhost", kFine, "//localhost\n"},
                {"to-path|file://", kBadInput, "", "nothing stands behind"}});
}

TEST(ToolText, ValidatesByTheStandard) {
    const struct {
        std::string encoding, text, told;
    } rows[] = {
        {"utf-8", "\xF0\x8F\xBF\xBF", "1:1: invalid utf-8 at byte offset 0: F0 8F BF BF is overlong: U+FFFF takes 3"},
        {"utf-8", "\xF4\x90\x80\x80", "F4 90 80 80 is U+110000, above U+10FFFF"},
        {"utf-8", "\x80", "80 continues a character"},
        {"utf-8", "\xFF", "FF never occurs"},
        {"utf-16", Utf16("a") + std::string("\x00\xDC", 2), "offset 2: DC00 is a lone low surrogate"},
        {"utf-16", "\xFE\xFF" + Utf16("a", true) + std::string("\xD8\x00\x00", 3), "4: D800 is a lone high surrogate"},
        {"utf-16be", Utf16("a", true) + "a", ":1:2: invalid utf-16be at byte offset 2: the text is truncated"},
        {"utf-32be", std::string("\0\x11\0\0", 4), "00110000 is above U+10FFFF"},
        {"utf-16|--json", "\xFE\xFF\xD8\x3D\xDE",
         "\"encoding\":\"utf-16\",\"valid\":false,\"line\":1,\"column\":1,\"offset\":2,\"reason\":"
         "\"D83D is a lone high surrogate"}};
    for (const auto& row : rows) ExpectRows("text|validate|-|--from|", row.text, {{row.encoding, kBadInput, row.told}});
}

TEST(ToolText, Recodes) {
    const std::string text = "a\xC3\xA9\xF0\x9F\x98\x80", pair("\x3D\xD8\x00\xDE", 4), ours("\x7D\xD8\x00\xDE", 4);
    ExpectRows(
        "text|recode|-|-o|-|--to|", text,
        {{"utf-8", kFine, text},
         {"utf-32be", kFine, std::string("\0\0\0a\0\0\0\xE9\0\1\xF6\0", 12)},
         {"utf-16", kFine, "\xFF\xFE" + Utf16("a\xE9") + ours, "at 1:3 (byte offset 3), U+1F600 is written as U+2F"}});
    ExpectRows("text|recode|-|-o|-|--from|utf-16|--to|", "\xFF\xFE" + pair + pair,
               {{"utf-8", kFine, "\1\1",
                 "2 characters are changed; the first at 1:1 (byte offset 2), U+1F600 is read as U+0001"},
                {"utf-16be", kFine, std::string("\0\1\0\1", 4), "changed"}});
    ExpectRows("text|", "a\nb",
               {{"recode|-|-o|-|--from|ansi|--to|utf-8", kFine, "a\nb"},
                {"recode|-|-o|-|--to|ansi", kFine, "a\nb"},
                {"count|none", kFileTrouble, "", "does not exist"},
                {"count|-|--from|x", kUsage, "", "--from"}});
}
