// Documents: what the parser accepts, what it gives, and where it finds the first error.

#include "support/xmltexts.h"

#include <gtest/gtest.h>

using namespace support;

namespace {

constexpr unsigned kGood = 128;
using Texts = std::initializer_list<const char*>;

// The second reader must give this, and the parser what it gives.
template <class Text>
void Check(const Text& text, unsigned code, std::size_t offset, const std::string& outline = std::string()) {
    const Reading reading = XmlReference::Read(text);
    EXPECT_EQ(reading, (Reading{code, offset, outline, reading.message}));
    Compare(text);
}

enum Form { Both, Utf8 };

// '^' is before the error.
void Fail(unsigned code, Texts texts, Form form = Both) {
    for (std::string text : texts) {
        const std::size_t error = text.find('^');
        text.erase(error, 1);
        Check(text, code, error);
        if (form == Both) Check(ToUtf16(text), code, ToUtf16(text.substr(0, error)).size());
    }
}

// "text -> outline"
void Open(Texts texts, Form form = Both) {
    for (const std::string row : texts) {
        const std::size_t arrow = row.rfind(" -> ");
        Check(row.substr(0, arrow), kGood, 0, row.substr(arrow + 4));
        if (form == Both) Check(ToUtf16(row.substr(0, arrow)), kGood, 0, row.substr(arrow + 4));
    }
}

} // namespace

TEST(XmlDocument, TopLevel) {
    // Intended: xml-no-element
    Open({"<?xml version='1.0'?> -> ", "<!--x--> -> ", " \r\n<a/>\t -> a"});
    Fail(5, {"<a/> ^x", "^&#65;"});
    Fail(17, {"<a/><!---->^<b/>", "<a/>^<1/>"});
    EXPECT_EQ(OpenUtf8(WithMark(WithMark("<a/>"))).offset, 3u) << "a second mark";
    EXPECT_EQ(OpenUtf16(u"\xFEFF\xFEFF<a/>").code, 5u);
}

// Intended: xml-declaration-end
TEST(XmlDocument, IntendedDeclarationsRunToTheFirstBracketOutsideQuotes) {
    Open({"<!-- don't --><a/><!-- can't --><b/> -> b", "<!-- '>' --><a/> -> a", "<!x \"'>\" '\">'><a/> -> a",
          "<!--><a/> -> a", "<!DOCTYPE a SYSTEM \"a>.dtd\"><a/> -> a", "<![CDATA[x]]><a/> -> a"});
    Fail(2, {" ^<!-- a --"});
    Fail(3, {"<!-- don^'t --><a/>"});
    Fail(5, {"<!-- a > ^b --><a/>", "<!DOCTYPE a [<!ENTITY b 'c'>^]><a/>"});
}

TEST(XmlDocument, XmlDeclaration) {
    Open({"<?xml?><?xml version='1.0'?><a/><?xml version=\"1.0\" ?> -> a", "<?xml version=' 1.0 '?> -> ",
          "<?xml version='' encoding='  '?><a/> -> a", "<?XML version='2'?><a/> -> a",
          "<?xmla version='2' encoding='z'?><a/> -> a", "<a><?xml version='2' encoding='z'?></a> -> a"});
    Open({"<?xml encoding='uTf-8'?><a/> -> a"}, Utf8);
    Fail(11, {"<a/>^<?xml version='1.1'?>", "^<?xml version='1. 0'?>", " ^<?xml encoding='x' version='2'?>"});
    Fail(12, {"^<?xml encoding='UTF-16'?><a/>"}, Utf8);
    for (const char16_t* name : {u"utf-16", u"iso-10646-UCS-2", u"UNICODE"})
        Check(u"<?xml encoding='" + std::u16string(name) + u"'?><a/>", kGood, 0, "a");
    for (const char16_t* name : {u"UTF-8", u"UTF-16LE", u"UTF-1", u"UTF-16 x"})
        Check(u"<?xml encoding='" + std::u16string(name) + u"'?><a/>", 12, 0);
}

