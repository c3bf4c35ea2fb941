// Documents: what the parser accepts, what it gives, and where it finds the first error.

#include "support/xmltexts.h"

#include <gtest/gtest.h>

using namespace support;

namespace {

// A text and its outline, or with '^' before the error's place, and its code.
struct Row {
    const char* name;
    std::string text;
    unsigned code;
    const char* outline = "";
};

Row Good(const char* name, const std::string& text, const char* outline) { return {name, text, 128, outline}; }

struct Case {
    std::string text;
    std::size_t errorAt = 0;

    explicit Case(const Row& row) : text(row.text) {
        const std::size_t mark = text.find('^');
        if (mark == text.npos) return;
        text.erase(mark, 1);
        errorAt = mark;
    }
};

void Expect(const Row& row, const char* form, const Reading& reading, std::size_t offset) {
    EXPECT_EQ(reading.code, row.code) << row.name << ", " << form;
    EXPECT_EQ(reading.offset, row.code == 128 ? 0 : offset) << row.name << ", " << form;
    EXPECT_EQ(reading.outline, row.outline) << row.name << ", " << form;
}

void CheckUtf8(const Row& row) {
    const Case it(row);
    const Reading reading = OpenUtf8(it.text);
    Expect(row, "UTF-8", reading, it.errorAt);
    EXPECT_EQ(reading, XmlReference::Read(it.text)) << row.name;
    const std::string marked = WithMark(it.text);
    Expect(row, "UTF-8 with mark", OpenUtf8(marked), it.errorAt + 3);
    Expect(row, "raw UTF-8 with mark", OpenRaw(marked), it.errorAt + 3);
    if (it.text.size() >= 4) Expect(row, "raw UTF-8", OpenRaw(it.text), it.errorAt);
}

void CheckUtf16(const Row& row, const std::u16string& text, std::size_t errorAt) {
    const Reading reading = OpenUtf16(text);
    Expect(row, "UTF-16", reading, errorAt);
    EXPECT_EQ(reading, XmlReference::Read(text)) << row.name;
    const std::u16string marked = u"\xFEFF" + text;
    Expect(row, "UTF-16 with mark", OpenUtf16(marked), errorAt + 1);
    for (bool swapped : {false, true}) {
        if (!text.empty()) Expect(row, "raw UTF-16 with mark", OpenRaw(BytesOf(marked, swapped)), errorAt + 1);
        const bool isTold = !text.empty() && std::u16string(u"< \t\r\n").find(text[0]) != text.npos;
        if (isTold && text.size() >= 2) Expect(row, "raw UTF-16", OpenRaw(BytesOf(text, swapped)), errorAt);
    }
    if (!text.empty()) Expect(row, "at an odd address", OpenRaw(BytesOf(marked) + "<"), errorAt + 1);
}

void CheckBoth(const Row& row) {
    CheckUtf8(row);
    const Case it(row);
    CheckUtf16(row, ToUtf16(it.text), ToUtf16(it.text.substr(0, it.errorAt)).size());
}

template <std::size_t Size> void CheckAll(const Row (&rows)[Size]) {
    for (const Row& row : rows) CheckBoth(row);
}

} // namespace

TEST(XmlDocument, TopLevel) {
    CheckAll({
        {"blanks only", " \t\r\n^", 1},
        Good("declaration alone", "<?xml version='1.0'?>", ""),
        Good("comment alone", "<!--x-->", ""),
        Good("blanks around", " \r\n<a/>\t", "a"),
        {"text", "^x<a/>", 5},
        {"text behind", "<a/> ^x", 5},
        {"second root", "<a/><!---->^<b/>", 17},
        {"second root, not even a name", "<a/>^<1/>", 17},
        {"end tag", "^</a>", 14},
        {"end tag behind", "<a/>^</a>", 14},
        {"end tag cut", "<a/></^", 4},
        {"reference", "^&#65;", 5},
        {"'<' at the end", "<a/><^", 4},
    });
    const Row marks{"second mark", WithMark(std::string("^") + WithMark("<a/>")), 5};
    Expect(marks, "UTF-8", OpenUtf8(Case(marks).text), 3);
    Expect(marks, "UTF-16", OpenUtf16(u"\xFEFF\xFEFF<a/>"), 1);
}

