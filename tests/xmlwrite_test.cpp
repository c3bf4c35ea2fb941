// Output of element trees as a host sees it: text, encodings, files.

#include "support/heapwatch.h"
#include "support/scratch.h"

#include <TAVO/xml.h>

using namespace TAVO::XML;
using support::ScratchFolder;
using support::WideText;
using TAVO::Buffers::CPPlainMemory;

namespace {

constexpr char kUtf8Declaration[] = "<?xml version=\"1.0\" encoding=\"UTF-8\"?>";

CPXMLObject Named(const wchar_t* name) {
    CPXMLObject element;
    EXPECT_TRUE(element.SetName(name));
    return element;
}

CPXMLObject WithData(const wchar_t* data) {
    CPXMLObject element = Named(L"e");
    EXPECT_TRUE(element.Add(data));
    return element;
}

std::string Bytes(const CPPlainMemory& memory) {
    return memory.GetSize() ? std::string(static_cast<const char*>(static_cast<void*>(memory)), memory.GetSize()) : "";
}

// The text behind the declaration and before the final zero; "failed" when there is none.
std::string Utf8(const CPXMLObject& element, bool pretty = false) {
    CPPlainMemory out;
    if (!element.Write(out, XMLEncodingUTF8, pretty)) return out.GetSize() ? "failed, and left bytes" : "failed";
    const std::string text = Bytes(out);
    EXPECT_EQ(text.substr(0, sizeof(kUtf8Declaration) - 1), kUtf8Declaration);
    EXPECT_EQ(text.back(), 0);
    return text.substr(sizeof(kUtf8Declaration) - 1, text.size() - sizeof(kUtf8Declaration));
}

std::string InUnits(const std::string& ascii) {
    std::string bytes;
    for (char c : ascii) bytes += {c, 0};
    return bytes;
}

std::string Contents(const wchar_t* path) {
    TAVO::Files::OS::CFile file;
    if (!file.Open(path, TAVO::Files::OS::FileAccessRead, TAVO::Files::OS::OpenFileExisting)) return "no file";
    std::string bytes(file.GetSize(), 0);
    TAVO::ulong32 done = 0;
    EXPECT_TRUE(file.Read(bytes.data(), static_cast<TAVO::ulong32>(bytes.size()), &done));
    EXPECT_EQ(done, bytes.size());
    return bytes;
}

// Elements, data, attributes, two levels.
CPXMLObject Sample() {
    CPXMLObject root = Named(L"root"), inner = Named(L"inner");
    EXPECT_TRUE(root.AddAttribute(L"a", L"1") && inner.AddTag(L"leaf") && inner.AddTag(L"data", L"text") &&
                root.Add(inner));
    return root;
}

} // namespace

TEST(XmlWrite, PlainAndPretty) {
    EXPECT_EQ(Utf8(Sample()), "<root a=\"1\"><inner><leaf/><data>text</data></inner></root>");
    EXPECT_EQ(Utf8(Sample(), true), "\r\n<root a=\"1\">\r\n  <inner>\r\n    <leaf/>\r\n    <data>text</data>\r\n"
                                    "  </inner>\r\n</root>\r\n");
}

