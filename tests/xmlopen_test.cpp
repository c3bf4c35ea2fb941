// Documents: files, encodings told from the bytes, the error's message and its log line, the object itself.

#include "support/heapwatch.h"
#include "support/scratch.h"
#include "support/xmltexts.h"

#include <cstdarg>
#include <TAVO/develop.h>
#include <utility>

using namespace support;
using namespace TAVO;
using namespace TAVO::XML;

namespace {

const char16_t kNoFile[] = u"Bad file or bad encoding";

std::string Bytes(std::initializer_list<int> values) {
    std::string bytes;
    for (int value : values) bytes += static_cast<char>(value);
    return bytes;
}

} // namespace

TEST(XmlOpening, BytesTellTheirEncoding) {
    const struct {
        const char* name;
        std::string bytes;
        unsigned code;
        std::size_t offset;
        const char* outline;
    } rows[] = {
        {"none", "", 0, 0, ""},
        {"one", "<", 0, 0, ""},
        {"three", "<a>", 0, 0, ""},
        {"four", "<a/>", 128, 0, "a"},
        {"four blanks", "    ", 1, 4, ""},
        {"no '<' in UTF-8", "a<b/>", 5, 0, ""},
        {"UTF-8 mark and nothing", Bytes({0xEF, 0xBB, 0xBF, 0}), 1, 3, ""},
        {"UTF-8 mark and a blank", Bytes({0xEF, 0xBB, 0xBF, ' '}), 1, 4, ""},
        {"mark and zero", Bytes({0xFF, 0xFE, 0, 0}), 0, 0, ""},
        {"mark and zero and more", Bytes({0xFF, 0xFE, 0, 0, '<', 0, 'a', 0, '/', 0, '>', 0}), 0, 0, ""},
        {"mark, '<'", Bytes({0xFF, 0xFE, '<', 0}), 4, 2, ""},
        {"swapped mark and zero", Bytes({0xFE, 0xFF, 0, 0}), 1, 1, ""},
        {"swapped mark, '<'", Bytes({0xFE, 0xFF, 0, '<'}), 4, 2, ""},
        {"UTF-16 '<'", Bytes({'<', 0, 'a', 0, '/', 0, '>', 0}), 128, 0, "a"},
        {"UTF-16 space", Bytes({' ', 0, 'a', 0}), 5, 1, ""},
        {"UTF-16 tab", Bytes({'\t', 0, '<', 0}), 4, 2, ""},
        {"UTF-16 CR", Bytes({'\r', 0, '\r', 0}), 1, 2, ""},
        {"UTF-16 LF", Bytes({'\n', 0, '\n', 0}), 1, 2, ""},
        {"another unit is UTF-8", Bytes({'a', 0, '<', 0}), 5, 0, ""},
        {"swapped '<'", Bytes({0, '<', 0, 'a', 0, '/', 0, '>'}), 128, 0, "a"},
        {"swapped space", Bytes({0, ' ', 0, 'a'}), 5, 1, ""},
        {"swapped tab", Bytes({0, '\t', 0, 'a'}), 5, 1, ""},
        {"swapped CR", Bytes({0, '\r', 0, 'a'}), 5, 1, ""},
        {"swapped LF", Bytes({0, '\n', 0, 'a'}), 5, 1, ""},
        {"swapped other unit", Bytes({0, 'a', 0, '<'}), 0, 0, ""},
        {"zeros", Bytes({0, 0, 0, 0}), 0, 0, ""},
        {"odd size", Bytes({'<', 0, 'a', 0, '/', 0, '>', 0, 'x'}), 128, 0, "a"},
        {"odd size, swapped", Bytes({0, '<', 0, 'a', 0, '/', 0, '>', 0}), 128, 0, "a"},
        {"what follows a zero is ignored", std::string("<a/>\0junk\xFF", 10), 128, 0, "a"},
        {"what follows a zero unit is ignored", Bytes({'<', 0, 'a', 0, '/', 0, '>', 0, 0, 0, 'x', 0}), 128, 0, "a"},
        {"the zero ends data", std::string("<a>x\0</a>", 9), 1, 4, ""},
        {"a zero byte ends UTF-8", std::string("<a/>\0\0", 6), 128, 0, "a"},
        {"UTF-32 is none", Bytes({'<', 0, 0, 0, 'a', 0, 0, 0}), 4, 1, ""},
        {"swapped UTF-32 is none", Bytes({0, 0, 0, '<'}), 0, 0, ""},
        {"half a UTF-8 mark", Bytes({0xEF, 0xBB, '<', 'a'}), 13, 0, ""},
    };
    for (const auto& row : rows) {
        const Reading reading = OpenRaw(row.bytes);
        EXPECT_EQ(reading.code, row.code) << row.name;
        EXPECT_EQ(reading.offset, row.offset) << row.name;
        EXPECT_EQ(reading.outline, row.outline) << row.name;
        EXPECT_EQ(reading.message == kNoFile, row.code == 0) << row.name;
        // At an odd address.
        std::string shifted = " " + row.bytes;
        CXMLDoc document;
        document.OpenDocText(shifted.data() + 1, row.bytes.size());
        EXPECT_EQ(ReadingOf(document), reading) << row.name;
    }
}