TEST(XmlDocument, IntendedDeclarationsRunToTheFirstBracketOutsideQuotes) {
    CheckAll({
        {"bracket in a comment", "<!-- a > ^b --><a/>", 5},
        {"apostrophe in a comment", "<!-- don^'t --><a/>", 3},
        Good("two apostrophes swallow markup", "<!-- don't --><a/><!-- can't --><b/>", "b"),
        Good("quoted bracket in a comment", "<!-- '>' --><a/>", "a"),
        Good("the other quote inside", "<!x \"'>\" '\">'><a/>", "a"),
        Good("comment closed early", "<!--><a/>", "a"),
        {"open comment", " ^<!-- a --", 2},
        {"open comment, nothing else", "^<!--", 2},
        {"open declaration", "<!DOCTYPE a^", 1},
        {"open declaration, nothing else", "<!^", 1},
        {"half a comment's start", "<!-^", 1},
        {"open quote in a declaration", "<!DOCTYPE a ^\"b>", 3},
        {"the first quote that is open", "<!x 'a' \"b\" ^'c\"", 3},
        Good("DOCTYPE", "<!DOCTYPE a SYSTEM \"a>.dtd\"><a/>", "a"),
        {"internal subset", "<!DOCTYPE a [<!ENTITY b 'c'>^]><a/>", 5},
        Good("CDATA is a declaration", "<![CDATA[x]]><a/>", "a"),
    });
}

TEST(XmlDocument, XmlDeclaration) {
    CheckAll({
        Good("repeated, and behind the root", "<?xml?><?xml version='1.0'?><a/><?xml version=\"1.0\" ?>", "a"),
        {"version", "<a/>^<?xml version='1.1'?>", 11},
        {"version with blanks inside", "^<?xml version='1. 0'?>", 11},
        Good("version with blanks around", "<?xml version=' 1.0 '?>", ""),
        {"version with zero before", "^<?xml version='01.0'?>", 11},
        {"version first, whatever the order", " ^<?xml encoding='x' version='2'?>", 11},
        {"encoding", " ^<?xml version='1.0' encoding='ISO-8859-1'?>", 12},
        Good("empty ones are absent", "<?xml version='' encoding='  '?><a/>", "a"),
        Good("other attributes", "<?xml standalone='yes' x='y'?><a/>", "a"),
        Good("another case of the name", "<?XML version='2'?><a/>", "a"),
        Good("another name", "<?xmla version='2' encoding='z'?><a/>", "a"),
        Good("inside an element unchecked", "<a><?xml version='2' encoding='z'?></a>", "a"),
        {"read like a tag", "<?xml ^1", 6},
    });
    for (const char* name : {"UTF-8", "utf-8", "Utf-8"})
        CheckUtf8(Good(name, std::string("<?xml encoding='") + name + "'?><a/>", "a"));
    for (const char* name : {"UTF-16", "ISO-10646-UCS-2", "Unicode"})
        CheckUtf8({name, std::string("^<?xml encoding='") + name + "'?><a/>", 12});
    for (const char16_t* name : {u"UTF-16", u"utf-16", u"iso-10646-UCS-2", u"UNICODE"})
        CheckUtf16(Good("in UTF-16", "", "a"), u"<?xml encoding='" + std::u16string(name) + u"'?><a/>", 0);
    for (const char16_t* name : {u"UTF-8", u"UTF-16LE", u"UTF-1", u"UTF-16 x"})
        CheckUtf16({"in UTF-16", "", 12}, u"<?xml encoding='" + std::u16string(name) + u"'?><a/>", 0);
}

