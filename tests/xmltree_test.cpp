// The element tree: names, attributes, children, data, searches; and its output as a host sees it: text, encodings,
// files.

#include "support/heapwatch.h"
#include "support/log.h"
#include "support/scratch.h"

#include <TAVO/xml.h>

using namespace TAVO::XML;
using TAVO::Buffers::CPPlainMemory, TAVO::Buffers::NotFound, TAVO::String::CPPoolString;

namespace {

const wchar_t* const kNoText = nullptr;

CPXMLObject Named(const wchar_t* name) {
    CPXMLObject element;
    EXPECT_TRUE(element.SetName(name));
    return element;
}

// An element with children of these names.
CPXMLObject Parent(std::initializer_list<const wchar_t*> names) {
    CPXMLObject element = Named(L"parent");
    for (const wchar_t* name : names) EXPECT_TRUE(element.AddTag(name));
    return element;
}

std::size_t CountOf(const CPXMLObject& element) {
    std::size_t count;
    element.GetElements(count);
    return count;
}

// The names of the children, joined.
std::string Children(const CPXMLObject& element) {
    std::string names;
    for (std::size_t i = 0; i < CountOf(element); ++i) names += support::Ascii(element.item(i).GetName());
    return names;
}

bool CanBeWritten(const CPXMLObject& element) {
    TAVO::Buffers::CPPlainMemory out;
    return element.Write(out, XMLEncodingUTF8, false);
}

TEST(XmlTree, NamesAreChecked) {
    for (const wchar_t* name : {L"a", L"_", L":", L"a-b.c_d:e9", L"\xE9t\xE9", L"\x4E00\x3005", L"", L"9a", L"-a",
                                L"a b", L" a", L"<a", L"a\x2019", L"\x300", L"\xD83D\xDE00", kNoText}) {
        CPXMLObject element = Named(L"old");
        const bool good = name && std::u16string(u"a_:\xE9\x4E00").find(*name) != std::u16string::npos &&
                          name[1] != ' ' && name[1] != 0x2019;
        for (const bool taken : {element.Rename(name), element.AddAttribute(name, L"v"), element.DeleteAttribute(name),
                                 bool(element.AddTag(name)), bool(element.SetTag(name, L"v")), element.SetName(name)})
            EXPECT_EQ(taken, good);
        EXPECT_TRUE(element.IsName(good ? name : L"old"));
    }
}

// Intended: xml-replace-empty
TEST(XmlTree, NothingWorksOnAnEmptyHandleIntended) {
    CPXMLObject none;
    const CPXMLObject child = Named(L"c");
    std::size_t count = 7;
    EXPECT_FALSE(none || none.IsNamedDefault() || none.item(0) || none.GetElements(count) || count);
    EXPECT_TRUE(none.IsDefault() && none.GetName().isempty() && none.GetData().isempty());
    EXPECT_FALSE(none.IsName(L"") || none.IsData(L"") || none.IsNameData(L"", L"") || none.HasAttribute(L"a") ||
                 none.DeleteContent() || none.FindFirstElement(L"a") || CanBeWritten(none));
    EXPECT_TRUE(none.CAdd(CPXMLObject())) << "the child is looked at first";
    EXPECT_TRUE(none.Replace(child, &child).sIndex() == 0 && none.Replace(child, child).sIndex() == NotFound);
}

// Intended: xml-set-name
TEST(XmlTree, SetNameDetachesIntended) {
    CPXMLObject element = Named(L"a");
    EXPECT_TRUE(element.AddAttribute(L"x", L"1"));
    CPXMLObject other(element), third(other);
    EXPECT_TRUE(element.SetName(L"b") && element.IsNamedDefault() && other.IsName(L"a") && other.HasAttribute(L"x"));
    EXPECT_TRUE(third.Rename(L"c") && other.IsName(L"c")) << "a renamed node is renamed for all its holders";
}

TEST(XmlTree, AttributesAndDataOutsideTheModel) {
    CPXMLObject element = Named(L"e");
    CPPoolString name, value;
    EXPECT_TRUE(element.AddAttribute(L"b", L"2") && element.AddAttribute(L"a", L"4"));
    EXPECT_TRUE(element.GetAttribute(1, name, value) && name == L"a" && value == L"4");
    EXPECT_TRUE(!element.GetAttribute(2, name, value) && name.isempty() && value.isempty());
    EXPECT_TRUE(element.IsNameAttrib(L"e", L"a") && element.IsNameAttribVal(L"e", L"a", L"4"));
    EXPECT_FALSE(element.IsNameAttrib(L"f", L"a") || element.IsNameAttribVal(L"e", L"a", L"1") ||
                 element.HasAttribute(L"") || element.IsNameAttrib(L"", L"a"));
    // Texts that cannot be interned.
    EXPECT_FALSE(element.AddAttribute(L"d", L"\xDC00") || element.SetAttribute(L"a", L"\xDC00") ||
                 element.Add(L"\xDC00") || element.Set(L"\xDC00") || element.AddTag(L"b", L"\xD800"));
    EXPECT_TRUE(element.FindAttribute(L"a") == L"4" && element.FindAttribute(L"d").isempty());

    EXPECT_TRUE(element.Add(kNoText) && element.Add(L"x") && element.IsData(L"x"));
    // Intended: xml-content-empty
    EXPECT_TRUE(element.GetContent().isempty()) << "always";
    EXPECT_TRUE(element.Set(Named(L"c")) && element.Set(*element.FindFirstElement(L"c"))) << "the child itself";
    const CPXMLObject* const nothing = nullptr;
    EXPECT_FALSE(element.Replace(Named(L"d"), nothing) || element.Delete(nothing) || element.Delete(CPXMLObject()));
    EXPECT_EQ(Children(element), "c");
    EXPECT_TRUE(element.SetTag(L"t", L"y") && element.FindElementData(L"t") == L"y");
}

// Intended: xml-insert-index
TEST(XmlTree, InsertAnswersTheIndexAskedForIntended) {
    CPXMLObject parent = Parent({L"a", L"b"});
    EXPECT_EQ(parent.Insert(Named(L"c"), 99).sIndex(), 99u);
    EXPECT_FALSE(parent.Insert(Named(L"d"), NotFound)) << "reads as failure";
    EXPECT_EQ(parent.Insert(CPXMLObject(), 0).sIndex(), 0u);
    EXPECT_EQ(Children(parent), "abcd");
    EXPECT_TRUE(CountOf(parent) == 5 && !CanBeWritten(parent)) << "an empty handle is among the children";
}

// Intended: xml-kind-stays, xml-mixed-content
TEST(XmlTree, KindStaysAfterSingleDeletesIntended) {
    CPXMLObject parent = Parent({L"a"});
    EXPECT_TRUE(parent.Delete(0) && parent.DeleteElements() && CanBeWritten(parent));
    EXPECT_TRUE(parent.Add(L"text") && !CanBeWritten(parent)) << "counts as children and data";
    // Intended: xml-insert-beside-data
    EXPECT_FALSE(parent.Insert(Named(L"a"), 0)) << "refused beside data, where Add is not";
    EXPECT_TRUE(parent.Set(L"text") && CanBeWritten(parent));
}

TEST(XmlTree, FormattedText) {
    CPXMLObject element = Named(L"e");
    EXPECT_TRUE(element.printf(L"%d-%s", 7, L"x") && element.IsData(L"7-x") && !element.printf(L"%d", 8));
    EXPECT_TRUE(element.printfAttribute(L"a", L"%d", 1) && !element.printfAttribute(L"a", L"%d", 2) &&
                !element.printfAttribute(L"b", L"%s", L""));
    EXPECT_TRUE(element.SprintfAttribute(L"a", L"%d", 3) && element.FindAttribute(L"a") == L"3");
    EXPECT_TRUE(element.printfTag(L"t", L"%d", 4).sIndex() == 0 && element.printfTag(L"t", L"%d", 5).sIndex() == 1);
    EXPECT_TRUE(element.SprintfTag(L"u", L"%d", 6).sIndex() == 0 && Children(element) == "u");
    EXPECT_FALSE(element.printfTag(L"0", L"x") || element.SprintfTag(L"0", L"x"));
    for (int width : {254, 255, 256, 257, 3000})
        EXPECT_TRUE(element.Sprintf(L"%*d", width, 1) && element.GetData().len() == std::size_t(width));
}

// Intended: xml-find-prev
TEST(XmlTree, SearchesGoOnFromAResultIntended) {
    CPXMLObject parent = Parent({L"a", L"b", L"a"});
    EXPECT_TRUE(parent.item(2).Add(L"text") && parent.item(2).AddAttribute(L"k", L"v"));
    std::size_t count;
    const CPXMLObject *const slots = parent.GetElements(count), *const last = slots + 2, stranger;
    EXPECT_TRUE(parent.FindNextElementData(L"a", L"text", nullptr) == last &&
                parent.FindNextElementData(L"a", L"", nullptr) == slots &&
                parent.FindPrevElementData(L"a", L"", nullptr) == slots);
    EXPECT_TRUE(parent.FindNextElementAtt(L"a", L"k", nullptr) == last &&
                parent.FindPrevElementAtt(L"a", L"k", nullptr) == last);
    EXPECT_TRUE(parent.FindNextElementAttVal(L"a", L"k", L"v", slots + 1) == last &&
                !parent.FindPrevElementAttVal(L"a", L"k", L"v", slots));
    EXPECT_EQ(parent.FindPrevElement(L"b", slots), slots + 1) << "backwards from the one behind the start";
    for (const CPXMLObject* start : {slots + 3, slots - 1, &stranger, reinterpret_cast<const CPXMLObject*>(0x18)})
        EXPECT_FALSE(parent.FindNextElement(L"a", start) || parent.FindPrevElement(L"a", start)) << "never read";
}

TEST(XmlTree, Paths) {
    CPXMLObject root = Named(L"root"), a = Named(L"a"), second = Named(L"a");
    EXPECT_TRUE(a.AddTag(L"b") && root.Add(a) && second.AddTag(L"c") && root.Add(second));
    std::size_t count;
    const CPXMLObject *const first = root.GetElements(count), *const b = a.GetElements(count);
    const auto find = [&](const wchar_t* path) {
        CPXMLObject parent = Named(L"old");
        const CPXMLObject* found = root.FindFirstElement(path, &parent);
        EXPECT_EQ(root.FindFirstElement(path), found);
        EXPECT_EQ(parent.key(), found == first ? root.key() : found ? a.key() : 0);
        return found;
    };
    for (const wchar_t* path : {L"a", L"a/", L"a//b", L"a/b c", L"a/1"}) EXPECT_EQ(find(path), first);
    for (const wchar_t* path : {L"a/b", L" a / b ", L"\ta\r/\nb"}) EXPECT_EQ(find(path), b);
    for (const wchar_t* path : {L"/a", L"", L" ", L"a b", L"a/c", L"b", L"root", L"a/nosuchname", L"a/b/b", kNoText})
        EXPECT_EQ(find(path), nullptr);
    CPXMLObject self(root);
    EXPECT_EQ(self.FindFirstElement(L"a/b", &self), b) << "the handle itself receives the parent";
    EXPECT_EQ(self.key(), a.key());

    for (const wchar_t* list : {L"b", L"b;b"}) EXPECT_EQ(Named(L"b").GetNameIndex(list, L';'), 0u);
    for (const wchar_t* list : {L"a;bb;b", L";;b;"}) EXPECT_EQ(Named(L"b").GetNameIndex(list, L';'), 2u);
    for (const wchar_t* list : {L"bb", L"", L"a;b ", L"a;;", kNoText})
        EXPECT_EQ(Named(L"b").GetNameIndex(list, L';'), NotFound);
    EXPECT_EQ(Named(L"b").GetNameIndex(L"b", 0), 0u);
}

TEST(XmlTree, FailingAllocationsLeaveElementsUsable) {
    const CPPoolString kName = L"name", kValue = L"value";
    const CPXMLObject leaf = Named(L"leaf");
    support::ForEachFailingAllocation([&] {
        CPXMLObject element, other;
        if (!element.SetName(kName) || !other.SetName(kName)) return;
        for (std::size_t i = 0, count = 0; i < 40; ++i) {
            count += bool(element.Add(leaf));
            ASSERT_EQ(CountOf(element), count);
        }
        // Intended: xml-cadd
        ASSERT_TRUE(other.CAdd(element)) << "true, also without the memory for it";
        const bool named = element.AddAttribute(kName, kValue);
        ASSERT_TRUE(element.GetNAttributes() == named && (!named || element.SetAttribute(kName, kValue)));
        const bool merged = other.MergeAttributes(element, true);
        ASSERT_EQ(merged, other.GetNAttributes() == element.GetNAttributes());
        std::size_t count = CountOf(element);
        count += bool(element.AddTag(kName, kValue));
        ASSERT_EQ(CountOf(element), count);
        const bool set = bool(element.SetTag(kName, kValue));
        ASSERT_TRUE(CountOf(element) == set || (!set && CountOf(element) == count));
        element.Reset();
        ASSERT_TRUE(element.IsNamedDefault());
    });
}

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

// Intended: xml-pair-written
TEST(XmlWrite, SurrogatesAreNotCombinedIntended) {
    for (const wchar_t* pair : {L"\xD83D\xDE00", L"\xD87D\xDE00", L"\xD83D\xFFFF", L"\xD83D\xDBFF"})
        EXPECT_EQ(Written(WithData(pair)), kDeclaration + "<e>\x01</e>");
    EXPECT_EQ(Written(WithData(L"a\xD800\xDC00")), kDeclaration + std::string("<e>a\0</e>", 9)) << "low ten bits zero";
    for (int around : {0, 40}) { // letters
        std::string letters;
        for (int i = 0; i < around; ++i) letters += "\xD0\xAF";
        const std::string bytes = letters + "\xF4\x80\x80\x80" + letters; // U+100000 comes as UTF-8
        CPXMLObject beyond = WithData(L"");
        ASSERT_TRUE(beyond.Add(CPPoolString(reinterpret_cast<const unsigned char*>(bytes.c_str()))));
        EXPECT_EQ(Written(beyond), "failed");
        CPPlainMemory out;
        EXPECT_TRUE(!beyond.Write(out, XMLEncodingUTF16, false) && beyond.Write(out, XMLEncodingUTF16Raw, false));
    }
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
    EXPECT_FALSE(root.Write(kNoText, XMLEncodingUTF8, false));
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
        const bool filed = large.Write(path, XMLEncodingUTF8, false);
        ASSERT_EQ(TAVO::Files::OS::_TestFileExists(path), filed);
    });
    EXPECT_TRUE(support::Get(path) == expected);
}

} // namespace