TEST(XmlWrite, ValuesAreEscapedAndDataGoesIntoSections) {
    const struct {
        const wchar_t* text;
        const char *value, *data;
    } kRows[] = {
        {L"plain", "plain", "plain"},
        {L"&<>\"'", "&amp;&lt;&gt;&quot;&apos;", "<![CDATA[&<>\"']]>"},
        {L"a&b", "a&amp;b", "<![CDATA[a&b]]>"},
        {L"12345678'", "12345678&apos;", "<![CDATA[12345678']]>"},
        {L"123456789012345>", "123456789012345&gt;", "<![CDATA[123456789012345>]]>"},
        {L"]]>", "]]&gt;", "<![CDATA[]]]]><![CDATA[>]]>"},
        {L"x]]>y", "x]]&gt;y", "<![CDATA[x]]]]><![CDATA[>y]]>"},
        {L"]]]>]]>]>", "]]]&gt;]]&gt;]&gt;", "<![CDATA[]]]]]><![CDATA[>]]]]><![CDATA[>]>]]>"},
        {L"]]", "]]", "]]"},
        {L" a\r\n\tb ", " a\r\n\tb ", " a\r\n\tb "},
        {L"$%#;=:?", "$%#;=:?", "$%#;=:?"},
        {L"\xE9\x4E00\x126\x13C\x2C3E", "\xC3\xA9\xE4\xB8\x80\xC4\xA6\xC4\xBC\xE2\xB0\xBE",
         "\xC3\xA9\xE4\xB8\x80\xC4\xA6\xC4\xBC\xE2\xB0\xBE"},
    };
    for (std::size_t i = 0; i < std::size(kRows); ++i) {
        CPXMLObject element = Named(L"e");
        ASSERT_TRUE(element.AddAttribute(L"a", kRows[i].text));
        EXPECT_EQ(Utf8(element), std::string("<e a=\"") + kRows[i].value + "\"/>") << i;
        EXPECT_EQ(Utf8(WithData(kRows[i].text)), std::string("<e>") + kRows[i].data + "</e>") << i;
    }
}

TEST(XmlWrite, SurrogatesAreNotCombinedIntended) {
    const struct {
        const wchar_t* text;
        const char* written;
    } kRows[] = {{L"\xD83D\xDE00", "\x01"},
                 {L"a\xD840\xDC00z", "a\x01z"},
                 {L"\xD87D\xDE00", "\x01"},
                 {L"\xD83D\xFFFF", "\x01"},
                 {L"\xD83D\xDBFFz", "\x01z"}};
    for (const auto& row : kRows) EXPECT_EQ(Utf8(WithData(row.text)), std::string("<e>") + row.written + "</e>");
    EXPECT_EQ(Utf8(WithData(L"a\xD800\xDC00")), std::string("<e>a\0</e>", 9)) << "low ten bits zero in both";

    CPPlainMemory out;
    EXPECT_TRUE(WithData(L"\xD83D\xDE00").Write(out, XMLEncodingUTF16, false));
    EXPECT_NE(Bytes(out).find(InUnits("<e>\x01</e>")), std::string::npos);
    EXPECT_TRUE(WithData(L"\xD83D\xDE00").Write(out, XMLEncodingUTF16Raw, false));
    EXPECT_NE(Bytes(out).find("\x3D\xD8\x00\xDE"[0] + std::string("\xD8\x00\xDE", 3)), std::string::npos);

    CPXMLObject beyond = Named(L"e"); // U+100000 came as UTF-8
    ASSERT_TRUE(beyond.Add(TAVO::String::CPPoolString(reinterpret_cast<const unsigned char*>("\xF4\x80\x80\x80"))));
    EXPECT_EQ(Utf8(beyond), "failed");
    EXPECT_FALSE(beyond.Write(out, XMLEncodingUTF16, false));
    EXPECT_TRUE(beyond.Write(out, XMLEncodingUTF16Raw, false)) << "units are not looked at";
}

TEST(XmlWrite, Encodings) {
    const std::string expected = InUnits("<?xml version=\"1.0\" encoding=\"UTF-16\"?>"
                                         "<root a=\"1\"><inner><leaf/><data>text</data></inner></root>") +
                                 std::string(2, 0);
    CPPlainMemory out;
    for (auto encoding : {XMLEncodingUTF16, XMLEncodingUTF16Raw}) {
        EXPECT_TRUE(Sample().Write(out, encoding, false));
        EXPECT_EQ(Bytes(out), expected);
    }
    EXPECT_TRUE(Sample().Write(out, XMLEncodingAutomatic, false));
    EXPECT_EQ(Bytes(out).substr(0, 38), kUtf8Declaration);
    EXPECT_FALSE(Sample().Write(out, static_cast<eXMLEncoding>(4), false));
    EXPECT_EQ(out.GetSize(), 0u);
}