TEST(XmlDocument, Tags) {
    CheckAll({
        Good("empty element", "<a/>", "a"),
        Good("blanks", "<a \n/>", "a"),
        Good("name characters", "<_:a-1.b \t></_:a-1.b\r\n>", "_:a-1.b"),
        Good("other letters", "<\xC3\xA9\xE4\xB8\xAD\xCC\x81/>", "\\00E9\\4E2D\\0301"),
        {"no name", "<^>", 5},
        {"blank before the name", "<^ a/>", 5},
        {"digit first", "<a><^1/></a>", 5},
        {"combining character first", "<^\xCC\x81/>", 5},
        {"character above FFFF", "<^\xF0\x9F\x98\x80/>", 5},
        {"end behind '<'", "<^", 4},
        {"end behind '<' inside", "<a><^", 4},
        {"end behind '<' after data", "<a>x<^", 4},
        {"end in the name", "<ab^", 4},
        {"end behind blanks", "<a ^", 4},
        {"'<' in a tag", "<a ^<b/>", 4},
        {"slash without bracket", "<a/^ >", 4},
        {"slash at the end", "<a b='c'/^", 4},
        {"question mark", "<a^?>", 6},
        {"quote", "<a^\"b\"/>", 6},
        {"name goes on with what is none", "<a^\xC2\xA9/>", 6},
        {"end tag of another", "<a>^</b>", 14},
        {"end tag of the parent", "<a><b>^</a></b>", 14},
        {"end tag without name", "<a>^</>", 14},
        {"end tag with blank first", "<a>^</ a>", 14},
        {"end tag longer", "<a>^</ab>", 14},
        {"end tag shorter", "<ab>^</a>", 14},
        {"end tag's end missing", "<a></a^", 4},
        {"end tag's end missing behind blanks", "<a></a ^", 4},
        {"end tag with attribute", "<a></a ^b='c'>", 4},
        {"end tag with slash", "<a></a^/>", 4},
        {"end tag cut", "<a></^", 4},
        {"end tag cut after data", "<a>x</^", 4},
        {"unclosed", "<a>^", 1},
        {"unclosed after a child", "<a><b/> ^", 1},
    });
}

TEST(XmlDocument, Attributes) {
    CheckAll({
        Good("two quotes", "<a b='\"' c=\"'\"/>", "a b='\"' c='''"),
        Good("no blank between", "<a b='1'c=\"2\"d='3'/>", "a b='1' c='2' d='3'"),
        Good("blanks around '='", "<a b \t=\r\n '1' >x</a>", "a b='1':x"),
        Good("plain characters", "<a b='<c>]]><!-- x --><![CDATA[y]]>'/>", "a b='<c>]]><!-- x --><![CDATA[y]]>'"),
        Good("blanks collapse", "<a b=' 1 \t\r\n 2 '/>", "a b='1 2'"),
        Good("other characters", "<a b='\xC3\xA9\xE4\xB8\xAD'/>", "a b='\\00E9\\4E2D'"),
        Good("empty is dropped", "<a b='' c='1' d=\" \n\"/>", "a c='1'"),
        Good("a blank from a reference is not empty", "<a b='&#32;'/>", "a b=' '"),
        Good("dropped ones do not count", "<a b='' b='1'/>", "a b='1'"),
        {"a kept one does", "<a b='1' ^b=''/>", 6},
        {"duplicate", "<a b='1' c='2' ^b='1'/>", 6},
        {"missing name", "<a ^='1'/>", 6},
        {"missing '='", "<a b ^'1'/>", 6},
        {"missing '=', tag's end", "<a b^/>", 6},
        {"missing quote", "<a b= ^1/>", 6},
        {"missing value", "<a b=^>", 6},
        {"end behind the name", "<a b^", 4},
        {"end behind '='", "<a b= ^", 4},
        {"open value", "<a b=^'1\"/>", 3},
        {"open value, nothing else", "<a b=^\"", 3},
        {"open value behind a blank", "<a b=^'1 ", 3},
        {"wrong unit behind a value", "<a b='1'^2/>", 6},
    });
}

TEST(XmlDocument, ManyAttributesAreComparedByTable) {
    std::string text = "<a";
    std::string outline = "a";
    for (int i = 0; i < 300; ++i) {
        char attribute[32];
        std::snprintf(attribute, sizeof(attribute), " n%d='%d'", i, i % 7);
        text += attribute;
        outline += attribute;
        if (i == 14 || i == 15 || i == 16 || i == 17 || i == 31 || i == 32 || i == 33 || i == 299) {
            CheckBoth(Good("all different", text + "/>", outline.c_str()));
            for (int twice : {0, i / 2, i})
                CheckBoth({"duplicate", text + " ^n" + std::to_string(twice) + "='x'/>", 6});
            CheckBoth(Good("tables do not leak into the next tag", text + "><n n0='1'/></a>",
                           (outline + "(n n0='1')").c_str()));
        }
    }
}