TEST(XmlDocument, TagsAndAttributes) {
    Open({"<_:a-1.b \t></_:a-1.b\r\n> -> _:a-1.b", "<\xC3\xA9\xE4\xB8\xAD\xCC\x81/> -> \\00E9\\4E2D\\0301",
          "<a b='\"'c=\"'\"d \t=\r\n ' 1 \t\r\n 2 ' >x</a> -> a b='\"' c=''' d='1 2':x",
          "<a b='<c>]]><!-- x --><![CDATA[y]]>'/> -> a b='<c>]]><!-- x --><![CDATA[y]]>'",
          // Intended: xml-empty-attribute
          "<a b='' c='1' d=\" \n\"/> -> a c='1'", "<a b='&#32;'/> -> a b=' '", "<a b='' b='1'/> -> a b='1'"});
    Fail(4, {"<^", "<a ^<b/>", "<a/^ >", "<a></a ^b='c'>"});
    Fail(5, {"<^ a/>", "<a><^1/></a>", "<^\xCC\x81/>"});
    Fail(6, {"<a^\xC2\xA9/>", "<a b='1' ^b=''/>", "<a b ^'1'/>", "<a b='1'^2/>"});
    Fail(14, {"<a>^</b>", "<a>^</ a>", "<a>^</ab>"});
}

TEST(XmlDocument, ManyAttributesAreComparedByTable) {
    std::string outline = "a";
    for (int i = 0; i < 300; ++i) {
        outline += " n" + std::to_string(i) + "='" + std::to_string(i % 7) + "'";
        if ((i < 14 || i > 17) && i != 31 && i != 32 && i != 299) continue;
        const std::string text = "<" + outline + "><n n0='1'/></a> -> " + outline + "(n n0='1')";
        Open({text.c_str()}); // tables do not leak into the next tag
        for (int twice : {0, i / 2, i}) Fail(6, {("<" + outline + " ^n" + std::to_string(twice) + "='x'/>").c_str()});
    }
}

TEST(XmlDocument, InstructionsAndSections) {
    Open({"<a><?b?><c/><?d e=\"?>\"?></a> -> a(c)", "<a>x <?b?> <!-- c --> <?d?></a> -> a:x"});
    // Intended: xml-text-or-children
    Fail(15, {"<a>x<?b?> ^y</a>", "<a>x<?b?>^<![CDATA[y]]></a>", "<a>x^<b/></a>", "<a><b/>^x</a>", "<a>x<?b?>^</b>"});

    Open({"<a><![CDATA[ <&#65; \n ]> ]]></a> -> a: <&#65; \\000A ]> ", "<a>p <![CDATA[ x ]]> q</a> -> a:p  x  q",
          "<a><![CDATA[x]]]]><![CDATA[>y]]></a> -> a:x]]>y", "<a><![CDATA[]]> x</a> -> a:x"});
    Fail(9, {"<a>^<![CDATA[x]]", "<a>^<![CDATA[]></a>"});
    Fail(10, {"<a>x ]^]]></a>"});
}

// Intended: xml-named-references
TEST(XmlDocument, IntendedReferenceLookUpIsInverted) {
    Open({"<a>&lt;</a> -> a:>", "<a>&gt;</a> -> a:<", "<a>&amp;</a> -> a:<;", "<a>&apos;</a> -> a:<s;",
          "<a b='&quot;'/> -> a b='<t;'", "<a>&xyz</a> -> a:<", "<a>&   x</a> -> a:<x", "<a>&</a></a> -> a:<>",
          "<a><!-- & -->x</a> -> a:x"});
    Fail(16, {"<a>&xy\xC3^\xA9</a>", "<a>&x\xE4\xB8^\xAD</a>"}, Utf8);
    Open({"<a>&x\xC3\xA9y</a> -> a:<y"}, Utf8);
    Check<std::u16string>(u"<a>&xy\xD83D\xDE00</a>", 16, 7);
    Check<std::u16string>(u"<a>&x\xD83D\xDE00y</a>", kGood, 0, "a:<y");
    Check<std::u16string>(u"<a>&\xDC00xzy</a>", kGood, 0, "a:<y");
}

