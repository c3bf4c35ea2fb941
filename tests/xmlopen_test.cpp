// Documents: files, encodings told from the bytes, the error's message and its log line, the object itself.

#include "support/log.h"
#include "support/scratch.h"
#include "support/xmltexts.h"

#include <TAVO/develop.h>

using namespace support;
using namespace TAVO;
using namespace TAVO::XML;
using namespace std::string_literals;

namespace {

const Reading kNone{0, 0, "", u"Bad file or bad encoding"};

} // namespace

TEST(XmlOpening, BytesTellTheirEncoding) {
    const struct {
        unsigned code;
        std::size_t offset;
        std::vector<std::string> texts;
    } rows[] = {
        {0, 0, {"", "<a>", "\xFF\xFE\0\0<\0a\0/\0>\0"s, "\0a\0<"s, "\0\0\0<"s}},
        {1, 2, {"\r\0\r\0"s, "\n\0\n\0"s}},
        {1, 4, {"\xEF\xBB\xBF ", "<a>x\0</a>"s}},
        {4, 1, {"<\0\0\0a\0\0\0"s}},
        {4, 2, {"\xFF\xFE<\0"s, "\xFE\xFF\0<"s, "\t\0<\0"s}},
        {5, 0, {"a<b/>", "a\0<\0"s}},
        {5, 1, {" \0a\0"s, "\0 \0a"s, "\0\t\0a"s, "\0\r\0a"s, "\0\n\0a"s}},
        {13, 0, {"\xEF\xBB<a"}},
        {128,
         0,
         {"<a/>", "<\0a\0/\0>\0"s, "\0<\0a\0/\0>"s, "<\0a\0/\0>\0x"s, "<a/>\0junk\xFF"s, "<\0a\0/\0>\0\0\0x\0"s}},
    };
    for (const auto& row : rows)
        for (const std::string& bytes : row.texts) {
            const Reading reading = OpenRaw(bytes);
            const std::u16string message = row.code ? reading.message : kNone.message;
            EXPECT_EQ(reading, (Reading{row.code, row.offset, row.code == 128 ? "a" : "", message})) << bytes;
            std::string shifted = " " + bytes; // at an odd address
            EXPECT_EQ(OpenText(static_cast<void*>(shifted.data() + 1), 0ull + bytes.size()), reading) << bytes;
        }
}

TEST(XmlOpening, SizeMayLieAnywhereBehindTheZero) {
    for (std::string text : {"<a/>\0\0"s, "<\0a\0/\0>\0\0\0"s, "\0<\0a\0/\0>\0\0"s})
        for (const unsigned long long size : {~0ull >> 1, (~0ull >> 1) + 1, ~2ull, ~1ull, ~0ull})
            EXPECT_EQ(OpenText(static_cast<void*>(text.data()), size).outline, "a") << size;
}

TEST(XmlOpening, WhatCannotBeReadGivesCodeZero) {
    ScratchFolder folder;
    CXMLDoc document;
    const auto check = [&](bool opened) {
        EXPECT_FALSE(opened);
        EXPECT_EQ(ReadingOf(document), kNone);
        EXPECT_TRUE(document.OpenDocText(L"<a/>"));
    };
    check(document.OpenDocText(static_cast<void*>(nullptr), 100));
    check(document.OpenDocText(static_cast<const unsigned char*>(nullptr)));
    check(document.OpenDocFile(L"", XMLEncodingAutomatic));
    check(document.OpenDocFile(folder / L"missing", XMLEncodingAutomatic));
    check(document.OpenDocFile(folder.Path(), XMLEncodingAutomatic));
    // More than any text may have is refused at once.
    const WideText path = folder / L"large";
    {
        Files::OS::CFile file;
        ASSERT_TRUE(file.Open(path, Files::OS::FileAccessWrite, Files::OS::OpenFileCreate));
        if (!file.SetPointer(4294967296) || !file.SetEOF()) GTEST_SKIP() << "no room for the file";
    }
    const auto start = Develop::_now_milli();
    check(document.OpenDocFile(path, XMLEncodingAutomatic));
    EXPECT_LT(Develop::_now_milli() - start, 2000u);
}

TEST(XmlFile, EncodingArguments) {
    ScratchFolder folder;
    const WideText path = folder / L"document.xml";
    const struct {
        std::string bytes;
        unsigned codes[4]; // by encoding 0 to 3
    } rows[] = {
        {"<a/>", {128, 128, 128, 0}},
        {BytesOf(u"\xFEFF<a/>"), {128, 128, 128, 128}},
        {BytesOf(u"\xFEFF<a/>", true), {128, 128, 128, 0}},
        {BytesOf(u"\xFEFF<?xml encoding='UTF-8'?><a/>"), {12, 12, 12, 12}},
        {"<a>", {1, 1, 1, 0}}, // three bytes, refused in memory
        {BytesOf(u"\xFEFF"), {0, 0, 0, 0}},
        {BytesOf(u"\xFEFF<a/>") + "x", {128, 128, 128, 128}},
        {BytesOf(std::u16string(u"\xFEFF<a/>\0x", 7)), {128, 128, 128, 128}},
    };
    for (const auto& row : rows) {
        Put(path, row.bytes);
        for (unsigned encoding = 0; encoding < 6; ++encoding) {
            CXMLDoc document;
            const bool opened = document.OpenDocFile(path, static_cast<eXMLEncoding>(encoding));
            EXPECT_EQ(ReadingOf(document).code, encoding < 4 ? row.codes[encoding] : 0) << row.bytes << encoding;
            EXPECT_EQ(ReadingOf(document).outline, opened ? "a" : "") << row.bytes;
        }
    }
}