TEST(XmlDocument, Instructions) {
    CheckAll({
        Good("at top level", "<?a?><?b c='d' ?><a/><?e?>", "a"),
        Good("between children", "<a><?b?><c/><?d e=\"?>\"?></a>", "a(c)"),
        Good("they decide nothing", "<a> <?b?> x</a>", "a:x"),
        Good("behind data", "<a>x <?b?> <!-- c --> <?d?></a>", "a:x"),
        {"text behind data", "<a>x<?b?> ^y</a>", 15},
        {"section behind data", "<a>x<?b?>^<![CDATA[y]]></a>", 15},
        {"no name", "<?^?>", 5},
        {"blank first", "<?^ a?>", 5},
        {"text", "<?a text^?>", 6},
        {"end", "<?a ^", 4},
        {"end behind '<?'", "<?^", 4},
        {"bracket", "<?a^>", 4},
        {"slash", "<?a^/>", 6},
        {"question mark alone", "<?a?^ >", 4},
        {"question mark at the end", "<?a?^", 4},
        {"'<'", "<?a ^<b/>", 4},
        {"duplicate", "<a><?b c='1' ^c='1'?></a>", 6},
    });
}

TEST(XmlDocument, Sections) {
    CheckAll({
        Good("literal", "<a><![CDATA[ <&#65; \n ]> ]]></a>", "a: <&#65; \\000A ]> "),
        Good("blanks between text and section", "<a>p <![CDATA[ x ]]> q</a>", "a:p  x  q"),
        Good("blank at the end is kept", "<a><![CDATA[x ]]></a>", "a:x "),
        Good("blanks around the only one", "<a> <![CDATA[x]]> \n</a>", "a:x"),
        Good("blank between two", "<a><![CDATA[x]]> \t <![CDATA[y]]></a>", "a:x y"),
        Good("none between two", "<a><![CDATA[x]]><![CDATA[y]]></a>", "a:xy"),
        Good("a terminator in two", "<a><![CDATA[x]]]]><![CDATA[>y]]></a>", "a:x]]>y"),
        Good("brackets before the end", "<a><![CDATA[]]]]></a>", "a:]]"),
        Good("empty", "<a><![CDATA[]]></a>", "a"),
        Good("empty, then text", "<a><![CDATA[]]> x</a>", "a:x"),
        {"open", "<a>^<![CDATA[x]]", 9},
        {"open, nothing else", "<a>x ^<![CDATA[", 9},
        {"open, marks overlap", "<a>^<![CDATA[]></a>", 9},
        Good("another case is a declaration", "<a><![cdata[x]]></a>", "a"),
    });
}

TEST(XmlDocument, IntendedReferenceLookUpIsInverted) {
    CheckAll({
        Good("lt", "<a>&lt;</a>", "a:>"),
        Good("gt", "<a>&gt;</a>", "a:<"),
        Good("amp", "<a>&amp;</a>", "a:<;"),
        Good("apos", "<a>&apos;</a>", "a:<s;"),
        Good("quot", "<a b='&quot;'/>", "a b='<t;'"),
        Good("anything", "<a>&xyz</a>", "a:<"),
        Good("blanks are skipped too", "<a>&   x</a>", "a:<x"),
        Good("it swallows a tag", "<a>&</a></a>", "a:<>"),
        {"it swallows a quote", "<a b=\"&\" c=\"d^\"/>", 6},
        {"beyond the end", "<a>&lt^", 1},
        {"beyond the end, nothing else", "<a>&^", 1},
        {"beyond the end in a value", "<a b='&x^", 1},
        {"to the very end", "<a>&abc^", 1},
        {"to the very end of a value", "<a b=^'&abc", 3},
        Good("inside a comment none", "<a><!-- & -->x</a>", "a:x"),
    });
    CheckUtf8({"into a sequence", "<a>&xy\xC3^\xA9</a>", 16});
    CheckUtf8({"into a longer sequence", "<a>&x\xE4\xB8^\xAD</a>", 16});
    CheckUtf8(Good("over a sequence", "<a>&x\xC3\xA9y</a>", "a:<y"));
    CheckUtf16({"into a pair", "", 16}, u"<a>&xy\xD83D\xDE00</a>", 7);
    CheckUtf16(Good("over a pair", "", "a:<y"), u"<a>&x\xD83D\xDE00y</a>", 0);
    CheckUtf16(Good("over a lone unit", "", "a:<y"), u"<a>&\xDC00xzy</a>", 0);
}