// Intended: xml-numeric-references
TEST(XmlDocument, IntendedNumericReferences) {
    Open({"<a b='&#65;'>&#00000000000000000000000000066;</a> -> a b='A':B", "<a>&#6:;&#:;</a> -> a:F\\000A",
          "<a> &#32;&#9;&#10;&#13; </a> -> a: \\0009\\000A\\000D", "<a>x &#32; y</a> -> a:x   y",
          "<a>&#55295;&#57344;&#65533;&#65536;</a> -> a:\\D7FF\\E000\\FFFD\\D840\\DC00",
          "<a>&#128512;&#1048575;</a> -> a:\\D87D\\DE00\\DBFF\\DFFF", "<a>&#60;b/&#62;&#38;#65;</a> -> a:<b/>&#65;"});
    Fail(7, {"<a>x^&#x41;</a>", "<a>^&#;</a>", "<a>^&#0;</a>", "<a>^&#8;</a>", "<a>^&#31;</a>", "<a>^&#55296;</a>",
             "<a>^&#65534;</a>", "<a>^&#1114112;</a>", "<a>^&#4294967361;</a>", "<a>^&#18446744073709551681;</a>",
             "<a>^&#65</a>", "<a>^&#65", "<a>^&#", "<a>^&# 65;</a>", "<a>^&#+65;</a>"});
    Fail(16, {"<a>^&#1048576;</a>", "<a b='^&#1114111;'/>"});
}

TEST(XmlDocument, CharactersOfUtf8) {
    Open({"<a>\x01\x7F\xEF\xBF\xBE\xEF\xBF\xBF</a> -> a:\\0001\\007F\\FFFE\\FFFF",
          "<a b='\xF0\x90\x80\x80'>\xF0\x9F\x98\x80</a> -> a b='\\D840\\DC00':\\D87D\\DE00",
          "<a>x\xC0\xBCy</a> -> a:x<y", "<a>\xC0\xA0x\xC0\xA0\xC0\xA0</a> -> a: x  ",
          "<a b='x\xC0\xA7y'/> -> a b='x'y'", "<a>\xC0\xA6#65;</a> -> a:&#65;", "<\xC1\xA1 b='1'></a> -> a b='1'",
          "<ab></\xE0\x81\xA1\x62> -> ab", "<a><!-- \xC0\x80\xED\xA0\x80 -->x</a> -> a:x"},
         Utf8);
    Fail(16,
         {"<a>x^\xC0\x80</a>", "<a b='x^\xC0\x80'/>", "<a><![CDATA[x^\xC0\x80]]></a>", "<a>^\xED\xA0\x80</a>",
          "<a>^\xED\xBF\xBF</a>", "<a>x^\xF4\x80\x80\x80</a>", "<a>x ^\xF4\x90\x80\x80</a>"},
         Utf8);
}

TEST(XmlDocument, CharactersOfUtf16) {
    Check<std::u16string>(u"<a b='\xD83D\xDE00'>\xD800\xDC00</a>", kGood, 0, "a b='\\D83D\\DE00':\\D800\\DC00");
    Check<std::u16string>(u"<a>\xD83D\xDBFF\xD83D\xE000</a>", kGood, 0, "a:\\D83D\\DBFF\\D83D\\E000"); // from DBFF up
    Check<std::u16string>(u"<a>\x01\xFFFE\xFFFF\xDBFF\xDFFF</a>", kGood, 0, "a:\\0001\\FFFE\\FFFF\\DBFF\\DFFF");
    Check<std::u16string>(u"<a><!-- \xD83D -->x</a>", kGood, 0, "a:x");
    for (std::u16string text : {u"<a>x^\xD83Dy</a>", u"<a>^\xD83D\xDBFE\xDC00</a>", u"<a>^\xDE00</a>",
                                u"<a b='x ^\xDE00'/>", u"<a>^\xD83D", u"<a><![CDATA[x^\xD83D]]></a>"}) {
        const std::size_t error = text.find(u'^');
        Check(text.erase(error, 1), 16, error);
    }
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