TEST(XmlWrite, UnwritableTreesIntended) {
    EXPECT_EQ(Utf8(CPXMLObject()), "failed");
    CPXMLObject mixed = WithData(L"text");
    EXPECT_TRUE(mixed.AddTag(L"c"));
    EXPECT_EQ(Utf8(mixed), "failed");
    CPXMLObject above = Named(L"above");
    EXPECT_TRUE(above.Add(mixed));
    EXPECT_EQ(Utf8(above), "failed");
    CPXMLObject emptied = Named(L"e");
    EXPECT_TRUE(emptied.AddTag(L"c") && emptied.Delete(0));
    EXPECT_EQ(Utf8(emptied, true), "\r\n<e>\r\n</e>\r\n");
}

TEST(XmlWrite, IndentationOfAnyDepth) {
    for (int depth : {30, 31, 32, 33, 34, 63, 64, 65, 66, 97, 130}) {
        CPXMLObject element = Named(L"d");
        std::string expected;
        for (int level = 0; level <= depth; ++level)
            expected += "\r\n" + std::string(level * 2u, ' ') + (level < depth ? "<d>" : "<d/>");
        for (int level = depth; level-- > 0;) {
            expected += "\r\n" + std::string(level * 2u, ' ') + "</d>";
            CPXMLObject above = Named(L"d");
            EXPECT_TRUE(above.Add(element));
            element = above;
        }
        EXPECT_EQ(Utf8(element, true), expected + "\r\n");
    }
}

TEST(XmlWrite, FilesAreReplacedOrDeleted) {
    ScratchFolder folder;
    const WideText path = folder / L"tree.xml";
    CPXMLObject mixed = WithData(L"text");
    EXPECT_TRUE(mixed.AddTag(L"c"));

    support::Put(path, std::string(100, 'x'));
    EXPECT_TRUE(Sample().Write(path, XMLEncodingAutomatic, true));
    EXPECT_EQ(Contents(path), kUtf8Declaration + Utf8(Sample(), true)) << "without the zero";
    EXPECT_TRUE(Sample().Write(path, XMLEncodingUTF16, false));
    EXPECT_EQ(Contents(path).size(), 2u * 97u);

    EXPECT_FALSE(mixed.Write(path, XMLEncodingUTF8, false));
    EXPECT_EQ(Contents(path), "no file");
    support::Put(path, "x");
    EXPECT_FALSE(Sample().Write(path, static_cast<eXMLEncoding>(4), false));
    EXPECT_EQ(Contents(path), "no file") << "what stood there is lost";
    EXPECT_FALSE(Sample().Write(static_cast<const wchar_t*>(nullptr), XMLEncodingUTF8, false));
    EXPECT_FALSE(Sample().Write(folder.Path(), XMLEncodingUTF8, false));

    CPXMLObject large = Named(L"large"); // several buffers
    for (int i = 0; i < 5000; ++i) ASSERT_TRUE(large.AddTag(L"child", L"text"));
    EXPECT_TRUE(large.Write(path, XMLEncodingUTF8, false));
    EXPECT_TRUE(Contents(path) == kUtf8Declaration + Utf8(large));
}

TEST(XmlWrite, FailingAllocationsLeaveNothing) {
    CPXMLObject large = Named(L"large");
    for (int i = 0; i < 10000; ++i) ASSERT_TRUE(large.AddTag(L"child", L"text"));
    ScratchFolder folder;
    const WideText path = folder / L"tree.xml";
    const std::string expected = Utf8(large);
    support::ForEachFailingAllocation([&] {
        CPPlainMemory out;
        const bool written = large.Write(out, XMLEncodingUTF8, false);
        ASSERT_EQ(out.GetSize(), written ? expected.size() + sizeof(kUtf8Declaration) : 0);
    });
    support::ForEachFailingAllocation([&] {
        const bool written = large.Write(path, XMLEncodingUTF8, false);
        ASSERT_EQ(TAVO::Files::OS::_TestFileExists(path), written);
    });
    EXPECT_TRUE(Contents(path) == kUtf8Declaration + expected);
}
