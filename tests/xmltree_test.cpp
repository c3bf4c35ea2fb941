// The element tree: names, attributes, children, data, searches.

#include "support/heapwatch.h"
#include "support/smallstack.h"

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
    const struct {
        const wchar_t* name;
        bool good;
    } kRows[] = {{L"a", true},
                 {L"_", true},
                 {L":", true},
                 {L"a-b.c_d:e9", true},
                 {L"\xE9t\xE9", true},
                 {L"\x4E00\x3005", true},
                 {L"", false},
                 {nullptr, false},
                 {L"9a", false},
                 {L"-a", false},
                 {L"a b", false},
                 {L"a/b", false},
                 {L" a", false},
                 {L"<a", false},
                 {L"a\x2019", false},
                 {L"\x300", false},
                 {L"\xD83D\xDE00", false}};
    for (std::size_t i = 0; i < std::size(kRows); ++i) {
        const auto& [name, good] = kRows[i];
        CPXMLObject element = Named(L"old");
        EXPECT_EQ(element.Rename(name), good) << i;
        EXPECT_EQ(element.AddAttribute(name, L"v"), good) << i;
        EXPECT_EQ(element.DeleteAttribute(name), good) << i;
        EXPECT_EQ(bool(element.AddTag(name)), good) << i;
        EXPECT_EQ(bool(element.SetTag(name, L"v")), good) << i;
        EXPECT_EQ(element.SetName(name), good) << i;
        EXPECT_TRUE(element.IsName(good ? name : L"old")) << i;
    }
}

TEST(XmlTree, NothingWorksOnAnEmptyHandle) {
    CPXMLObject none, child = Named(L"c");
    CPPoolString name = L"x", value = L"y";
    std::size_t count = 7;
    EXPECT_FALSE(none);
    EXPECT_TRUE(none.IsDefault());
    EXPECT_FALSE(none.IsNamedDefault());
    EXPECT_FALSE(none.Rename(L"a"));
    EXPECT_TRUE(none.GetName().isempty() && none.GetData().isempty() && none.GetContent().isempty());
    EXPECT_FALSE(none.IsName(L"") || none.IsData(L"") || none.IsNameData(L"", L""));
    EXPECT_EQ(none.GetNameIndex(L"a", L';'), NotFound);
    EXPECT_FALSE(none.AddAttribute(L"a", L"v") || none.SetAttribute(L"a", L"v") || none.HasAttribute(L"a"));
    EXPECT_TRUE(none.DeleteAttribute(L"a"));
    EXPECT_FALSE(none.GetAttribute(0, name, value));
    EXPECT_TRUE(name.isempty() && value.isempty());
    EXPECT_TRUE(none.MergeAttributes(none, true)) << "nothing to take over";
    EXPECT_FALSE(none.Add(child) || none.AddTag(L"a") || none.SetTag(L"a", L"v") || none.Insert(child, 0));
    EXPECT_FALSE(none.Replace(child, 0) || none.Replace(child, child) || none.Delete(0) || none.Delete(child));
    EXPECT_FALSE(none.DeleteElements() || none.DeleteData() || none.DeleteContent() || none.Add(L"x") ||
                 none.Set(L"x"));
    EXPECT_EQ(none.GetElements(count), nullptr);
    EXPECT_EQ(count, 0u);
    EXPECT_FALSE(none.item(0));
    EXPECT_EQ(none.FindFirstElement(L"a"), nullptr);
    EXPECT_EQ(none.FindNextElement(L"a", nullptr), nullptr);
    EXPECT_EQ(none.FindPrevElement(L"a", nullptr), nullptr);
    none.Reset();
    EXPECT_TRUE(none.CAdd(CPXMLObject())) << "the child is looked at first";
    EXPECT_TRUE(child.AddAttribute(L"a", L"v"));
    EXPECT_FALSE(none.CAdd(child));
    EXPECT_FALSE(none.MergeAttributes(child, true));
}

