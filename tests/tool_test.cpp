// The command-line tool, run as its users run it: what it prints, writes and answers.

#include "support/log.h"
#include "support/process.h"
#include "support/scratch.h"

#include <sstream>

using support::Finished;
using support::RunTool;

namespace {

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

// Rows are "arguments =exit code> words" (0 fine, 1 bad input, 2 usage, 3 trouble with a file): the words stand in the
// output or in the complaints, not in both; words that begin with '=' are all that is written. The arguments follow
// those that all rows have.
void ExpectRows(const std::string& command, const std::string& input, const std::vector<std::string>& rows) {
    for (const std::string& row : rows) {
        const auto mark = row.find("> ");
        const std::string words = row.substr(mark + 2);
        const Finished run = Call(command + row.substr(0, mark - 3), input);
        const bool told = words[0] == '=' ? run.output == words.substr(1) && run.errors.empty()
                                          : Contains(run.output, words) != Contains(run.errors, words);
        const bool alone = run.output.empty() || run.errors.empty() || run.code == 0 || run.code == 3;
        EXPECT_TRUE(told && alone && run.code == row[mark - 1] - '0') << command << row << ": " << run.code << '\n'
                                                                      << run.output << run.errors;
    }
}

} // namespace

// The tool itself finds bad characters. Columns count pairs once.
TEST(ToolCheck, TellsCodeLineColumnAndOffset) {
    const std::pair<std::string, std::string> rows[] = {
        {"", "1:1: error 0 (Bad file) at offset 0: "},
        {"\xEF\xBB\xBF<a", "1:3: error 4 (Open enclosure) at offset 5: "},
        {"<a>\r\n&#x41;</a>", "2:1: error 7 (Bad escape) at offset 5: "},
        {"<a>\nxy\xFFz</a>", "2:3: error 13 (Bad character encoding) at offset 6: "},
        {"<a>\xC3", "1:4: error 13 (Bad character encoding) at offset 3: "},
        {"<a>\n\xC3\xA9\xE2\x82\xAC<b/></a>", "2:3: error 15 (Mixed content) at offset 9: "},
        {"<!-- x -->", "1:11: error 128 (No element) at offset 10: "},
        {Utf16("<a>\n\n<b/>x</a>"), "3:5: error 15 (Mixed content) at offset 9: "},
        {Utf16("<a></b>", true), "1:4: error 14 (Bad termination tag) at offset 3: "},
        {Utf16("<a>") + std::string("\x3D\xD8\x00\xDE", 4) + Utf16("</b>"),
         "1:5: error 15 (Mixed content) at offset 5: "}};
    for (const auto& [text, words] : rows) ExpectRows("xml|check|-", text, {" =1> (standard input):" + words});
    ExpectRows("xml|check|-", "<a>\xC3", {" =1> UTF-8"});
    ExpectRows("xml|check|-", "<a>\xFF", {" =1> Latin-1"});
    ExpectRows("xml|check|-", "<a b=\"&amp;\">&lt;&#65;<!-- & --><![CDATA[&]]></a>",
               {" =0> (standard input): fine\n", " =0> 2 references by name"});
}

TEST(ToolCheck, StopsOrKeepsGoing) {
    const Folder folder;
    const std::string good = folder.Put("good.xml", "<a/>"), bad = folder.Put("bad.xml", "<a>");
    const std::string none = folder / "none.xml", fine = good + ": fine\n", wrong = bad + ":1:4: error 1 (";
    EXPECT_FALSE(Contains(Call("xml|check|" + bad + '|' + good).output, fine));
    ExpectRows("xml|check|", "",
               {good + '|' + bad + '|' + good + " =1> " + fine + wrong,
                "--keep-going|" + bad + '|' + none + '|' + good + " =3> " + fine,
                "--keep-going|" + bad + '|' + none + '|' + good + " =3> " + none + ": does not",
                none + '|' + good + " =3> " + none + ": does not exist", folder / ". =3> is a folder",
                folder / "new/none.xml =3> does not exist"});
    EXPECT_FALSE(TAVO::Files::OS::_TestDirExists(support::Widen(folder / "new"))) << "looking makes no folders";
}

