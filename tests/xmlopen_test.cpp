// Documents: files, encodings told from the bytes, the error's message and its log line, the object itself; and their
// limits: depth, breadth, many attributes, no memory.

#include "support/heapwatch.h"
#include "support/log.h"
#include "support/machine.h"
#include "support/scratch.h"
#include "support/xmltexts.h"

using namespace support;
using namespace TAVO;
using namespace TAVO::XML;
using namespace std::string_literals;

namespace {

const Reading kNone{0, 0, "", u"Bad file or bad encoding"};

TEST(XmlOpening, BytesTellTheirEncoding) {
    using Row = std::tuple<unsigned, std::size_t, std::vector<std::string>>; // code, offset, the bytes that give them
    for (const auto& [code, offset, texts] :
         {Row{0, 0, {"", "<a>", "\xFF\xFE\0\0<\0a\0/\0>\0"s, "\0a\0<"s, "\0\0\0<"s}},
          Row{1, 2, {"\r\0\r\0"s, "\n\0\n\0"s}}, Row{1, 4, {"\xEF\xBB\xBF ", "<a>x\0</a>"s}},
          Row{4, 1, {"<\0\0\0a\0\0\0"s}}, Row{4, 2, {"\xFF\xFE<\0"s, "\xFE\xFF\0<"s, "\t\0<\0"s}},
          Row{5, 0, {"a<b/>", "a\0<\0"s}}, Row{13, 0, {"\xEF\xBB<a"}},
          Row{5, 1, {" \0a\0"s, "\0 \0a"s, "\0\t\0a"s, "\0\r\0a"s, "\0\n\0a"s}},
          Row{128,
              0,
              {"<a/>", "<\0a\0/\0>\0"s, "\0<\0a\0/\0>"s, "<\0a\0/\0>\0x"s, "<a/>\0junk\xFF"s, "<\0a\0/\0>\0\0\0x\0"s}}})
        for (const std::string& bytes : texts) {
            const Reading reading = OpenRaw(bytes);
            const std::u16string message = code ? reading.message : kNone.message;
            EXPECT_EQ(reading, (Reading{code, offset, code == 128 ? "a" : "", message})) << bytes;
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
    Files::OS::CFile file;
    ASSERT_TRUE(file.Open(path, Files::OS::FileAccessWrite, Files::OS::OpenFileCreate));
    if (!file.SetPointer(4294967296) || !file.SetEOF()) GTEST_SKIP() << "no room for the file";
    file.Close();
    const auto start = Develop::_now_milli();
    check(document.OpenDocFile(path, XMLEncodingAutomatic));
    EXPECT_LT(Develop::_now_milli() - start, 2000u);
}

TEST(XmlFile, EncodingArguments) {
    ScratchFolder folder;
    const WideText path = folder / L"document.xml";
    using Row = std::pair<std::string, std::vector<unsigned>>; // the codes by encoding 0 to 3
    for (const auto& [bytes, codes] :
         {Row{"<a/>", {128, 128, 128, 0}}, Row{BytesOf(u"\xFEFF<a/>"), {128, 128, 128, 128}},
          Row{BytesOf(u"\xFEFF<a/>", true), {128, 128, 128, 0}},
          Row{BytesOf(u"\xFEFF<?xml encoding='UTF-8'?><a/>"), {12, 12, 12, 12}},
          Row{"<a>", {1, 1, 1, 0}}, // three bytes, refused in memory
          Row{BytesOf(u"\xFEFF"), {0, 0, 0, 0}}, Row{BytesOf(u"\xFEFF<a/>") + "x", {128, 128, 128, 128}},
          Row{BytesOf(std::u16string(u"\xFEFF<a/>\0x", 7)), {128, 128, 128, 128}}}) {
        Put(path, bytes);
        for (unsigned encoding = 0; encoding < 6; ++encoding) {
            CXMLDoc document;
            const bool opened = document.OpenDocFile(path, static_cast<eXMLEncoding>(encoding));
            EXPECT_EQ(ReadingOf(document).code, encoding < 4 ? codes[encoding] : 0) << bytes << encoding;
            EXPECT_EQ(ReadingOf(document).outline, opened ? "a" : "") << bytes;
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
        {tail + "xx", "[Invalid tag, Line 1, Offset 0][[*]]" + tail + "x..."}};
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

TEST(XmlDocumentObject, TellsItsStateAndSharesItWithCopies) {
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
    const Reading failed = ReadingOf(document);
    EXPECT_EQ(failed.outline, "") << "the tree of an earlier text goes";

    CXMLDoc copy(document);
    EXPECT_TRUE(document.OpenDocText(L"<a b='c'><d><![CDATA[]]></d></a>"));
    const CPXMLObject root = document.GetRootElement();
    EXPECT_TRUE(root.item(0).IsNamedDefault()) << "an empty section is no data";
    EXPECT_EQ(ReadingOf(copy), failed);
    copy = document;
    EXPECT_EQ(copy.GetRootElement().key(), root.key());
    copy = static_cast<CXMLDoc&>(copy);
    document.Close();
    EXPECT_EQ(ReadingOf(copy).outline, "a b='c'(d)");
}

constexpr std::size_t kMillion = 1000000;

std::string Repeated(const std::string& text, std::size_t count) {
    std::string all;
    all.reserve(text.size() * count);
    for (; count; --count) all += text;
    return all;
}

bool Open(CXMLDoc& document, const std::string& text) { return document.OpenDocText(Utf8(text.c_str())); }

TEST(XmlLimits, AMillionNestedElementsOnASmallStack) {
    const std::string opening = Repeated("<a>", kMillion), nested = opening + Repeated("</a>", kMillion);
    RunOnStack(256 * 1024, [&] {
        CXMLDoc document;
        ASSERT_TRUE(Open(document, nested));
        Buffers::CPPlainMemory written;
        ASSERT_TRUE(document.GetRootElement().Write(written, XMLEncodingUTF8, false));
        EXPECT_EQ(written.GetSize(), 38 + kMillion * 7 - 3 + 1) << "the innermost is <a/>";
        unsigned long long offset = 0;
        EXPECT_FALSE(Open(document, opening));
        EXPECT_EQ(document.GetErrorInfo(&offset, nullptr), 1u);
        EXPECT_EQ(offset, opening.size());
    });
}

TEST(XmlLimits, AMillionSiblings) {
    CXMLDoc document;
    ASSERT_TRUE(Open(document, "<r>" + Repeated("<a b='1'>x</a>", kMillion) + "</r>"));
    CPXMLObject& root = document.GetRootElement();
    EXPECT_EQ(Outline(Plain(root.item(kMillion - 1))), "a b='1':x");
    EXPECT_EQ(root.AddTag(L"z").sIndex(), kMillion) << "an array built at once still grows";
}

// Nothing that a text holds may cost more than its length.
TEST(XmlLimits, LongRunsTakeLinearTime) {
    std::string attributes = "<a";
    for (int i = 0; i < 100000; ++i) attributes += " a" + std::to_string(i) + "='x'";
    using Row = std::tuple<std::string, std::string, std::string, bool>; // before, the run, behind; does it open?
    for (const auto& [before, run, behind, opens] :
         {Row{"<a>", "<![CDATA[]]>", "</a>", true}, Row{"<a>x", "<!-- -->x", "</a>", true},
          Row{"<a>", "<?b c='d'?>", "</a>", true}, Row{"<a>", "]", "</a>", true}, Row{"<a><![CDATA[", "]", "", false},
          Row{"<a><!--", "-", "", false}, Row{"<!x ", "'\"'", "><a/>", true}, Row{"<a>", " ", "</a>", true},
          Row{"<a>", "\n", "]]>", false}, Row{"<a>", "</", "", false}, Row{"<a", " b=''", "/>", true},
          Row{"<a>", "&#65536;", "</a>", true}, Row{attributes, " ", "/>", true},
          Row{attributes + " a77777='x'", " ", "/>", false}}) {
        const std::string text = before + Repeated(run, kMillion / 2) + behind;
        CXMLDoc document;
        const auto start = Develop::_now_milli();
        EXPECT_EQ(Open(document, text), opens) << run;
        EXPECT_LT(Develop::_now_milli() - start, 20000u) << run;
    }
}

// Opens the text with every allocation failing in turn, always with the same document; each with strings of its own.
template <class Function> void OpenWithoutMemory(const std::string& text, Function open) {
    const Reading expected = XmlReference::Read(text);
    CXMLDoc document;
    Sweep();
    ForEachFailingAllocation([&] {
        const bool opened = open(document);
        const auto code = document.GetErrorInfo(nullptr, nullptr);
        ASSERT_TRUE(opened == (code == 128) && (code == expected.code || code == 18 || code == 0)) << text << code;
        ASSERT_EQ(Outline(Plain(document.GetRootElement())), opened ? expected.outline : "");
        document.Close();
        Sweep();
    });
    EXPECT_EQ(open(document), expected.code == 128) << "usable afterwards";
    EXPECT_EQ(ReadingOf(document), expected);
}

TEST(XmlLimits, FailingAllocations) {
    std::string many = "<m";
    for (char c = 'a'; c <= 'z'; ++c) many.append(" ").append(1, c).append("='").append(1, c).append("'");
    ScratchFolder folder;
    const WideText path = folder / L"document.xml";
    for (const std::string& text :
         {std::string("<root a='1' b=' x &#65; ' c='1'><child>data</child><child d='1'>a &lt; b \xC3\xA9</child>"
                      "<\xC3\xA9 \xC3\xA9='\xC3\xA9'></\xC3\xA9><e><f><g/></f></e></root>"),
          many + "/>", std::string("<a b='value'><c/><d>data</d></b>"), std::string("<ab></\xC1\xA1\x62>"),
          std::string("<ab></\xC1\xA1\xC1\xA1>")}) {
        Put(path, text);
        OpenWithoutMemory(text, [&](CXMLDoc& document) { return Open(document, text); });
        OpenWithoutMemory(text, [&](CXMLDoc& document) { return document.OpenDocFile(path, XMLEncodingAutomatic); });
        if (XmlReference::Read(text).code != 128 || text.find('\xC1') != text.npos) continue;
        std::string swapped = BytesOf(std::u16string(u"\xFEFF").append(ToUtf16(text)), true);
        OpenWithoutMemory(text, [&](CXMLDoc& doc) { return doc.OpenDocText(swapped.data(), swapped.size()); });
    }
}

} // namespace