TEST(XmlTree, SetNameDetachesIntended) {
    CPXMLObject element = Named(L"a");
    EXPECT_TRUE(element.AddAttribute(L"x", L"1") && element.AddTag(L"child"));
    const CPXMLObject other(element);
    EXPECT_TRUE(element.SetName(L"b"));
    EXPECT_TRUE(element.IsNamedDefault());
    EXPECT_TRUE(other.IsName(L"a") && other.HasAttribute(L"x"));
    EXPECT_EQ(CountOf(other), 1u);

    CPXMLObject third(other);
    EXPECT_TRUE(third.Rename(L"c"));
    EXPECT_TRUE(other.IsName(L"c")) << "a renamed node is renamed for all its holders";
}

TEST(XmlTree, CloneIsOneLevelDeep) {
    CPXMLObject element = Parent({L"a", L"b"});
    EXPECT_TRUE(element.AddAttribute(L"x", L"1"));
    const CPXMLObject other(element);
    EXPECT_TRUE(element.clone());
    EXPECT_NE(element.key(), other.key());
    EXPECT_TRUE(element.SetAttribute(L"x", L"2") && element.Delete(0) && element.item(0).Add(L"text"));
    EXPECT_TRUE(other.FindAttributeValue(L"x", L"1"));
    EXPECT_EQ(Children(other), "ab");
    EXPECT_TRUE(other.item(1).IsData(L"text")) << "children stay shared";
    EXPECT_EQ(CPXMLObject(static_cast<const TAVO::Buffers::CPObjectMemory&>(other)).key(), other.key());
    TAVO::Buffers::CPPlainMemory bytes;
    EXPECT_TRUE(bytes.Alloc(64));
    EXPECT_FALSE(CPXMLObject(bytes).key()) << "other types are not taken";
}

TEST(XmlTree, AttributesKeepTheirOrder) {
    CPXMLObject element = Named(L"e");
    EXPECT_TRUE(element.AddAttribute(L"a", L"1") && element.AddAttribute(L"b", L"2") &&
                element.AddAttribute(L"c", L"3"));
    EXPECT_FALSE(element.AddAttribute(L"a", L"9"));
    EXPECT_FALSE(element.AddAttribute(L"d", L"")) << "values are never empty";
    EXPECT_FALSE(element.AddAttribute(L"d", CPPoolString()));
    EXPECT_FALSE(element.AddAttribute(L"d", L"\xDC00")) << "a text that cannot be interned";
    EXPECT_TRUE(element.SetAttribute(L"a", L"4")) << "goes to the end";
    const wchar_t* const kNames[] = {L"b", L"c", L"a"};
    CPPoolString name, value;
    for (std::size_t i = 0; i < 3; ++i) {
        EXPECT_TRUE(element.GetAttribute(i, name, value));
        EXPECT_TRUE(name == kNames[i]);
    }
    EXPECT_TRUE(value == L"4");
    EXPECT_FALSE(element.GetAttribute(3, name, value));
    EXPECT_TRUE(element.IsNameAttrib(L"e", L"a") && element.IsNameAttribVal(L"e", L"a", L"4"));
    EXPECT_FALSE(element.IsNameAttrib(L"f", L"a") || element.IsNameAttribVal(L"e", L"a", L"1"));
    EXPECT_FALSE(element.HasAttribute(L"") || element.IsNameAttrib(L"", L"a") || element.IsNameAttrib(L"e", L""));
    EXPECT_TRUE(element.FindAttribute(L"zz").isempty());
    EXPECT_FALSE(element.SetAttribute(L"b", L"")) << "removes it";
    EXPECT_FALSE(element.HasAttribute(L"b"));
    EXPECT_FALSE(element.SetAttribute(L"c", L"\xDC00"));
    EXPECT_TRUE(element.HasAttribute(L"c"));
    EXPECT_TRUE(element.DeleteAttribute(L"a") && element.DeleteAttribute(L"c") && element.DeleteAttribute(L"c"));
    EXPECT_EQ(element.GetNAttributes(), 0u);
    EXPECT_TRUE(element.IsNamedDefault()) << "the array went with its last entry";
}

TEST(XmlTree, MergeOverwritesOnDemand) {
    for (bool overwrite : {false, true}) {
        CPXMLObject ours = Named(L"a"), theirs = Named(L"b");
        EXPECT_TRUE(ours.AddAttribute(L"x", L"1") && theirs.AddAttribute(L"y", L"2") &&
                    theirs.AddAttribute(L"x", L"3"));
        EXPECT_TRUE(ours.MergeAttributes(theirs, overwrite));
        EXPECT_TRUE(ours.FindAttribute(L"x") == (overwrite ? L"3" : L"1"));
        EXPECT_TRUE(ours.FindAttribute(L"y") == L"2");
        EXPECT_TRUE(ours.MergeAttributes(ours, overwrite));
        EXPECT_EQ(ours.GetNAttributes(), 2u);
    }
}