TEST(ToolTree, OutlinesAndJsonDeeperThanAnyStack) {
    ExpectRows(
        "xml|tree|", "<a b=\"1\" c=\"&#34;\"><d>x\xC3\xA9<![CDATA[\n\\\t\x01]]></d><e/></a>",
        {"- =0> =a b=\"1\" c=\"\\\"\"\n  d: \"x\xC3\xA9\\n\\\\\\t\\u0001\"\n  e\n",
         "--json|- =0> ={\"name\":\"a\",\"attributes\":{\"b\":\"1\",\"c\":\"\\\"\"},\"children\":[\n{\"name\":\"d\","
         "\"text\":\"x\xC3\xA9\\n\\\\\\t\\u0001\"},\n{\"name\":\"e\"}]}\n"});
    std::string text;
    for (const char* tag : {"<a>", "</a>"})
        for (int depth = 0; depth < 100000; ++depth) text += tag;
    ExpectRows("xml|", text, {"tree|- =0> (99999) a\n", "tree|--json|- =0> {", "format|--strict|-|-o|- =0> <a/>"});
}

TEST(ToolGet, FindsTextsAndAttributes) {
    ExpectRows("xml|get|" + kTimeline + '|', "",
               {"project/script =0> if (shot.rate < 25 && !shot.locked) { conform(shot, \"24/1\"); }\n",
                ".|--attribute|none =1> has no attribute none", "bins =1> 10 elements and no text",
                "bins/bin/clip/media =0> \n", " =2> no path", ".|--attribute|1 =2> no attribute",
                "bins/bin/clip|--attribute|rate|--as|rational =0> =50/1\n",
                "bins/bin/clip|--attribute|rate|--as|number =2> not in",
                "bins/bin/clip|--attribute|name|--as|int =1> clip name: \"Harbour 01\""});
}

TEST(ToolGet, ReadsValuesOrNamesTheCharacter) {
    const auto expect = [](const std::vector<std::string>& rows) { // of a type, a bar and the element's text
        for (const std::string& row : rows) {
            const auto bar = row.find('|'), mark = row.find("> ") - 3;
            const std::string text = "<v>" + row.substr(bar + 1, mark - bar - 1) + "</v>";
            ExpectRows("xml|get|-|.|--as|" + row.substr(0, bar), text, {row.substr(mark)});
        }
    };
    expect({"int| -7 of 9 =0> =-7\n", "uint|-1 =0> =4294967295\n", "hex|FF =0> =0xff\n",
            "int64|-9223372036854775808 =0> =-9223372036854775808\n", "double|-1.50e1 =0> =-15\n",
            "edouble|3ff8000000000000(1.5) =0> =1.5\n", "rational|50 / 2 =0> =25/1\n", "bool|TRUE =0> =true\n",
            "timecode|10:00:00:00 {25/1}Hz =0> =10:00:00:00 {25/1}Hz\n",
            "id|00000000-0000-0000-0000-000000000000 =0> =00000000-0000-0000-0000-000000000000\n",
            "binary|21BA =0> =12ab\n"});
    expect({"int|+x7 =1> character 2 is \"x\", where a digit", "hex|0xg =1> character 3 is \"g\"",
            "double|-. =1> it ends where character 3", "edouble|(1.5) =1> character 1 is \"(\"",
            "rational|50:2 =1> character 3 is \":\"", "rational|5/\xC3\xA9 =1> character 3 is \"\xC3\xA9\"",
            "bool|falsch =1> character 5 is \"c\"", "timecode|10:00:00:25 {25/1}Hz =1> the frames are 25",
            "timecode|10:00:00:00 =1> does not tell the rate",
            "id|{15603cd4-ab81-4d6f-b05f-c6bea760a789} =1> without braces", "binary|21B =1> it ends where character 4",
            "binary| =1> it ends where character 1"});
}