TEST(XmlOpening, SizeMayLieAnywhereBehindTheZero) {
    for (const std::string& text : {std::string("<a/>\0\0", 6), BytesOf(std::u16string(u"<a/>\0", 5)),
                                    BytesOf(std::u16string(u"<a/>\0", 5), true)}) {
        for (const unsigned long long size : {0x7FFFFFFFFFFFFFFFull, 0x8000000000000000ull, 0xFFFFFFFFFFFFFFFDull,
                                              0xFFFFFFFFFFFFFFFEull, 0xFFFFFFFFFFFFFFFFull}) {
            CXMLDoc document;
            std::string copy = text;
            EXPECT_TRUE(document.OpenDocText(copy.data(), size)) << size;
            EXPECT_EQ(ReadingOf(document).outline, "a");
        }
    }
}

TEST(XmlOpening, TwoCallsSeeTheSameBytes) {
    std::string bytes = BytesOf(u"\xFEFF<a/>", true);
    const std::string before = bytes;
    CXMLDoc document;
    for (int i = 0; i < 3; ++i) EXPECT_TRUE(document.OpenDocText(bytes.data(), bytes.size()));
    EXPECT_EQ(bytes, before);
}

TEST(XmlOpening, NullPointersGiveCodeZero) {
    CXMLDoc document;
    const auto check = [&](bool opened) {
        EXPECT_FALSE(opened);
        const Reading reading = ReadingOf(document);
        EXPECT_EQ(reading.code, 0u);
        EXPECT_EQ(reading.message, kNoFile);
        EXPECT_EQ(reading.outline, "");
        EXPECT_TRUE(document.OpenDocText(L"<a/>"));
    };
    check(document.OpenDocText(static_cast<void*>(nullptr), 100));
    check(document.OpenDocText(static_cast<const unsigned char*>(nullptr)));
    check(document.OpenDocText(static_cast<const unsigned short*>(nullptr)));
    check(document.OpenDocText(static_cast<const wchar_t*>(nullptr)));
    check(document.OpenDocFile(nullptr, XMLEncodingAutomatic));
    check(document.OpenDocFile(L"", XMLEncodingAutomatic));
}

