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

TEST(XmlWrite, SurrogatesAreNotCombinedIntended) {
    for (const wchar_t* pair : {L"\xD83D\xDE00", L"\xD87D\xDE00", L"\xD83D\xFFFF", L"\xD83D\xDBFF"})
        EXPECT_EQ(Utf8(WithData(pair)), "<e>\x01</e>");
    EXPECT_EQ(Utf8(WithData(L"a\xD800\xDC00")), std::string("<e>a\0</e>", 9)) << "low ten bits zero in both";
    CPXMLObject beyond = Named(L"e"); // U+100000 came as UTF-8
    ASSERT_TRUE(beyond.Add(TAVO::String::CPPoolString(reinterpret_cast<const unsigned char*>("\xF4\x80\x80\x80"))));
    EXPECT_EQ(Utf8(beyond), "failed");
    CPPlainMemory out;
    EXPECT_FALSE(beyond.Write(out, XMLEncodingUTF16, false));
    EXPECT_TRUE(beyond.Write(out, XMLEncodingUTF16Raw, false)) << "units are not looked at";
}

TEST(XmlWrite, FilesAreReplacedOrDeleted) {
    ScratchFolder folder;
    const WideText path = folder / L"tree.xml";
    CPXMLObject mixed = WithData(L"text");
    EXPECT_TRUE(mixed.AddTag(L"c"));
    EXPECT_EQ(Utf8(mixed), "failed");
    EXPECT_EQ(Utf8(Sample(), true), "\r\n<root a=\"1\">\r\n  <inner>\r\n    <leaf/>\r\n    <data>text</data>\r\n"
                                    "  </inner>\r\n</root>\r\n");

    support::Put(path, std::string(100, 'x'));
    EXPECT_TRUE(Sample().Write(path, XMLEncodingAutomatic, true));
    EXPECT_EQ(Contents(path), kUtf8Declaration + Utf8(Sample(), true)) << "without the zero";
    EXPECT_TRUE(Sample().Write(path, XMLEncodingUTF16, false));
    EXPECT_EQ(Contents(path), InUnits("<?xml version=\"1.0\" encoding=\"UTF-16\"?>" + Utf8(Sample())));

    EXPECT_FALSE(mixed.Write(path, XMLEncodingUTF8, false));
    EXPECT_EQ(Contents(path), "no file");
    support::Put(path, "x");
    EXPECT_FALSE(Sample().Write(path, static_cast<eXMLEncoding>(4), false));
    EXPECT_EQ(Contents(path), "no file") << "what stood there is lost";
    EXPECT_FALSE(Sample().Write(static_cast<const wchar_t*>(nullptr), XMLEncodingUTF8, false));
    EXPECT_FALSE(Sample().Write(folder.Path(), XMLEncodingUTF8, false));
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