TEST(XmlDocument, IntendedNumericReferences) {
    CheckAll({
        Good("decimal", "<a b='&#65;'>&#00000000000000000000000000066;</a>", "a b='A':B"),
        Good("the colon counts ten", "<a>&#6:;&#:;</a>", "a:F\\000A"),
        Good("blanks are kept", "<a> &#32;&#9;&#10;&#13; </a>", "a: \\0009\\000A\\000D"),
        Good("blanks are kept between blanks", "<a>x &#32; y</a>", "a:x   y"),
        Good("edges", "<a>&#55295;&#57344;&#65533;&#65536;</a>", "a:\\D7FF\\E000\\FFFD\\D840\\DC00"),
        Good("above FFFF", "<a>&#128512;&#1048575;</a>", "a:\\D87D\\DE00\\DBFF\\DFFF"),
        Good("markup is text", "<a>&#60;b/&#62;&#38;#65;</a>", "a:<b/>&#65;"),
        {"hexadecimal", "<a>x^&#x41;</a>", 7},
        {"no digits", "<a>^&#;</a>", 7},
        {"zero", "<a>^&#0;</a>", 7},
        {"8", "<a>^&#8;</a>", 7},
        {"31", "<a>^&#31;</a>", 7},
        {"surrogate", "<a>^&#55296;</a>", 7},
        {"FFFE", "<a>^&#65534;</a>", 7},
        {"100000 cannot be stored", "<a>^&#1048576;</a>", 16},
        {"10FFFF cannot be stored", "<a b='^&#1114111;'/>", 16},
        {"above 10FFFF", "<a>^&#1114112;</a>", 7},
        {"2^32 + 65", "<a>^&#4294967361;</a>", 7},
        {"2^64 + 65", "<a>^&#18446744073709551681;</a>", 7},
        {"no semicolon", "<a>^&#65</a>", 7},
        {"end of the text", "<a>^&#65", 7},
        {"end of the text at once", "<a>^&#", 7},
        {"blank", "<a>^&# 65;</a>", 7},
        {"sign", "<a>^&#+65;</a>", 7},
    });
    CheckBoth({"many digits", std::string("<a>^&#").append(50000, '9').append(";</a>"), 7});
}

TEST(XmlDocument, CharactersOfUtf8) {
    const Row rows[] = {
        Good("controls, FFFE and FFFF", "<a>\x01\x7F\xEF\xBF\xBE\xEF\xBF\xBF</a>", "a:\\0001\\007F\\FFFE\\FFFF"),
        Good("above FFFF", "<a b='\xF0\x90\x80\x80'>\xF0\x9F\x98\x80</a>", "a b='\\D840\\DC00':\\D87D\\DE00"),
        Good("overlong '<' is data", "<a>x\xC0\xBCy</a>", "a:x<y"),
        Good("overlong blank is no blank", "<a>\xC0\xA0x\xC0\xA0\xC0\xA0</a>", "a: x  "),
        Good("overlong quote", "<a b='x\xC0\xA7y'/>", "a b='x'y'"),
        Good("overlong '&'", "<a>\xC0\xA6#65;</a>", "a:&#65;"),
        Good("overlong letters in names", "<\xC1\xA1 b='1'></a>", "a b='1'"),
        Good("overlong letters in an end tag", "<ab></\xE0\x81\xA1\x62>", "ab"),
        {"overlong letters of another name", "<ab>^</\xE0\x81\xA1>", 14},
        {"overlong duplicate", "<a b='1' ^\xC1\xA2='2'/>", 6},
        {"overlong declaration", "^<?\xC1\xB8ml version='2'?>", 11},
        {"a zero", "<a>x^\xC0\x80</a>", 16},
        {"a zero in a value", "<a b='x^\xC0\x80'/>", 16},
        {"a zero in a section", "<a><![CDATA[x^\xC0\x80]]></a>", 16},
        {"surrogate", "<a>^\xED\xA0\x80</a>", 16},
        {"last surrogate", "<a>^\xED\xBF\xBF</a>", 16},
        {"100000", "<a>x^\xF4\x80\x80\x80</a>", 16},
        {"above 10FFFF", "<a>x ^\xF4\x90\x80\x80</a>", 16},
        Good("what is skipped is not checked", "<a><!-- \xC0\x80\xED\xA0\x80 -->x</a>", "a:x"),
        {"overlong '<' is no markup", "^\xC0\xBC\x61/>", 5},
    };
    for (const Row& row : rows) CheckUtf8(row);
}