TEST(ToolSet, ChangesTextsAndAttributes) {
    const std::string head = "UTF-8\"?><a x=\"1\"><b>", rest = "</b><c><d/></c></a>";
    ExpectRows("xml|set|-o|-|-|", "<a x=\"1\"><b>old</b><c><d/></c></a>",
               {"b|\xE6\x97\xA5 =0> " + head + "\xE6\x97\xA5" + rest, "b| =0> <a x=\"1\"><b/><c><d/></c></a>",
                "b|--|-5 =0> " + head + "-5" + rest, ".|2|--attribute|x =0> <a x=\"2\"><b>old" + rest,
                ".||--attribute|x =0> <a><b>old" + rest, "b//c|text =2> no path",
                "b|\xF4\x80\x80\x80 =1> cannot be kept", ".|&|--attribute|x =0> <a x=\"&amp;\"><b>old" + rest,
                ".|&|--attribute|x =0> comes back as \"<;\"", "b|\xF0\x9F\x98\x80|--strict =1> not written"});
    const Folder folder;
    const std::string file = folder.Put("a.xml", "<a><b>1</b></a>");
    ExpectRows("xml|set|" + file + "|-o|" + file, "",
               {"|b|2 =0> =", "|b|x  y|--strict =1> not written", "|q|3 =1> there is no q"});
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
            ExpectRows(command, "", {'|' + sample + "|-o|" + out + " =0> ="});
            ExpectRows("xml|tree|" + out, "", {" =0> =" + tree});
            ExpectRows(command, Get(sample), {"|-|-o|- =0> =" + Get(out)});
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
                   {"get|-|. =0> =" + smile + '\n', format + "utf-8 =0> <a>\x01</a>", format + "utf-8 =0> " + lost,
                    format + "utf-16 =0> " + Utf16("<a>\x01</a>"), format + "utf-16 =0> " + lost});
    ExpectRows("xml|", utf16, {format + "utf-16-raw|--strict =0> " + Utf16(">") + pair});
}

TEST(ToolFiles, MayHaveAnyName) {
    const Folder folder;
    for (const char* name : {"with blank.xml", "\xC3\xA9t\xC3\xA9.xml", "\xE6\x97\xA5\xE6\x9C\xAC.xml",
                             "\xF0\x9F\x98\x80.xml", "-minus.xml"}) {
        const std::string file = folder / name;
        ExpectRows("xml|", "",
                   {"format|" + kNotes + "|-o|" + file + " =0> =", "check|" + file + " =0> =" + file + ": fine\n"});
    }
    EXPECT_EQ(support::List(folder.scratch.Path()).size(), 5u);
    ExpectRows("xml|", "",
               {"stat|" + kTimeline + '|' + kNotes + " =0> 2 documents\n  size                  67,023 bytes\n",
                "stat|none.xml|" + kNotes + " =3> elements              19,",
                "stat|none.xml|" + kNotes + " =3> does not exist",
                "format|" + kNotes + "|-o|" + folder / ". =3> cannot be opened for writing"});
}

TEST(ToolTimecode, TakesSystemsAndCounts) {
    ExpectRows("tc|show|0|--system|", "",
               {"ntsc(df) =0> system            2 NTSC(DF)\n", "30000/1001/D =0> system            2 NTSC(DF)\n",
                "5 =0> system            5 HDFILM(DF)\n", "5 =0> warning: no standard knows",
                "30000/1001 =2> so write 30000/1001/ND or 30000/1001/D", "25/1/D =2> no drop frame at this rate",
                "0/0 =2> no system has this rate", "30000/1001/X =2> behind the rate stands /D",
                "14 =2> codes go from 0 to 13", "29.97 =2> give a name, a code, or a rate",
                "\xFF =2> \"\xEF\xBF\xBD\" is no system"});
    ExpectRows("tc|check|--system|0|", "",
               {"+1200 =0> PAL, 1200 base", "1.5s =0> PAL, 1800 base", "89478485fields =0> PAL, 2147483640 base",
                "89478486fields =1> 89478485 at most", "192153584101141162frames =0> PAL, 9223372036854775776 base",
                "192153584101141163frames =1> 64 bits", "1.5frames =1> only seconds may have a point",
                "+ =1> it ends after character 1"});
}

TEST(ToolTimecode, ChecksTextsAndTellsWhatIsWrong) {
    const std::string mark = "10:00:00:00\xC3\xA9{25", ones(300, '1');
    ExpectRows("tc|check|--|", "",
               {"10.00,01:12 =1> invalid: the frames are 12: in an odd second PAL(PX) counts 00 to 11",
                "00:01:00:00 {24000/1001}Hz/D =1> invalid: the frames are 00: HDFILM(DF) skips this label",
                "744:00:00:00 {25/1}Hz =1> invalid: the hours are 744: they go to 743",
                "10:00:00:00+{25/1}Hz =1> the mark \"+\" moves by a span that is too large in PAL",
                " --:--:--:-- =1> unassigned: dashes stand", "x =1> unassigned: character 1 is \"x\", where a digit",
                "10:00:00:\xC3\xA9\x30 =1> character 10 is \"\xC3\xA9\", where a digit of the frames",
                "10.00,00.00 =1> unassigned: no system has the separators", "1200 =1> unassigned: it is a count",
                "\xFF =1> unassigned: ", // Windows turns it into a character
                ones + ": =1> unassigned: character 3 is \"1\", where a separator", mark + "/1}Hz =0> valid, PAL, 432",
                mark + "\xC3\xA9 =1> character 16 is \"\xC3\xA9\", where \"/\" within",
                "99999999999:0:0:0 {25/1}Hz =1> the number of the hours does not fit 32 bits",
                ones + " {25/1}Hz =1> 47 characters at most, and this one "});
    // With a system: its separators or colons, for drop frame also ';' before the frames.
    ExpectRows("tc|check|--system|", "",
               {"2|00:01:00;02 =0> valid, NTSC(DF), 72000 base", "2|00:01:00:00 =1> NTSC(DF) skips this label",
                "1|00:01:00;02 =1> invalid: its separators are those of HD30 and not of NTSC",
                "1|10:00:00:00 {25/1}Hz =1> invalid: its rate is that of PAL and not of NTSC"});
}