TEST(XmlTree, PlacingChildren) {
    CPXMLObject parent = Named(L"p"), child = Named(L"a");
    EXPECT_FALSE(parent.Add(CPXMLObject()));
    EXPECT_EQ(parent.Add(child).sIndex(), 0u);
    EXPECT_EQ(parent.AddTag(L"b", L"text").sIndex(), 1u);
    EXPECT_TRUE(parent.item(1).IsNameData(L"b", L"text"));
    EXPECT_FALSE(parent.AddTag(L"b", L"\xD800")) << "a text that cannot be interned";
    EXPECT_TRUE(parent.CAdd(Named(L"c"))) << "carries nothing, so it is not added";
    EXPECT_EQ(Children(parent), "ab");
    EXPECT_TRUE(parent.CAdd(parent.item(1)));
    EXPECT_EQ(Children(parent), "abb") << "a node may be there twice";
    EXPECT_EQ(parent.GetNElements(L"b"), 2u);
    EXPECT_EQ(parent.GetNElements(L""), 0u);
    EXPECT_TRUE(parent.item(parent.Insert(Named(L"i"), 1)).IsName(L"i"));
    EXPECT_TRUE(parent.Replace(Named(L"r"), 0));
    EXPECT_FALSE(parent.Replace(CPXMLObject(), 0) || parent.Replace(child, 4) || parent.Replace(child, -1));
    EXPECT_EQ(parent.Replace(child, parent.item(1)).sIndex(), 1u);
    EXPECT_EQ(Children(parent), "rabb");
    EXPECT_TRUE(parent.Delete(child));
    EXPECT_FALSE(parent.Delete(child) || parent.Delete(3) || parent.Delete(CPXMLObject()));
    EXPECT_EQ(Children(parent), "rbb");
}

TEST(XmlTree, PositionsInsideAndOutside) {
    CPXMLObject parent = Parent({L"a", L"b", L"c"});
    const CPXMLObject b(parent.item(1)), stranger = Named(L"s");
    std::size_t count;
    CPXMLObject* slots = parent.GetElements(count);
    EXPECT_EQ(parent.Replace(stranger, slots + 2).sIndex(), 2u);
    EXPECT_EQ(parent.Replace(stranger, &b).sIndex(), 1u) << "found by the node in the foreign slot";
    EXPECT_FALSE(parent.Replace(stranger, &b));
    EXPECT_EQ(Children(parent), "ass");
    EXPECT_TRUE(parent.Delete(parent.GetElements(count) + 1));
    EXPECT_FALSE(parent.Delete(&b));
    EXPECT_TRUE(parent.Delete(&stranger));
    EXPECT_FALSE(parent.Delete(static_cast<const CPXMLObject*>(nullptr)) || parent.Replace(stranger, nullptr));
    EXPECT_EQ(Children(parent), "a");
    EXPECT_EQ(parent.Replace(CPXMLObject(), parent.GetElements(count)).sIndex(), 0u);
    EXPECT_FALSE(parent.item(0)) << "any handle is taken";
    EXPECT_FALSE(parent.Delete(CPXMLObject())) << "an empty handle is found nowhere";
}

TEST(XmlTree, ReplaceByPositionOnAnEmptyHandleIntended) {
    CPXMLObject none;
    const CPXMLObject child = Named(L"a");
    EXPECT_EQ(none.Replace(child, &child).sIndex(), 0u);
    EXPECT_EQ(none.Replace(child, child).sIndex(), NotFound);
}

TEST(XmlTree, InsertAnswersTheIndexAskedForIntended) {
    CPXMLObject parent = Parent({L"a", L"b"});
    EXPECT_EQ(parent.Insert(Named(L"c"), 99).sIndex(), 99u);
    EXPECT_FALSE(parent.Insert(Named(L"d"), NotFound)) << "reads as failure";
    EXPECT_EQ(parent.Insert(CPXMLObject(), 0).sIndex(), 0u);
    EXPECT_EQ(Children(parent), "abcd");
    EXPECT_EQ(CountOf(parent), 5u);
    EXPECT_FALSE(CanBeWritten(parent)) << "an empty handle is among the children";

    CPXMLObject withData = Named(L"p");
    EXPECT_TRUE(withData.Add(L"text"));
    EXPECT_FALSE(withData.Insert(Named(L"a"), 0));
    EXPECT_TRUE(withData.Add(Named(L"a")));
}