TEST(XmlFile, EncodingArguments) {
    ScratchFolder folder;
    const WideText path = folder / L"document.xml";
    const struct {
        const char* name;
        std::string bytes;
        unsigned codes[4]; // by encoding 0 to 3
    } rows[] = {
        {"UTF-8", "<a/>", {128, 128, 128, 0}},
        {"UTF-8 with mark", WithMark("<a/>"), {128, 128, 128, 0}},
        {"UTF-16 with mark", BytesOf(u"\xFEFF<a/>"), {128, 128, 128, 128}},
        {"swapped with mark", BytesOf(u"\xFEFF<a/>", true), {128, 128, 128, 0}},
        {"UTF-16", BytesOf(u"<a/>"), {128, 128, 128, 0}},
        {"swapped", BytesOf(u"<a/>", true), {128, 128, 128, 0}},
        {"UTF-16 that says so", BytesOf(u"\xFEFF<?xml encoding='UTF-16'?><a/>"), {128, 128, 128, 128}},
        {"UTF-16 that says UTF-8", BytesOf(u"\xFEFF<?xml encoding='UTF-8'?><a/>"), {12, 12, 12, 12}},
        {"UTF-8 that says UTF-16", "<?xml encoding='UTF-16'?><a/>", {12, 12, 12, 0}},
        {"empty", "", {0, 0, 0, 0}},
        {"one byte", "<", {0, 0, 0, 0}},
        {"two bytes", "<a", {4, 4, 4, 0}},
        {"three bytes, refused in memory", "<a>", {1, 1, 1, 0}},
        {"three bytes of blanks", " \r\n", {1, 1, 1, 0}},
        {"a mark alone", BytesOf(u"\xFEFF"), {0, 0, 0, 0}},
        {"a swapped mark alone", BytesOf(u"\xFEFF", true), {1, 1, 0, 0}},
        {"last odd byte of UTF-16", BytesOf(u"\xFEFF<a/>") + "x", {128, 128, 128, 128}},
        {"last odd byte of swapped UTF-16", BytesOf(u"\xFEFF<a/>", true) + "x", {128, 128, 128, 0}},
        {"last odd byte of UTF-16 without mark", BytesOf(u"<a/>") + "x", {128, 128, 128, 0}},
        {"a zero byte", std::string("<a/>\0x", 6), {128, 128, 128, 0}},
        {"a zero unit", BytesOf(std::u16string(u"\xFEFF<a/>\0x", 7)), {128, 128, 128, 128}},
        {"a swapped zero unit", BytesOf(std::u16string(u"\xFEFF<a/>\0x", 7), true), {128, 128, 128, 0}},
    };
    for (const auto& row : rows) {
        Put(path, row.bytes);
        for (unsigned encoding = 0; encoding < 6; ++encoding) {
            CXMLDoc document;
            const bool opened = document.OpenDocFile(path, static_cast<eXMLEncoding>(encoding));
            const Reading reading = ReadingOf(document);
            const unsigned expected = encoding < 4 ? row.codes[encoding] : 0;
            EXPECT_EQ(reading.code, expected) << row.name << ", encoding " << encoding;
            EXPECT_EQ(opened, expected == 128) << row.name << ", encoding " << encoding;
            EXPECT_EQ(reading.outline, opened ? "a" : "") << row.name;
            EXPECT_EQ(reading.message == kNoFile, expected == 0);
        }
    }
}

TEST(XmlFile, RefusesWhatIsNoFile) {
    ScratchFolder folder;
    CXMLDoc document;
    for (const WideText& path : {folder / L"missing", folder / L"missing/too", folder.Path()}) {
        ASSERT_TRUE(document.OpenDocText(L"<a/>"));
        EXPECT_FALSE(document.OpenDocFile(path, XMLEncodingAutomatic));
        EXPECT_EQ(ReadingOf(document), (Reading{0, 0, "", kNoFile}));
    }
}

TEST(XmlFile, RefusesFourGigabytesAtOnce) {
    ScratchFolder folder;
    const WideText path = folder / L"large";
    {
        Files::OS::CFile file;
        ASSERT_TRUE(file.Open(path, Files::OS::FileAccessWrite, Files::OS::OpenFileCreate));
        if (!file.SetPointer(4294967296) || !file.SetEOF()) GTEST_SKIP() << "no room for the file";
    }
    const auto before = LiveBlocks();
    CXMLDoc document;
    const auto start = Develop::_now_milli();
    EXPECT_FALSE(document.OpenDocFile(path, XMLEncodingAutomatic));
    EXPECT_LT(Develop::_now_milli() - start, 2000u);
    EXPECT_EQ(ReadingOf(document), (Reading{0, 0, "", kNoFile}));
    EXPECT_EQ(LiveBlocks(), before);
}