TEST(ToolTimecode, ComputesAndShows) {
    ExpectRows(
        "tc|", "",
        {"check|--json|10:00:00:25 =1> =[\n{\"text\":\"10:00:00:25\",\"verdict\":\"invalid\",\"reason\":\"the frames "
         "are 25: PAL counts 00 to 24\"}\n]\n",
         "show|--json|--system|PAL|--|-48 =0> ={\"system\":{\"code\":0,\"name\":\"PAL\"},\"count\":-48,\"fields\":-2,"
         "\"frames\":-1,\"wholeFrames\":true,\"seconds\":-0.04,\"sign\":-1,\"days\":0,\"hh\":0,\"mm\":0,\"ss\":0,"
         "\"ff\":1,\"fixedText\":\"-00:00:00:01\",\"universalText\":\"23:59:59:24-{25/1}Hz\"}\n",
         // counts beyond 32 bits of fields are not cut
         "show|9223372036854775807|--system|PAL =0> fields            384307168202282325\n",
         "show|9223372036854775807|--system|PAL =0> days              88959992639\n",
         "show|10:00:00:25 =1> the frames are 25",
         "systems|--json =0> {\"code\":9,\"name\":\"PAL(PX)\",\"rate\":\"25/2\",\"frameUnits\":96,\"fieldUnits\":48,"
         "\"unitSeconds\":0.0008333333333333334,\"drop\":null,\"separators\":\".,:\"},\n",
         "convert|10:00:00:00|--to|NTSC(DF) =0> count             43200000\n",
         "convert|00.00.01,00|--to|PAL =0> system            0 PAL\n",
         "convert|00.00.01,00|--to|PAL =0> warning: no standard knows",
         "convert|1200|--to|PAL =1> does not tell its system",
         "convert|10:00:00:00|--to|2|--align|--retime =2> --retime",
         "convert|9223372036854775807|--from|NTSC|--to|PAL|--retime =1> 64 bits",
         "add|1.5s|30frames|--system|HD30 =0> seconds           2.5\n",
         "add|10:00:00:00|00.00:01.00 =0> count             43201200\n",
         "add|10:00:00:00|00.00:01.00 =0> last differently", "add|10:00:00:00|x =1> \"x\" is unassigned: character 1",
         "table|--system|HDNTSC(DF)|--frames|1 =0>     -1           71980   00.00.59.59  00:00:59:59 "
         "{60000/1001}Hz/D\n    +0           72000   00.01.00.04  00:01:00:04 {60000/1001}Hz/D\n",
         "table|--system|PAL|--frames|0|--json =0> \"count\":72000,", "table|--system|PAL|--frames|-1 =2> --frames"});
    ExpectRows(
        "rational|approx|--max-den|", "",
        {"3|--|-0.3333 =0> fraction          -1/3\n", "1| =1> character 1", "1|1e999 =1> out of the range",
         "1|1073741825 =1> magnitude goes to 1073741823", "1|1x =1> character 2", "1073741824|1 =2> --max-den",
         "9|0.5|--json =0> {\"fraction\":\"1/2\",\"numerator\":1,\"denominator\":2,\"value\":0.5,\"offBy\":0}\n"});
}