// The second reader makes messages, too; these are written out.
TEST(XmlMessage, ShowsWhatIsAroundTheError) {
    const std::string many(57, 'x'), lines(1000000, '\n'), tail(83, 'x');
    const std::pair<std::string, std::string> rows[] = {
        {"<a>" + many + "]]>", "[Bad data terminator, Line 1, Offset 60]<a>" + many + "[[*]]]]>"},
        {"<a>x" + many + "]]>", "[Bad data terminator, Line 1, Offset 61]...a>x" + many + "[[*]]]]>"},
        {lines + "<!--" + many + "--><?xml encoding='x'?>",
         "[Unsupported encoding specified, Line 1000001, Offset 1000064]..." + many + "-->[[*]]..."},
        {"x\xC0\x80y\xED\xA0\x80z\xF4\x90\x80\x80.", "[Invalid tag, Line 1, Offset 0][[*]]xyz."},
        {tail + "x", "[Invalid tag, Line 1, Offset 0][[*]]" + tail + "x"}, // 120 units
        {tail + "xx", "[Invalid tag, Line 1, Offset 0][[*]]" + tail + "x..."},
    };
    for (const auto& [text, message] : rows) EXPECT_EQ(OpenUtf8(text).message, ToUtf16(message));
    const std::u16string message = OpenUtf8(tail + "\xF0\x9F\x98\x80y").message;
    EXPECT_EQ(message.substr(119), u"\xD87D\xDE00...") << "a pair at the limit is whole";
}

TEST(XmlMessage, ParseErrorsAreLoggedAndNoOthers) {
    const Log log;
    OpenUtf8("<a>]]></a>");
    OpenUtf16(u"<a>\xDC00");
    for (const char* text : {"<a/>", "<a>\x80"}) OpenUtf8(text);
    OpenRaw("<a>");
    const std::string start = "2 TAVO source/TAVO/xmldoc:0 XML parsing error %ls|";
    EXPECT_EQ(log.Take(), (Texts{start + "[Bad data terminator, Line 1, Offset 3]<a>[[*]]]]></a>",
                                 start + "[Illegal character, Line 1, Offset 3]<a>[[*]]"}));
}

TEST(XmlDocumentObject, TellsItsState) {
    CXMLDoc document;
    EXPECT_FALSE(document.OpenDocText(L"<a>"));
    EXPECT_EQ(ReadingOf(document), (Reading{1, 3, "", u"[End of file, Line 1, Offset 3]<a>[[*]]"}));
    for (int i = 0; i < 2; ++i) {
        document.Close();
        EXPECT_EQ(ReadingOf(document), Reading());
    }
    EXPECT_TRUE(document.OpenDocText(L"<a/>") && document.GetRootElement().Add(L"x"));
    EXPECT_EQ(ReadingOf(document), (Reading{128, 0, "a:x", u""})) << "the root belongs to the caller";
    document.GetRootElement().free();
    EXPECT_EQ(ReadingOf(document), Reading());
    EXPECT_TRUE(document.OpenDocText(L"<a/>") && !document.OpenDocText(L"<"));
    EXPECT_EQ(ReadingOf(document).outline, "") << "the tree of an earlier text goes";
    EXPECT_TRUE(document.OpenDocText(L"<!-- -->"));
    EXPECT_EQ(ReadingOf(document), Reading()) << "no root is no error";
}

TEST(XmlDocumentObject, CopiesShareTreeAndError) {
    CXMLDoc document;
    ASSERT_TRUE(document.OpenDocText(L"<a b='c'><d><![CDATA[]]></d></a>"));
    CPXMLObject root = document.GetRootElement();
    EXPECT_TRUE(root.item(0).IsNamedDefault()) << "an empty section is no data";
    CXMLDoc copy(document);
    EXPECT_FALSE(document.OpenDocText(L"<a>"));
    EXPECT_EQ(copy.GetRootElement().key(), root.key());
    const Reading failed = ReadingOf(document);
    copy = document;
    document.Close();
    copy = static_cast<CXMLDoc&>(copy);
    EXPECT_EQ(ReadingOf(copy), failed);
    EXPECT_EQ(Outline(Plain(root)), "a b='c'(d)") << "a copy of the root outlives the documents";
}