TEST(XmlTree, KindStaysAfterSingleDeletesIntended) {
    CPXMLObject parent = Parent({L"a"});
    EXPECT_TRUE(parent.Delete(0) && parent.DeleteElements());
    EXPECT_TRUE(CanBeWritten(parent));
    EXPECT_TRUE(parent.Add(L"text"));
    EXPECT_FALSE(CanBeWritten(parent)) << "counts as children and data";
    EXPECT_TRUE(parent.Set(L"text"));
    EXPECT_TRUE(CanBeWritten(parent));
}

TEST(XmlTree, DataIsSetOnce) {
    CPXMLObject element = Named(L"e");
    EXPECT_TRUE(element.Add(L""));
    EXPECT_TRUE(element.IsNamedDefault());
    EXPECT_TRUE(element.Add(CPPoolString()) && element.Add(static_cast<const wchar_t*>(nullptr)));
    EXPECT_FALSE(element.Add(L"\xDC00"));
    EXPECT_TRUE(element.Add(L"one"));
    EXPECT_FALSE(element.Add(L"two") || element.Add(L""));
    EXPECT_TRUE(element.IsData(L"one"));
    EXPECT_TRUE(element.Set(L"two") && element.AddTag(L"c") && element.Set(CPPoolString(L"three")));
    EXPECT_TRUE(element.IsData(L"three"));
    EXPECT_EQ(CountOf(element), 0u);
    EXPECT_FALSE(element.Set(L"\xDC00"));
    EXPECT_TRUE(element.IsData(L"three"));
    EXPECT_TRUE(element.Set(Named(L"c")));
    EXPECT_TRUE(element.Set(*element.FindFirstElement(L"c"))) << "the child itself";
    EXPECT_EQ(Children(element), "c");
    EXPECT_FALSE(element.Set(CPXMLObject()));
    EXPECT_TRUE(element.IsNamedDefault());
    EXPECT_TRUE(element.SetTag(L"t", L"x") && element.SetTag(L"t", L"y"));
    EXPECT_EQ(Children(element), "t");
    EXPECT_TRUE(element.FindElementData(L"t") == L"y");
    EXPECT_TRUE(element.FindElementData(L"u").isempty());
    EXPECT_TRUE(element.AddAttribute(L"a", L"1"));
    element.Reset();
    EXPECT_TRUE(element.IsNamedDefault() && element.IsName(L"e"));
}

TEST(XmlTree, ContentIsAlwaysEmptyIntended) {
    CPXMLObject element = Named(L"e");
    EXPECT_TRUE(element.Add(L"text"));
    EXPECT_TRUE(element.GetContent().isempty());
}

TEST(XmlTree, FormattedText) {
    CPXMLObject element = Named(L"e");
    EXPECT_TRUE(element.printf(L"%d-%s", 7, L"x") && element.IsData(L"7-x"));
    EXPECT_FALSE(element.printf(L"%d", 8));
    EXPECT_TRUE(element.Sprintf(L"%04X", 255) && element.IsData(L"00FF"));
    EXPECT_TRUE(element.printfAttribute(L"a", L"%d", 1));
    EXPECT_FALSE(element.printfAttribute(L"a", L"%d", 2) || element.printfAttribute(L"b", L"%s", L""));
    EXPECT_TRUE(element.SprintfAttribute(L"a", L"%d", 3) && element.FindAttribute(L"a") == L"3");
    EXPECT_EQ(element.printfTag(L"t", L"%d", 4).sIndex(), 0u);
    EXPECT_EQ(element.printfTag(L"t", L"%d", 5).sIndex(), 1u);
    EXPECT_EQ(element.SprintfTag(L"u", L"%d", 6).sIndex(), 0u);
    EXPECT_EQ(Children(element), "u");
    EXPECT_FALSE(element.printfTag(L"0", L"x") || element.SprintfTag(L"0", L"x"));
    for (int width : {254, 255, 256, 257, 3000}) {
        EXPECT_TRUE(element.Sprintf(L"%*d", width, 1));
        EXPECT_EQ(element.GetData().len(), static_cast<std::size_t>(width));
    }
}