TEST(ToolUsage, HasCodesOfItsOwn) {
    for (const std::string command :
         {"xml", "pool", "nothing", "xml|check", "xml|check|--nothing|x", "xml|get|x", "xml|get|x|y|z", "xml|set|x|y|z",
          "xml|format|x", "xml|format|x|-o|-|--encoding|latin-1", "xml|format|x|-o|-|--encoding|UTF-16",
          "xml|stat|x|--repeat|0", "xml|stat|x|--repeat|x", "rational|approx|1", "id|new|--count|0"}) {
        const Finished run = Call(command);
        EXPECT_TRUE(run.code == 2 && run.output.empty() && !run.errors.empty()) << command;
    }
    EXPECT_EQ(RunTool({}).code, 2);
    ExpectRows("", "", {"--help =0> \n", "xml|set|--help =0> \n", "--version =0> \n"});
}

// Long enough for a progress line on a terminal; but this is none.
TEST(ToolProgress, StaysOutOfFiles) {
    const Finished run = Call("xml|stat|" + kTimeline + "|--repeat|" + support::RepeatsFor(1000, kTimeline));
    EXPECT_TRUE(run.code == 0 && run.errors.empty() && !Contains(run.output, "\x1b")) << run.errors;
}

TEST(ToolId, ParsesFormatsAndMakes) {
    const std::string id = "15603CD4-AB81-4D6F-B05F-C6BEA760A789", ends = ": invalid: it ends where character ";
    for (const std::string& text : {id, '{' + id + '}', std::string("15603CD4AB814D6FB05Fc6bea760a789")})
        ExpectRows("id|parse|", "", {text + " =0> =\"" + text + "\": " + id + '\n'});
    ExpectRows("id|", "",
               {"parse| =1> " + ends + "1, a hexadecimal digit, belongs; the library reads the null identifier",
                "parse|" + id + "\xC3\xA9 =1> character 37 is \"\xC3\xA9\", where the end belongs; the library reads 1",
                "parse|{" + id + " =1> " + ends + "38, \"}\", belongs; the library refuses it",
                "format|x =1> no identifier", "parse|" + Call("id|new|--count|3").output.substr(74, 36) + " =0> -4"});
}

TEST(ToolCodec, CodesFilesAndPipes) {
    const Folder folder;
    std::string all;
    for (int byte = 0; byte < 256; ++byte) all += static_cast<char>(byte);
    const std::string source = folder.Put("bytes", all), text = folder / "text";
    for (const std::string code : {"3fff", "hex"}) {
        ExpectRows("codec|encode|" + code, "", {"|" + source + "|-o|" + text + " =0> ="});
        ExpectRows("codec|decode|" + code, "\xEF\xBB\xBF" + Get(text) + "\r\n",
                   {"|" + text + " =0> =" + all, " =0> =" + all});
    }
    ExpectRows("codec|decode|hex", "\xFE\xFF" + Utf16("4F4b", true), {" =0> =OK"});
    ExpectRows("codec|encode|3f", std::string("\0\x0E", 2),
               {" =0> \xC4\x81!\x01!!\n", " =0> 1 of 2 bytes would come back changed, the first at offset 1"});
}

TEST(ToolCodec, TellsThePlaceOfFaults) {
    const std::string header = "\xCC\x86", unit = "\xE4\x80\x80", utf16 = "\xFF\xFE\x06\x03";
    const std::pair<std::string, std::string> rows[] = {
        {"\xEF\xBB\xBFx", "3fff =1> unit 1, at offset 3: U+0078 is no header: that is U+0301 to U+0307"},
        {header + unit + unit + unit + '\n', "3fff =1> unit 5, at offset 11: the text ends within a group"},
        {header + unit + "\xE4\x80", "3fff =1> unit 3, at offset 5: E4 80 is truncated"},
        {"\xF0\x9F\x98\x80", "3fff =1> unit 1, at offset 0: U+1F600"},
        {utf16 + "@", "3fff =1> unit 2, at offset 4: "},
        {"\xC4\x83", "3f =1> unit 1, at offset 0: U+0103 stands for a size that is a multiple of 3"},
        {"\xC4\x82!%!!", "3f =1> unit 3, at offset 3: U+0025"},
        {"4F 4", "hex =1> unit 5, at offset 4: the text ends"}};
    for (const auto& [text, row] : rows) ExpectRows("codec|decode|", text, {row});
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
        ExpectRows(
            "crc|", digits,
            {"--name|" + name + " =0> " + expected, (isAlias ? "--name|" + name : meaning) + " =0> " + expected});
    }
    EXPECT_EQ(names, 32u);
    const Folder folder;
    const std::string empty = folder.Put("empty", ""), large = folder.Put("large", std::string(3000000, 'x'));
    ExpectRows("crc|", "",
               {"--name|crc-16|" + empty + "|no such file|" + large + " =3> 0000  " + empty + "\ncb0b  " + large + '\n',
                "--name|crc-16|" + empty + "|no such file|" + large + " =3> no such file: does not exist",
                "--name|crc-99 =2> \"crc-99\" is no name", "--width|8 =2> --poly HEX",
                "--name|crc-8|--refin =2> --name NAME alone",
                "--width|8|--poly|107 =2> \"107\" is no hexadecimal number of 8 bits"});
}