TEST(XmlFile, PositionsCountFromTheFilesFirstUnit) {
    ScratchFolder folder;
    const WideText path = folder / L"document.xml";
    CXMLDoc document;
    Put(path, WithMark("<a>\n<b></a>"));
    EXPECT_FALSE(document.OpenDocFile(path, XMLEncodingUTF8));
    EXPECT_EQ(ReadingOf(document),
              (Reading{14, 10, "", u"[Bad termination tag, Line 2, Offset 10]\xFEFF<a> <b>[[*]]</a>"}));
    Put(path, BytesOf(u"\xFEFF<a>\n<b></a>", true));
    EXPECT_FALSE(document.OpenDocFile(path, XMLEncodingUTF16));
    EXPECT_EQ(ReadingOf(document),
              (Reading{14, 8, "", u"[Bad termination tag, Line 2, Offset 8]\xFEFF<a> <b>[[*]]</a>"}));
}

// --- messages ------------------------------------------------------------------------------------------------------

namespace {

// The message about `before` and `after` the error.
std::u16string MessageUtf8(const std::string& before, const std::string& after) {
    return OpenUtf8(before + after).message;
}
std::string Text(std::size_t count, char c) { return std::string(count, c); }

} // namespace

TEST(XmlMessage, ShowsSixtyUnitsBeforeTheError) {
    for (std::size_t n : {57u, 58u, 59u, 60u, 61u, 62u, 100u, 1000u}) {
        const std::string before = "<a>" + Text(n - 3, 'x');
        std::u16string shown = ToUtf16(n > 60 ? "..." + before.substr(n - 60) : before);
        EXPECT_EQ(MessageUtf8(before, "]]>"),
                  ToUtf16("[Bad data terminator, Line 1, Offset " + std::to_string(n) + "]") + shown + u"[[*]]]]>");
        EXPECT_EQ(OpenUtf16(ToUtf16(before + "]]>")).message, MessageUtf8(before, "]]>"));
    }
    EXPECT_EQ(MessageUtf8("", "x"), u"[Invalid tag, Line 1, Offset 0][[*]]x");
    EXPECT_EQ(MessageUtf8("<a>", ""), u"[End of file, Line 1, Offset 3]<a>[[*]]");
}

TEST(XmlMessage, ShowsRunsOfBlanksAsOneBeforeTheError) {
    EXPECT_EQ(MessageUtf8(" \t<a>\r\n\n \n", "]]> \t\n x"),
              u"[Bad data terminator, Line 4, Offset 10] <a> [[*]]]]> \t\n x");
    EXPECT_EQ(MessageUtf8("<a>\r\r\r", "]]>"), u"[Bad data terminator, Line 1, Offset 6]<a> [[*]]]]>")
        << "only LF counts as a line";
    // The excerpt starts inside a run, and may be nothing but one.
    EXPECT_EQ(MessageUtf8("<a>" + Text(58, ' ') + "x ", "]]>"),
              u"[Bad data terminator, Line 1, Offset 63]... x [[*]]]]>");
    EXPECT_EQ(MessageUtf8("<a>" + Text(70, '\n'), "]]>"), u"[Bad data terminator, Line 71, Offset 73]... [[*]]]]>");
}

TEST(XmlMessage, ShowsTheTailUpToOneHundredAndTwentyCharacters) {
    const std::u16string head = u"[Invalid tag, Line 1, Offset 0][[*]]";
    const std::size_t room = 120 - head.size();
    for (std::size_t n : {room - 1, room, room + 1, room + 100}) {
        const std::u16string tail = ToUtf16(Text(n, 'x'));
        EXPECT_EQ(MessageUtf8("", Text(n, 'x')), head + tail.substr(0, room) + (n > room ? u"..." : u"")) << n;
    }
    // A pair at the limit is whole.
    const std::string face = "\xF0\x9F\x98\x80";
    EXPECT_EQ(MessageUtf8("", Text(room - 1, 'x') + face), head + ToUtf16(Text(room - 1, 'x')) + u"\xD87D\xDE00");
    EXPECT_EQ(OpenUtf16(ToUtf16(Text(room - 1, 'x') + face + "y")).message,
              head + ToUtf16(Text(room - 1, 'x')) + u"\xD83D\xDE00...");
}