TEST(XmlDocument, CharactersOfUtf16) {
    const struct {
        const char* name;
        std::u16string text; // '^' before the error
        unsigned code;
        const char* outline;
    } rows[] = {
        {"pairs as they are", u"<a b='\xD83D\xDE00'>\xD800\xDC00</a>", 128, "a b='\\D83D\\DE00':\\D800\\DC00"},
        {"any second unit from DBFF up", u"<a>\xD83D\xDBFF\xD83D\xE000\xD83D\xFFFF</a>", 128,
         "a:\\D83D\\DBFF\\D83D\\E000\\D83D\\FFFF"},
        {"the highest pair", u"<a>\xDBFF\xDFFF</a>", 128, "a:\\DBFF\\DFFF"},
        {"controls", u"<a>\x01\xFFFE\xFFFF</a>", 128, "a:\\0001\\FFFE\\FFFF"},
        {"high alone", u"<a>x^\xD83Dy</a>", 16, ""},
        {"two highs", u"<a>^\xD83D\xDBFE\xDC00</a>", 16, ""},
        {"low alone", u"<a>^\xDE00</a>", 16, ""},
        {"low alone in a value", u"<a b='x ^\xDE00'/>", 16, ""},
        {"high before the end", u"<a>^\xD83D", 16, ""},
        {"high alone in a section", u"<a><![CDATA[x^\xD83D]]></a>", 16, ""},
        {"pair in a name", u"<a^\xD83D\xDE00/>", 6, ""},
        {"pair as a name", u"<^\xD83D\xDE00/>", 5, ""},
        {"low where markup must start", u"^\xDE00<a/>", 5, ""},
        {"what is skipped is not checked", u"<a><!-- \xD83D -->x</a>", 128, "a:x"},
    };
    for (const auto& row : rows) {
        std::u16string text = row.text;
        const std::size_t mark = text.find(u'^');
        if (mark != text.npos) text.erase(mark, 1);
        CheckUtf16({row.name, "", row.code, row.outline}, text, mark);
    }
}

// Bytes that are no UTF-8 are refused before anything is read.
TEST(XmlDocument, IntendedBadUtf8IsToldWithoutItsPlace) {
    const std::u16string message = u"Offset: 0, Illegal UTF8 character";
    for (const char* bad : {"\x80", "\xBF", "\xC3", "\xC3x", "\xE4\xB8", "\xE4\xB8x", "\xF0\x9F\x98", "\xF0\x9F\x98x",
                            "\xF5\x80\x80\x80", "\xF8\x88\x80\x80\x80", "\xFE", "\xFF"}) {
        for (const char* before : {"<a/>", "<a>", "x", "<!-- "}) {
            const Reading reading = OpenUtf8(std::string(before) + bad);
            EXPECT_EQ(reading.code, 13u) << before;
            EXPECT_EQ(reading.offset, 0u) << before;
            EXPECT_EQ(reading.message, message) << before;
        }
    }
    EXPECT_EQ(OpenRaw(std::string("<a/>\0\x80", 6)).code, 128u) << "what follows the zero is ignored";
}
