// Output of element trees as a host sees it: text, encodings, files.

#include "support/heapwatch.h"
#include "support/scratch.h"

#include <TAVO/xml.h>

using namespace TAVO::XML;
using TAVO::Buffers::CPPlainMemory;

namespace {

const std::string kDeclaration = "<?xml version=\"1.0\" encoding=\"UTF-8\"?>";

CPXMLObject WithData(const wchar_t* data) {
    CPXMLObject element;
    EXPECT_TRUE(element.SetName(L"e") && element.Add(data));
    return element;
}

// The UTF-8 without the final zero; "failed" when there is none.
std::string Written(const CPXMLObject& element) {
    CPPlainMemory out;
    if (!element.Write(out, XMLEncodingUTF8, false)) return out.GetSize() ? "failed, and left bytes" : "failed";
    const std::string text(static_cast<const char*>(static_cast<void*>(out)), out.GetSize());
    EXPECT_EQ(text.back(), 0);
    return text.substr(0, text.size() - 1);
}

} // namespace

// Intended: xml-pair-written
TEST(XmlWrite, SurrogatesAreNotCombinedIntended) {
    for (const wchar_t* pair : {L"\xD83D\xDE00", L"\xD87D\xDE00", L"\xD83D\xFFFF", L"\xD83D\xDBFF"})
        EXPECT_EQ(Written(WithData(pair)), kDeclaration + "<e>\x01</e>");
    EXPECT_EQ(Written(WithData(L"a\xD800\xDC00")), kDeclaration + std::string("<e>a\0</e>", 9)) << "low ten bits zero";
    CPXMLObject beyond = WithData(L""); // U+100000 came as UTF-8
    ASSERT_TRUE(beyond.Add(TAVO::String::CPPoolString(reinterpret_cast<const unsigned char*>("\xF4\x80\x80\x80"))));
    EXPECT_EQ(Written(beyond), "failed");
    CPPlainMemory out;
    EXPECT_FALSE(beyond.Write(out, XMLEncodingUTF16, false));
    EXPECT_TRUE(beyond.Write(out, XMLEncodingUTF16Raw, false)) << "units are not looked at";
}

TEST(XmlWrite, FilesAreReplacedOrDeleted) {
    support::ScratchFolder folder;
    const support::WideText path = folder / L"tree.xml";
    CPXMLObject root = WithData(L"x"), mixed = WithData(L"text");
    ASSERT_TRUE(root.SetTag(L"d", L"text") && mixed.AddTag(L"c"));

    support::Put(path, std::string(100, 'x'));
    EXPECT_TRUE(root.Write(path, XMLEncodingAutomatic, true));
    EXPECT_EQ(support::Get(path), kDeclaration + "\r\n<e>\r\n  <d>text</d>\r\n</e>\r\n") << "without the zero";
    EXPECT_TRUE(root.Write(path, XMLEncodingUTF16, false));
    EXPECT_EQ(support::Get(path).substr(78, 8), std::string("<\0e\0>\0<\0", 8)) << "no mark";

    // Intended: xml-write-replaces
    EXPECT_FALSE(mixed.Write(path, XMLEncodingUTF8, false));
    EXPECT_EQ(support::Get(path), "(no file)");
    support::Put(path, "x");
    EXPECT_FALSE(root.Write(path, static_cast<eXMLEncoding>(4), false));
    EXPECT_EQ(support::Get(path), "(no file)") << "what stood there is lost";
    EXPECT_FALSE(root.Write(static_cast<const wchar_t*>(nullptr), XMLEncodingUTF8, false));
    EXPECT_FALSE(root.Write(folder.Path(), XMLEncodingUTF8, false));
}

TEST(XmlWrite, FailingAllocationsLeaveNothing) {
    CPXMLObject large = WithData(L"");
    for (int i = 0; i < 10000; ++i) ASSERT_TRUE(large.AddTag(L"child", L"text"));
    support::ScratchFolder folder;
    const support::WideText path = folder / L"tree.xml";
    const std::string expected = Written(large);
    support::ForEachFailingAllocation([&] {
        CPPlainMemory out;
        const bool written = large.Write(out, XMLEncodingUTF8, false);
        ASSERT_EQ(out.GetSize(), written ? expected.size() + 1 : 0);
    });
    support::ForEachFailingAllocation([&] {
        const bool written = large.Write(path, XMLEncodingUTF8, false);
        ASSERT_EQ(TAVO::Files::OS::_TestFileExists(path), written);
    });
    EXPECT_TRUE(support::Get(path) == expected);
}