TEST(XmlMessage, IsNeverCutInHeaderAndExcerpt) {
    // The longest that a text of a million lines can give: 62 + 3 + 60 + 5 + 3.
    const std::string before = Text(1000000, '\n') + "<!--" + Text(55, 'x') + "-->";
    const std::u16string message = MessageUtf8(before, "<?xml encoding='x'?>");
    EXPECT_EQ(message, ToUtf16("[Unsupported encoding specified, Line 1000001, Offset 1000062]..." +
                               before.substr(before.size() - 60) + "[[*]]..."));
    EXPECT_EQ(message.size(), 133u);
}

TEST(XmlMessage, LeavesOutWhatIsNoCharacter) {
    const std::string e = "\xC3\xA9"; // two bytes
    std::string before = "<a>";
    std::u16string shown;
    for (int i = 0; i < 40; ++i) before += e;
    EXPECT_EQ(MessageUtf8(before, "]]>").substr(40), u"..." + std::u16string(30, u'\xE9') + u"[[*]]]]>");
    // One byte on, the excerpt starts with the second half of a character.
    EXPECT_EQ(MessageUtf8(before + "x", "]]>").substr(40), u"..." + std::u16string(29, u'\xE9') + u"x[[*]]]]>");
    // The error cuts a character in two.
    EXPECT_EQ(MessageUtf8("<a>&xy" + e + "z</a>", ""), u"[Illegal character, Line 1, Offset 7]<a>&xy[[*]]z</a>");
    EXPECT_EQ(OpenUtf16(u"<a>&xy\xD83D\xDE00z</a>").message, u"[Illegal character, Line 1, Offset 7]<a>&xy[[*]]z</a>");
    EXPECT_EQ(MessageUtf8("x\xC0\x80y\xED\xA0\x80z\xF4\x90\x80\x80.", ""), u"[Invalid tag, Line 1, Offset 0][[*]]xyz.");
    EXPECT_EQ(OpenUtf16(u"x\xD83Dy\xDE00z").message, u"[Invalid tag, Line 1, Offset 0][[*]]xyz");
    std::u16string pairs = u"<a>";
    for (int i = 0; i < 40; ++i) pairs += u"\xD83D\xDE00";
    const std::u16string message = OpenUtf16(pairs + u"x]]>").message;
    EXPECT_EQ(message.substr(40, 4), u"...\xD83D") << "the second half before it is left out";
}

// --- log -----------------------------------------------------------------------------------------------------------

namespace {

struct LogLine {
    int level;
    std::u16string category, format, text;
    std::string source;
};
std::vector<LogLine> g_log;

void KeepLine(_acfDebugLevel level, const wchar_t* category, const char* source, long32, const wchar_t* format,
              std::va_list arguments) {
    g_log.push_back({level, Units(category), Units(format), Units(va_arg(arguments, const wchar_t*)), source});
}

struct Logger {
    Logger() {
        g_log.clear();
        Develop::SetExternalLogger(KeepLine);
    }
    ~Logger() { Develop::SetExternalLogger(nullptr); }
};

} // namespace

TEST(XmlMessage, ParseErrorsAreLoggedAndNoOthers) {
    const Logger logger;
    const Reading reading = OpenUtf8("<a>]]></a>");
    ASSERT_EQ(g_log.size(), 1u);
    EXPECT_EQ(g_log[0].level, 2);
    EXPECT_EQ(g_log[0].category, u"TAVO");
    EXPECT_EQ(g_log[0].source, "source/TAVO/xmldoc");
    EXPECT_EQ(g_log[0].format, u"XML parsing error %ls");
    EXPECT_EQ(g_log[0].text, reading.message);
    EXPECT_EQ(g_log[0].text, u"[Bad data terminator, Line 1, Offset 3]<a>[[*]]]]></a>");
    g_log.clear();
    OpenUtf16(u"<a>\xDC00");
    EXPECT_EQ(g_log.size(), 1u);
    g_log.clear();
    OpenUtf8("<a/>");
    OpenUtf8("<a>\x80");
    OpenRaw("<a>");
    CXMLDoc document;
    document.OpenDocFile(L"missing/file", XMLEncodingAutomatic);
    EXPECT_TRUE(g_log.empty());
}

