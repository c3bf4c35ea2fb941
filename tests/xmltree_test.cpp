// The element tree: names, attributes, children, data, searches.

#include "support/heapwatch.h"

#include <TAVO/xml.h>

using namespace TAVO::XML;
using TAVO::Buffers::NotFound;
using TAVO::String::CPPoolString;

namespace {

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
    for (std::size_t i = 0; i < CountOf(element); ++i) {
        const CPPoolString name = element.item(i).GetName();
        for (const wchar_t* c = name; *c; ++c) names += static_cast<char>(*c);
    }
    return names;
}

bool CanBeWritten(const CPXMLObject& element) {
    TAVO::Buffers::CPPlainMemory out;
    return element.Write(out, XMLEncodingUTF8, false);
}

} // namespace

TEST(XmlTree, NamesAreChecked) {
    for (const wchar_t* name :
         {L"a", L"_", L":", L"a-b.c_d:e9", L"\xE9t\xE9", L"\x4E00\x3005", L"", L"9a", L"-a", L"a b", L" a", L"<a",
          L"a\x2019", L"\x300", L"\xD83D\xDE00", static_cast<const wchar_t*>(nullptr)}) {
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
    EXPECT_FALSE(none.IsName(L"") || none.IsData(L"") || none.IsNameData(L"", L"") || none.HasAttribute(L"a"));
    EXPECT_FALSE(none.DeleteContent() || none.FindFirstElement(L"a") || CanBeWritten(none));
    EXPECT_TRUE(none.CAdd(CPXMLObject())) << "the child is looked at first";
    EXPECT_EQ(none.Replace(child, &child).sIndex(), 0u);
    EXPECT_EQ(none.Replace(child, child).sIndex(), NotFound);
}

// Intended: xml-set-name
TEST(XmlTree, SetNameDetachesIntended) {
    CPXMLObject element = Named(L"a");
    EXPECT_TRUE(element.AddAttribute(L"x", L"1"));
    CPXMLObject other(element);
    EXPECT_TRUE(element.SetName(L"b") && element.IsNamedDefault());
    EXPECT_TRUE(other.IsName(L"a") && other.HasAttribute(L"x"));
    CPXMLObject third(other);
    EXPECT_TRUE(third.Rename(L"c") && other.IsName(L"c")) << "a renamed node is renamed for all its holders";
}

TEST(XmlTree, AttributesAndDataOutsideTheModel) {
    CPXMLObject element = Named(L"e");
    CPPoolString name, value;
    EXPECT_TRUE(element.AddAttribute(L"b", L"2") && element.AddAttribute(L"a", L"4"));
    EXPECT_TRUE(element.GetAttribute(1, name, value) && name == L"a" && value == L"4");
    EXPECT_FALSE(element.GetAttribute(2, name, value));
    EXPECT_TRUE(name.isempty() && value.isempty());
    EXPECT_TRUE(element.IsNameAttrib(L"e", L"a") && element.IsNameAttribVal(L"e", L"a", L"4"));
    EXPECT_FALSE(element.IsNameAttrib(L"f", L"a") || element.IsNameAttribVal(L"e", L"a", L"1"));
    EXPECT_FALSE(element.HasAttribute(L"") || element.IsNameAttrib(L"", L"a"));
    // Texts that cannot be interned.
    EXPECT_FALSE(element.AddAttribute(L"d", L"\xDC00") || element.SetAttribute(L"a", L"\xDC00"));
    EXPECT_FALSE(element.Add(L"\xDC00") || element.Set(L"\xDC00") || element.AddTag(L"b", L"\xD800"));
    EXPECT_TRUE(element.FindAttribute(L"a") == L"4" && element.FindAttribute(L"d").isempty());

    EXPECT_TRUE(element.Add(static_cast<const wchar_t*>(nullptr)) && element.Add(L"x") && element.IsData(L"x"));
    // Intended: xml-content-empty
    EXPECT_TRUE(element.GetContent().isempty()) << "always";
    EXPECT_TRUE(element.Set(Named(L"c")) && element.Set(*element.FindFirstElement(L"c"))) << "the child itself";
    EXPECT_EQ(Children(element), "c");
    EXPECT_FALSE(element.Replace(Named(L"d"), static_cast<const CPXMLObject*>(nullptr)));
    EXPECT_FALSE(element.Delete(static_cast<const CPXMLObject*>(nullptr)) || element.Delete(CPXMLObject()));
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
    EXPECT_TRUE(element.printfAttribute(L"a", L"%d", 1));
    EXPECT_FALSE(element.printfAttribute(L"a", L"%d", 2) || element.printfAttribute(L"b", L"%s", L""));
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
    EXPECT_EQ(parent.FindNextElementData(L"a", L"text", nullptr), last);
    EXPECT_EQ(parent.FindNextElementData(L"a", L"", nullptr), slots);
    EXPECT_EQ(parent.FindNextElementAtt(L"a", L"k", nullptr), last);
    EXPECT_EQ(parent.FindNextElementAttVal(L"a", L"k", L"v", slots + 1), last);
    EXPECT_EQ(parent.FindPrevElementData(L"a", L"", nullptr), slots);
    EXPECT_EQ(parent.FindPrevElementAtt(L"a", L"k", nullptr), last);
    EXPECT_EQ(parent.FindPrevElementAttVal(L"a", L"k", L"v", slots), nullptr);
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
    for (const wchar_t* path : {L"/a", L"", L" ", L"a b", L"a/c", L"b", L"root", L"a/nosuchname", L"a/b/b"})
        EXPECT_EQ(find(path), nullptr);
    EXPECT_EQ(find(nullptr), nullptr);
    CPXMLObject self(root);
    EXPECT_EQ(self.FindFirstElement(L"a/b", &self), b) << "the handle itself receives the parent";
    EXPECT_EQ(self.key(), a.key());

    for (const wchar_t* list : {L"b", L"b;b"}) EXPECT_EQ(Named(L"b").GetNameIndex(list, L';'), 0u);
    for (const wchar_t* list : {L"a;bb;b", L";;b;"}) EXPECT_EQ(Named(L"b").GetNameIndex(list, L';'), 2u);
    for (const wchar_t* list : {L"bb", L"", L"a;b ", L"a;;", static_cast<const wchar_t*>(nullptr)})
        EXPECT_EQ(Named(L"b").GetNameIndex(list, L';'), NotFound);
    EXPECT_EQ(Named(L"b").GetNameIndex(L"b", 0), 0u);
}

TEST(XmlTree, FailingAllocationsLeaveElementsUsable) {
    const CPPoolString kName = L"name", kValue = L"value";
    const CPXMLObject leaf = Named(L"leaf");
    support::ForEachFailingAllocation([&] {
        CPXMLObject element, other;
        if (!element.SetName(kName) || !other.SetName(kName)) return;
        for (std::size_t i = 0, count = 0; i < 40; ++i, count = CountOf(element)) {
            const bool added = bool(element.Add(leaf));
            ASSERT_EQ(CountOf(element), count + added);
        }
        // Intended: xml-cadd
        ASSERT_TRUE(other.CAdd(element)) << "true, also without the memory for it";
        const bool named = element.AddAttribute(kName, kValue);
        ASSERT_EQ(element.GetNAttributes(), named ? 1u : 0u);
        // Setting an attribute anew takes no memory.
        ASSERT_EQ(element.HasAttribute(kName), element.HasAttribute(kName) && element.SetAttribute(kName, kValue));
        const bool merged = other.MergeAttributes(element, true);
        ASSERT_EQ(merged, other.GetNAttributes() == element.GetNAttributes());
        const std::size_t count = CountOf(element);
        const bool tagged = bool(element.AddTag(kName, kValue));
        ASSERT_EQ(CountOf(element), count + tagged);
        const bool set = bool(element.SetTag(kName, kValue));
        ASSERT_TRUE(set ? CountOf(element) == 1 : CountOf(element) == 0 || CountOf(element) == count + tagged);
        element.Reset();
        ASSERT_TRUE(element.IsNamedDefault());
    });
}