TEST(XmlTree, SearchesGoOnFromAResult) {
    CPXMLObject parent = Parent({L"a", L"b", L"a"});
    EXPECT_TRUE(parent.Insert(CPXMLObject(), 1));
    EXPECT_TRUE(parent.item(3).Add(L"text") && parent.item(3).AddAttribute(L"k", L"v"));
    std::size_t count;
    const CPXMLObject* slots = parent.GetElements(count);
    ASSERT_EQ(count, 4u);
    EXPECT_EQ(parent.FindNextElement(L"a", nullptr), slots);
    EXPECT_EQ(parent.FindNextElement(L"a", slots), slots + 3);
    EXPECT_EQ(parent.FindNextElement(L"a", slots + 3), nullptr);
    EXPECT_EQ(parent.FindNextElementData(L"a", L"text", nullptr), slots + 3);
    EXPECT_EQ(parent.FindNextElementData(L"a", L"", nullptr), slots);
    EXPECT_EQ(parent.FindNextElementAtt(L"a", L"k", nullptr), slots + 3);
    EXPECT_EQ(parent.FindNextElementAtt(L"b", L"k", nullptr), nullptr);
    EXPECT_EQ(parent.FindNextElementAttVal(L"a", L"k", L"v", slots + 1), slots + 3);
    EXPECT_EQ(parent.FindNextElementAttVal(L"a", L"k", L"w", nullptr), nullptr);
    EXPECT_EQ(parent.FindPrevElement(L"a", nullptr), slots + 3);
    EXPECT_EQ(parent.FindPrevElementData(L"a", L"", nullptr), slots);
    EXPECT_EQ(parent.FindPrevElementAtt(L"a", L"k", nullptr), slots + 3);
    EXPECT_EQ(parent.FindPrevElementAttVal(L"a", L"k", L"v", slots), nullptr);
    const CPXMLObject stranger;
    for (const CPXMLObject* start : {slots + 4, slots - 1, &stranger, reinterpret_cast<const CPXMLObject*>(0x18)}) {
        EXPECT_EQ(parent.FindNextElement(L"a", start), nullptr) << "compared, never read";
        EXPECT_EQ(parent.FindPrevElement(L"a", start), nullptr);
    }
}

TEST(XmlTree, FindPrevStartsBehindTheStartIntended) {
    CPXMLObject parent = Parent({L"a", L"a", L"b", L"a"});
    std::size_t count;
    const CPXMLObject* slots = parent.GetElements(count);
    EXPECT_EQ(parent.FindPrevElement(L"a", slots + 1), slots + 1) << "itself";
    EXPECT_EQ(parent.FindPrevElement(L"a", slots), slots + 1) << "the one behind";
    EXPECT_EQ(parent.FindPrevElement(L"b", slots + 3), nullptr) << "nothing from the last one";
}

TEST(XmlTree, Paths) {
    CPXMLObject root = Named(L"root"), a = Named(L"a"), second = Named(L"a");
    EXPECT_TRUE(a.AddTag(L"b") && root.Add(a) && second.AddTag(L"c") && root.Add(second));
    const CPXMLObject* slots;
    std::size_t count;
    slots = root.GetElements(count);
    const CPXMLObject* const b = a.FindNextElement(L"b", nullptr);
    const struct {
        const wchar_t* path;
        const CPXMLObject* found;
        std::size_t parent;
    } kRows[] = {
        {L"a", slots, root.key()},
        {L"a/b", b, a.key()},
        {L" a / b ", b, a.key()},
        {L"\ta\r/\nb", b, a.key()},
        {L"a/", slots, root.key()},
        {L"a//b", slots, root.key()},
        {L"a/b c", slots, root.key()},
        {L"a/1", slots, root.key()},
        {L"/a", nullptr, 0},
        {L"", nullptr, 0},
        {nullptr, nullptr, 0},
        {L"a b", nullptr, 0},
        {L"a/c", nullptr, 0},
        {L"b", nullptr, 0},
        {L"root", nullptr, 0},
        {L"a/nosuchname", nullptr, 0},
        {L" ", nullptr, 0},
        {L"a/b/b", nullptr, 0},
    };
    for (std::size_t i = 0; i < std::size(kRows); ++i) {
        CPXMLObject parent = Named(L"old");
        EXPECT_EQ(root.FindFirstElement(kRows[i].path, &parent), kRows[i].found) << i;
        EXPECT_EQ(parent.key(), kRows[i].parent) << i;
        EXPECT_EQ(root.FindFirstElement(kRows[i].path), kRows[i].found) << i;
    }
    CPXMLObject self(root);
    EXPECT_EQ(self.FindFirstElement(L"a/b", &self), b) << "the handle itself receives the parent";
    EXPECT_EQ(self.key(), a.key());
    EXPECT_TRUE(root.Insert(CPXMLObject(), 0));
    EXPECT_NE(root.FindFirstElement(L"a/b"), nullptr);
}