TEST(ToolUrl, EscapesAndNamesWhatIsNot) {
    ExpectRows("url|", "",
               {"encode|a%20b =0> a%2520b\n", "encode|a%20b =0> escaped already", "encode|--keep|%|a%20b =0> a%20b\n",
                "encode|--keep|%|a%20b =0> does not decode to itself", "decode|%C3%A9%C3 =0> \xC3\xA9\xC3\n",
                "decode|%C3%A9%C3 =0> byte 3 of the decoded text: C3 is truncated", "from-path|a =0> file:///a\n",
                "from-path|a =0> relative", "from-path| =1> empty", "from-path|/\xF0\x9F\x98\x80 =1> above U+FFFF",
                "to-path|file:///\xF0\x9F\x98\x80 =1> byte 9 of the decoded text: U+1F600",
                "to-path|file:///%C0%80 =1> a zero ends", "to-path|file://localhost =0> //localhost\n",
                "to-path|file:// =1> nothing stands behind"});
}

TEST(ToolText, ValidatesByTheStandard) {
    const std::pair<std::string, std::string> rows[] = {
        {"\xF0\x8F\xBF\xBF", "utf-8 =1> 1:1: invalid utf-8 at byte offset 0: F0 8F BF BF is overlong: U+FFFF takes 3"},
        {"\xF4\x90\x80\x80", "utf-8 =1> F4 90 80 80 is U+110000"},
        {"\x80", "utf-8 =1> 80 continues a character"},
        {"\xFF", "utf-8 =1> FF never occurs"},
        {Utf16("a") + std::string("\x00\xDC", 2), "utf-16 =1> offset 2: DC00 is a lone low"},
        {"\xFE\xFF" + Utf16("a", true) + std::string("\xD8\x00\x00", 3), "utf-16 =1> 4: D800 is a lone high"},
        {Utf16("a", true) + "a", "utf-16be =1> :1:2: invalid utf-16be at byte offset 2: the text is truncated"},
        {std::string("\0\x11\0\0", 4), "utf-32be =1> 00110000 is above U+10FFFF"},
        {"\xFE\xFF\xD8\x3D\xDE",
         "utf-16|--json =1> \"encoding\":\"utf-16\",\"valid\":false,\"line\":1,\"column\":1,\"offset\":2,"
         "\"reason\":\"D83D is a lone high surrogate"}};
    for (const auto& [text, row] : rows) ExpectRows("text|validate|-|--from|", text, {row});
}

TEST(ToolText, Recodes) {
    const std::string text = "a\xC3\xA9\xF0\x9F\x98\x80", pair("\x3D\xD8\x00\xDE", 4), ours("\x7D\xD8\x00\xDE", 4);
    ExpectRows("text|recode|-|-o|-|--to|", text,
               {"utf-8 =0> " + text, "utf-32be =0> " + std::string("\0\0\0a\0\0\0\xE9\0\1\xF6\0", 12),
                "utf-16 =0> \xFF\xFE" + Utf16("a\xE9") + ours,
                "utf-16 =0> at 1:3 (byte offset 3), U+1F600 is written as U+2F"});
    ExpectRows("text|recode|-|-o|-|--from|utf-16|--to|", "\xFF\xFE" + pair + pair,
               {"utf-8 =0> \1\1",
                "utf-8 =0> 2 characters are changed; the first at 1:1 (byte offset 2), U+1F600 is read as U+0001",
                "utf-16be =0> " + std::string("\0\1\0\1", 4), "utf-16be =0> changed"});
    ExpectRows("text|", "a\nb",
               {"recode|-|-o|-|--from|ansi|--to|utf-8 =0> a\nb", "recode|-|-o|-|--to|ansi =0> a\nb",
                "count|none =3> does not exist", "count|-|--from|x =2> --from"});
}