// --- the object ----------------------------------------------------------------------------------------------------

TEST(XmlDocumentObject, TellsItsState) {
    CXMLDoc document;
    EXPECT_EQ(ReadingOf(document), (Reading{0, 0, "", kNoFile}));
    EXPECT_FALSE(document.OpenDocText(L"<a>"));
    EXPECT_EQ(ReadingOf(document), (Reading{1, 3, "", u"[End of file, Line 1, Offset 3]<a>[[*]]"}));
    EXPECT_EQ(document.GetErrorInfo(nullptr, nullptr), 1u);
    document.Close();
    EXPECT_EQ(ReadingOf(document), (Reading{128, 0, "", u""}));
    document.Close();
    EXPECT_TRUE(document.OpenDocText(L"<a/>"));
    EXPECT_EQ(ReadingOf(document), (Reading{128, 0, "a", u""}));
    EXPECT_FALSE(document.OpenDocText(L"<"));
    EXPECT_EQ(ReadingOf(document).outline, "") << "the tree of an earlier text goes";
    EXPECT_TRUE(document.OpenDocText(L"<!-- -->"));
    EXPECT_EQ(ReadingOf(document), (Reading{128, 0, "", u""})) << "no root is no error";
}

TEST(XmlDocumentObject, CopiesShareTreeAndError) {
    CXMLDoc document;
    ASSERT_TRUE(document.OpenDocText(L"<a b='c'><d/></a>"));
    CPXMLObject root = document.GetRootElement();
    CXMLDoc copy(document);
    document.Close();
    EXPECT_EQ(ReadingOf(copy).outline, "a b='c'(d)");
    EXPECT_EQ(copy.GetRootElement().key(), root.key());
    EXPECT_FALSE(document.OpenDocText(L"<a>"));
    const Reading failed = ReadingOf(document);
    copy = document;
    document.Close();
    EXPECT_EQ(ReadingOf(copy), failed);
    EXPECT_EQ(Outline(Plain(root)), "a b='c'(d)") << "a copy of the root outlives the documents";
    CXMLDoc& self = copy;
    copy = self;
    EXPECT_EQ(ReadingOf(copy), failed);
}

TEST(XmlDocumentObject, RootBelongsToTheCaller) {
    CXMLDoc document;
    ASSERT_TRUE(document.OpenDocText(L"<a/>"));
    document.GetRootElement().Add(L"x");
    EXPECT_EQ(ReadingOf(document).outline, "a:x");
    document.GetRootElement().free();
    EXPECT_EQ(ReadingOf(document), (Reading{128, 0, "", u""}));
}

// Elements that hold children, data or nothing are told apart by what can be added to them.
TEST(XmlDocumentObject, ElementsHaveTheKindOfTheirContent) {
    CXMLDoc document;
    ASSERT_TRUE(document.OpenDocText(L"<a><none/><section><![CDATA[]]></section><text>x</text><deep><b/></deep></a>"));
    std::size_t count = 0;
    CPXMLObject* elements = document.GetRootElement().GetElements(count);
    ASSERT_EQ(count, 4u);
    EXPECT_TRUE(elements[0].IsNamedDefault());
    EXPECT_TRUE(elements[1].IsNamedDefault()) << "an empty section is no data";
    CPXMLObject child;
    child.SetName(L"c");
    EXPECT_FALSE(elements[2].Insert(child, 0)) << "refused beside data";
    EXPECT_TRUE(elements[3].Insert(child, 0));
    EXPECT_EQ(ReadingOf(document).outline, "a(none,section,text:x,deep(c,b))");
}