TEST(XmlTree, NameIndex) {
    const CPXMLObject b = Named(L"b");
    const struct {
        const wchar_t* list;
        std::size_t index;
    } kRows[] = {{L"b", 0},           {L"a;b;c", 1},       {L"a;bb;b", 2},    {L"ab;b", 1},
                 {L";;b;", 2},        {L"b;b", 0},         {L"bb", NotFound}, {L"", NotFound},
                 {L"a;b ", NotFound}, {nullptr, NotFound}, {L"a", NotFound},  {L"a;;", NotFound}};
    for (std::size_t i = 0; i < std::size(kRows); ++i)
        EXPECT_EQ(b.GetNameIndex(kRows[i].list, L';'), kRows[i].index) << i;
    EXPECT_EQ(b.GetNameIndex(L"b", 0), 0u);
}

TEST(XmlTree, MillionChildrenAndAMillionLevels) {
    support::OnSmallStack([] {
        constexpr int kMany = 1000000;
        CPXMLObject root = Named(L"wide"), leaf = Named(L"leaf");
        for (int i = 0; i < kMany; ++i) ASSERT_TRUE(root.Add(leaf));
        EXPECT_EQ(CountOf(root), static_cast<std::size_t>(kMany));
        CPXMLObject top = Named(L"deep");
        for (int i = 0; i < kMany; ++i) {
            CPXMLObject above = Named(L"deep");
            ASSERT_TRUE(above.Add(top));
            top = std::move(above);
        }
        TAVO::Buffers::CPPlainMemory out;
        EXPECT_TRUE(root.Write(out, XMLEncodingUTF8, false) && top.Write(out, XMLEncodingUTF8, false));
        EXPECT_EQ(out.GetSize(), 38u + kMany * 13u + 7u + 1u);
    });
}

TEST(XmlTree, FailingAllocationsLeaveElementsUsable) {
    const CPPoolString kName = L"name", kValue = L"value";
    CPXMLObject leaf = Named(L"leaf");
    support::ForEachFailingAllocation([&] {
        CPXMLObject element;
        if (!element.SetName(kName)) return;
        for (int i = 0; i < 40; ++i) {
            const std::size_t before = CountOf(element);
            const bool added = bool(element.Add(leaf));
            ASSERT_EQ(CountOf(element), before + added);
        }
        const bool named = element.AddAttribute(kName, kValue);
        ASSERT_EQ(element.GetNAttributes(), named ? 1u : 0u);
        // Setting an attribute anew takes no memory.
        ASSERT_EQ(element.HasAttribute(kName), element.HasAttribute(kName) && element.SetAttribute(kName, kValue));
        const std::size_t count = CountOf(element);
        const bool tagged = bool(element.AddTag(kName, kValue));
        ASSERT_EQ(CountOf(element), count + tagged);
        CPXMLObject other;
        if (!other.SetName(kName)) return;
        const bool merged = other.MergeAttributes(element, true);
        ASSERT_EQ(merged, other.GetNAttributes() == element.GetNAttributes());
        const bool set = bool(element.SetTag(kName, kValue));
        ASSERT_TRUE(set ? CountOf(element) == 1 : CountOf(element) == 0 || CountOf(element) == count + tagged);
        element.Reset();
        ASSERT_TRUE(element.IsNamedDefault());
    });
}
