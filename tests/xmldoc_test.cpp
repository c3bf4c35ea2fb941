// Documents: what the parser accepts, what it gives, and where it finds the first error; and the parser against a
// second reader: cut texts, random texts.

#include "support/xmltexts.h"

#include <sstream>

using namespace support;

namespace {

constexpr unsigned kGood = 128;

// The second reader must give this, and the parser what it gives.
template <class Text>
void Expect(const Text& text, unsigned code, std::size_t offset, const std::string& outline = std::string()) {
    const Reading reading = XmlReference::Read(text);
    EXPECT_EQ(reading, (Reading{code, offset, outline, reading.message}));
    Compare(text);
}

enum Form { Both, OnlyUtf8 };

// "text -> outline", or "text -> code" with '^' before the error.
template <class Unit> void Check(std::initializer_list<const Unit*> rows, Form form = Both) {
    constexpr Unit kArrow[] = {' ', '-', '>', ' ', 0};
    for (const std::basic_string<Unit> row : rows) {
        auto text = row.substr(0, row.rfind(kArrow));
        std::string outline(row.begin() + std::ptrdiff_t(text.size()) + 4, row.end());
        std::size_t error = text.find(Unit('^'));
        const unsigned code = error == text.npos ? kGood : static_cast<unsigned>(std::stoi(outline));
        if (code == kGood)
            error = 0;
        else
            text.erase(error, 1), outline.clear();
        Expect(text, code, error, outline);
        if constexpr (sizeof(Unit) == 1)
            if (form == Both) Expect(ToUtf16(text), code, ToUtf16(text.substr(0, error)).size(), outline);
    }
}

TEST(XmlDocument, TopLevel) {
    // Intended: xml-no-element
    Check({"<?xml version='1.0'?> -> ", "<!--x--> -> ", " \r\n<a/>\t -> a", "<a/> ^x -> 5", "^&#65; -> 5",
           "<a/><!---->^<b/> -> 17", "<a/>^<1/> -> 17"});
    EXPECT_EQ(OpenUtf8(WithMark(WithMark("<a/>"))).offset, 3u) << "a second mark";
    EXPECT_EQ(OpenUtf16(u"\xFEFF\xFEFF<a/>").code, 5u);
}

// Intended: xml-declaration-end
TEST(XmlDocument, IntendedDeclarationsRunToTheFirstBracketOutsideQuotes) {
    Check({"<!-- don't --><a/><!-- can't --><b/> -> b", "<!-- '>' --><a/> -> a", "<!x \"'>\" '\">'><a/> -> a",
           "<!--><a/> -> a", "<!DOCTYPE a SYSTEM \"a>.dtd\"><a/> -> a", "<![CDATA[x]]><a/> -> a", " ^<!-- a -- -> 2",
           "<!-- don^'t --><a/> -> 3", "<!-- a > ^b --><a/> -> 5", "<!DOCTYPE a [<!ENTITY b 'c'>^]><a/> -> 5"});
}

TEST(XmlDocument, XmlDeclaration) {
    Check({"<?xml?><?xml version='1.0'?><a/><?xml version=\"1.0\" ?> -> a", "<?xml version=' 1.0 '?> -> ",
           "<?xml version='' encoding='  '?><a/> -> a", "<?XML version='2'?><a/> -> a",
           "<?xmla version='2' encoding='z'?><a/> -> a", "<a><?xml version='2' encoding='z'?></a> -> a",
           "<a/>^<?xml version='1.1'?> -> 11", "^<?xml version='1. 0'?> -> 11",
           " ^<?xml encoding='x' version='2'?> -> 11"});
    Check({"<?xml encoding='uTf-8'?><a/> -> a", "^<?xml encoding='UTF-16'?><a/> -> 12"}, OnlyUtf8);
    Check({u"<?xml encoding='utf-16'?> -> ", u"<?xml encoding='iso-10646-UCS-2'?> -> ",
           u"<?xml encoding='UNICODE'?> -> ", u"^<?xml encoding='UTF-8'?><a/> -> 12",
           u"^<?xml encoding='UTF-1'?> -> 12", u"^<?xml encoding='UTF-16 x'?> -> 12"});
}

TEST(XmlDocument, TagsAndAttributes) {
    Check({"<_:a-1.b \t></_:a-1.b\r\n> -> _:a-1.b", "<\xC3\xA9\xE4\xB8\xAD\xCC\x81/> -> \\00E9\\4E2D\\0301",
           "<a b='\"'c=\"'\"d \t=\r\n ' 1 \t\r\n 2 ' >x</a> -> a b='\"' c=''' d='1 2':x",
           "<a b='<c>]]><!-- x --><![CDATA[y]]>'/> -> a b='<c>]]><!-- x --><![CDATA[y]]>'",
           // Intended: xml-empty-attribute
           "<a b='' c='1' d=\" \n\"/> -> a c='1'", "<a b='&#32;'/> -> a b=' '", "<a b='' b='1'/> -> a b='1'", "<^ -> 4",
           "<a ^<b/> -> 4", "<a/^ > -> 4", "<a></a ^b='c'> -> 4", "<^ a/> -> 5", "<a><^1/></a> -> 5",
           "<^\xCC\x81/> -> 5", "<a^\xC2\xA9/> -> 6", "<a b='1' ^b=''/> -> 6", "<a b ^'1'/> -> 6", "<a b='1'^2/> -> 6",
           "<a>^</b> -> 14", "<a>^</ a> -> 14", "<a>^</ab> -> 14"});
}

TEST(XmlDocument, ManyAttributesAreComparedByTable) {
    std::string tag = "<a";
    for (int i = 0; i < 300; ++i) {
        tag += " n" + std::to_string(i) + "='" + std::to_string(i % 7) + "'";
        if ((i < 14 || i > 17) && i != 31 && i != 32 && i != 299) continue;
        // Tables do not leak into the next tag.
        Expect(tag + "><n n0='1'/></a>", kGood, 0, tag.substr(1) + "(n n0='1')");
        for (int n : {0, i / 2, i}) Expect(tag + " n" + std::to_string(n) + "='x'/>", 6, tag.size() + 1);
    }
}

TEST(XmlDocument, InstructionsAndSections) {
    // Intended: xml-text-or-children
    Check({"<a><?b?><c/><?d e=\"?>\"?></a> -> a(c)", "<a>x <?b?> <!-- c --> <?d?></a> -> a:x", "<a>x<?b?> ^y</a> -> 15",
           "<a>x<?b?>^<![CDATA[y]]></a> -> 15", "<a>x^<b/></a> -> 15", "<a><b/>^x</a> -> 15", "<a>x<?b?>^</b> -> 15",
           "<a><![CDATA[ <&#65; \n ]> ]]></a> -> a: <&#65; \\000A ]> ", "<a>p <![CDATA[ x ]]> q</a> -> a:p  x  q",
           "<a><![CDATA[x]]]]><![CDATA[>y]]></a> -> a:x]]>y", "<a><![CDATA[]]> x</a> -> a:x", "<a>^<![CDATA[x]] -> 9",
           "<a>^<![CDATA[]></a> -> 9", "<a>x ]^]]></a> -> 10"});
}

// Intended: xml-named-references
TEST(XmlDocument, IntendedReferenceLookUpIsInverted) {
    Check({"<a>&lt;</a> -> a:>", "<a>&gt;</a> -> a:<", "<a>&amp;</a> -> a:<;", "<a>&apos;</a> -> a:<s;",
           "<a b='&quot;'/> -> a b='<t;'", "<a>&xyz</a> -> a:<", "<a>&   x</a> -> a:<x", "<a>&</a></a> -> a:<>",
           "<a><!-- & -->x</a> -> a:x"});
    Check({"<a>&xy\xC3^\xA9</a> -> 16", "<a>&x\xE4\xB8^\xAD</a> -> 16", "<a>&x\xC3\xA9y</a> -> a:<y"}, OnlyUtf8);
    Check({u"<a>&xy\xD83D^\xDE00</a> -> 16", u"<a>&x\xD83D\xDE00y</a> -> a:<y", u"<a>&\xDC00xzy</a> -> a:<y"});
}

// Intended: xml-numeric-references
TEST(XmlDocument, IntendedNumericReferences) {
    Check({"<a b='&#65;'>&#00000000000000000000000000066;</a> -> a b='A':B", "<a>&#6:;&#:;</a> -> a:F\\000A",
           "<a> &#32;&#9;&#10;&#13; </a> -> a: \\0009\\000A\\000D", "<a>x &#32; y</a> -> a:x   y",
           "<a>&#55295;&#57344;&#65533;&#65536;</a> -> a:\\D7FF\\E000\\FFFD\\D840\\DC00",
           "<a>&#128512;&#1048575;</a> -> a:\\D87D\\DE00\\DBFF\\DFFF", "<a>&#60;b/&#62;&#38;#65;</a> -> a:<b/>&#65;",
           "<a>^&#1048576;</a> -> 16", "<a b='^&#1114111;'/> -> 16"});
    for (const char* bad : {"&#x41;", "&#;", "&#0;", "&#8;", "&#31;", "&#55296;", "&#65534;", "&#1114112;", "&#+65;",
                            "&#4294967361;", "&#18446744073709551681;", "&#65", "&#", "&# 65;"})
        Check({("<a>x^" + std::string(bad) + " -> 7").c_str(), ("<a>x^" + std::string(bad) + "</a> -> 7").c_str()});
}

TEST(XmlDocument, CharactersOfBothForms) {
    Check({"<a>\x01\x7F\xEF\xBF\xBE\xEF\xBF\xBF</a> -> a:\\0001\\007F\\FFFE\\FFFF",
           "<a b='\xF0\x90\x80\x80'>\xF0\x9F\x98\x80</a> -> a b='\\D840\\DC00':\\D87D\\DE00",
           "<a>x\xC0\xBCy</a> -> a:x<y", "<a>\xC0\xA0x\xC0\xA0\xC0\xA0</a> -> a: x  ",
           "<a b='x\xC0\xA7y'/> -> a b='x'y'", "<a>\xC0\xA6#65;</a> -> a:&#65;", "<\xC1\xA1 b='1'></a> -> a b='1'",
           "<ab></\xE0\x81\xA1\x62> -> ab", "<a><!-- \xC0\x80\xED\xA0\x80 -->x</a> -> a:x", "<a>x^\xC0\x80</a> -> 16",
           "<a b='x^\xC0\x80'/> -> 16", "<a b^\xC0\x80='x'/> -> 6", "<a><![CDATA[x^\xC0\x80]]></a> -> 16",
           "<a>^\xED\xA0\x80</a> -> 16", "<a>^\xED\xBF\xBF</a> -> 16", "<a>x^\xF4\x80\x80\x80</a> -> 16",
           "<a>x ^\xF4\x90\x80\x80</a> -> 16"},
          OnlyUtf8);
    Check({u"<a b='\xD83D\xDE00'>\xD800\xDC00</a> -> a b='\\D83D\\DE00':\\D800\\DC00",
           u"<a>\xD83D\xDBFF\xD83D\xE000</a> -> a:\\D83D\\DBFF\\D83D\\E000", // from DBFF up
           u"<a>\x01\xFFFE\xFFFF\xDBFF\xDFFF</a> -> a:\\0001\\FFFE\\FFFF\\DBFF\\DFFF",
           u"<a><!-- \xD83D -->x</a> -> a:x", u"<a>x^\xD83Dy</a> -> 16", u"<a>^\xD83D\xDBFE\xDC00</a> -> 16",
           u"<a>^\xDE00</a> -> 16", u"<a b='x ^\xDE00'/> -> 16", u"<a>^\xD83D -> 16",
           u"<a><![CDATA[x^\xD83D]]></a> -> 16"});
}

// Bytes that are no UTF-8 are refused before anything is read.
// Intended: xml-bad-utf8
TEST(XmlDocument, IntendedBadUtf8IsToldWithoutItsPlace) {
    for (const char* bad : {"\x80", "\xBF", "\xC3", "\xC3x", "\xE4\xB8", "\xE4\xB8x", "\xF0\x9F\x98", "\xF0\x9F\x98x",
                            "\xF5\x80\x80\x80", "\xF8\x88\x80\x80\x80", "\xFE", "\xFF"})
        for (const char* before : {"<a/>", "<a>", "x", "<!-- "})
            EXPECT_EQ(OpenUtf8(std::string(before) + bad), (Reading{13, 0, "", u"Offset: 0, Illegal UTF8 character"}));
    EXPECT_EQ(OpenRaw(std::string("<a/>\0\x80", 6)).code, kGood) << "what follows the zero is ignored";
}

// In UTF-16 with the pair that a character of UTF-8 becomes: texts that differ in nothing but pairs behind the tenth
// unit are one entry of the pool.
std::u16string Wide(const std::string& text) {
    std::u16string units = ToUtf16(text);
    std::replace(units.begin(), units.end(), u'\xD83D', u'\xD87D');
    return units;
}

const std::string kDocuments[] = {
    "<a/>",
    "<?xml version='1.0'?><!DOCTYPE a \"b\"><!-- 'c' --><a b = \"1\" c='&#65;&lt;'>\r\n<b>x <![CDATA[]]]> ]]>&amp;</b>"
    "<!-- d --><?e f='g'?></a >\n<?h?>",
    "<list><item n='1'>first one</item><item n='2'/><item>a &#38; b &gt;c</item></list>",
    "<\xC3\xA9 \xE4\xB8\xAD='\xC3\xA9 \xF0\x9F\x98\x80'>&\xC3\xA9\xC3\xA9\xE4\xB8\xAD \xF0\x9F\x98\x80</\xC3\xA9>",
    "<a>  leading and  double   blanks\tand a long text that fills more than one block of sixteen bytes ]] > </a>"};

// Separated by '|'.
const char kTokens[] =
    "<|<|>|/>|</|</a>|<a>|<b |a|b|xml|=|='|=\"|'|\"| |\n|\r\t|<!|<!--|-->|<?|?>|<?xml|version='1.0'|encoding='UTF-8'|"
    "encoding='UTF-16'|version='2'|<![CDATA[|]]>|]|&|&#|&#65;|&#6:;|&lt;|&gt;|&amp;|;|x y|&#x41;|\x01|\xC3\xA9|"
    "\xE4\xB8\xAD|\xF0\x9F\x98\x80|\xEF\xBB\xBF|\xEF\xBF\xBF|text of more than sixteen units|&#1048576;|"
    "<a b='1' c='2'>|<a b='' b='x'/>|/|?|-|0|.";

TEST(XmlReader, CutAnywhere) {
    for (const std::string& text : kDocuments) {
        for (std::size_t n = 0; n <= text.size(); ++n) Compare(text.substr(0, n));
        const std::u16string units = Wide(text);
        for (std::size_t n = 0; n <= units.size(); ++n) Compare(units.substr(0, n));
        for (std::size_t n = 0; n <= units.size(); ++n) Compare(units.substr(n));
    }
}

TEST(XmlReader, AnyByteAtAnyPlace) {
    const std::string text = "<?xml?><a b='1 &lt;'>\n<c>&#65; x<![CDATA[y]]></c><!----></a>";
    const std::u16string units = Wide(text);
    for (std::size_t at = 0; at < text.size(); ++at)
        for (int value = 0; value < 256; ++value) {
            std::string damaged = text;
            damaged[at] = static_cast<char>(value);
            Compare(damaged);
            std::u16string wide = units;
            wide[at] = static_cast<char16_t>(value << 8 | (value & 1 ? units[at] : 0));
            Compare(wide);
            wide[at] = static_cast<char16_t>(value);
            if (value >= 0x80) Compare(wide); // others as above
            if (HasFatalFailure()) return;
        }
}

// Places each of the characters among letters, in data, in a value and in a section.
template <class Text> void CompareWithin(const Text& letters, std::initializer_list<Text> characters) {
    const auto text = [](const std::string& ascii) { return Text(ascii.begin(), ascii.end()); };
    const std::pair<const char*, const char*> frames[] = {
        {"<a>", "</a>"}, {"<a b='", "'/>"}, {"<a><![CDATA[", "]]></a>"}};
    for (const auto& [open, close] : frames)
        for (const Text& character : characters)
            for (std::size_t before = 0; before < 17; ++before)
                for (const Text& behind : {Text(), text("x"), letters})
                    Compare(text(open + std::string(before, 'x')) + letters + character + behind + text(close));
}

// What does not simply become a unit: what has no wide form, pairs, blanks, references, and what ends the text.
TEST(XmlReader, CharactersWithinLongTexts) {
    const std::string letters = "\xD0\xA1\xD1\x8A \xE4\xB8\xAD\xE6\x96\x87 na\xC3\xAFve \xD1\x87\xD0\xB0\xD1\x8E";
    CompareWithin<std::string>(letters, {"\xC0\x80", "\xC0\xBC", "\xC0\xA0", "\xED\xA0\x80", "\xED\xBF\xBF",
                                         "\xF0\x9F\x98\x80", "\xF4\x80\x80\x80", "\xF4\x90\x80\x80", "\x02", "\x7F",
                                         " ", "  ", "\r\n", "&#65;", "]", "] ]]>", "'", "<"});
    CompareWithin<std::u16string>(
        ToUtf16(letters), {u"\xD83D", u"\xDE00", u"\xD87D\xDE00", u"\xFFFF", u"\x02", u"  ", u"&#65;", u"]]>", u"'"});
}

// Tokens anywhere in a document, or nothing but tokens.
TEST(XmlReader, RandomTokens) {
    std::vector<std::string> tokens(1);
    for (std::istringstream texts(kTokens); std::getline(texts, tokens.back(), '|');) tokens.emplace_back();
    std::mt19937 random(1);
    const auto below = [&random](std::size_t limit) { return random() % limit; };
    unsigned good = 0;
    for (int i = 0; i < 12000; ++i) {
        std::string text = i % 2 ? kDocuments[below(std::size(kDocuments))] : "<a>";
        for (std::size_t n = below(i % 2 ? 4 : 16); n; --n)
            text.insert(i % 2 ? below(text.size() + 1) : text.size(), tokens[below(tokens.size())]);
        good += XmlReference::Read(text).code == 128;
        Compare(text);
        // Bytes inserted within a character are no text that has a form in UTF-16.
        if (XmlReference::Read(text).code != 13) Compare(Wide(text));
        if (HasFatalFailure()) return;
    }
    EXPECT_GT(good, 1000u) << "enough good documents";
}

} // namespace
