// The element tree against a naive one: the same random operations on both, compared after every step.

#include "support/xmlmodel.h"
#include "xmlnode.h"

#include <algorithm>
#include <gtest/gtest.h>
#include <random>

using namespace TAVO::XML;
using support::Element;
using support::ElementPtr;
using support::Text;

namespace {

constexpr std::size_t kNone = TAVO::Buffers::NotFound;

// The rules of the tree over naive elements; a null pointer is an empty handle.
namespace naive {

bool IsNamed(const ElementPtr& e) { return e && !e->name.empty(); }
bool HasContent(const Element& e) { return !e.attributes.empty() || !e.children.empty() || !e.data.empty(); }
bool IsDefault(const ElementPtr& e) { return !e || (e->name.empty() && !HasContent(*e)); }
bool IsGood(const Text& name) { return !name.empty() && name != u"1" && name != u"a b"; }

auto Attribute(const ElementPtr& e, const Text& name) {
    return std::find_if(e->attributes.begin(), e->attributes.end(), [&](auto& pair) { return pair.first == name; });
}
bool SetName(ElementPtr& e, const Text& name) {
    if (!IsGood(name)) return false;
    e = std::make_shared<Element>();
    e->name = name;
    return true;
}
bool AddAttribute(const ElementPtr& e, const Text& name, const Text& value) {
    if (!IsGood(name) || !IsNamed(e) || value.empty() || Attribute(e, name) != e->attributes.end()) return false;
    e->attributes.emplace_back(name, value);
    return true;
}
bool DeleteAttribute(const ElementPtr& e, const Text& name) {
    if (!IsGood(name)) return false;
    if (IsNamed(e) && Attribute(e, name) != e->attributes.end()) e->attributes.erase(Attribute(e, name));
    return true;
}
bool Merge(const ElementPtr& e, const ElementPtr& other, bool overwrite) {
    if (!other || other->attributes.empty()) return true;
    if (!IsNamed(e)) return false;
    for (auto [name, value] : other->attributes) {
        const auto found = Attribute(e, name);
        if (found == e->attributes.end())
            e->attributes.emplace_back(name, value);
        else if (overwrite)
            found->second = value;
    }
    return true;
}
void Place(const ElementPtr& e, const ElementPtr& child, std::size_t index) {
    e->children.insert(e->children.begin() + static_cast<std::ptrdiff_t>(index), child);
    e->kind = e->kind == 0 ? 1 : e->kind == 2 ? 3 : e->kind;
}
std::size_t Add(const ElementPtr& e, const ElementPtr& child) {
    if (IsDefault(child) || !IsNamed(e)) return kNone;
    Place(e, child, e->children.size());
    return e->children.size() - 1;
}
bool AddText(const ElementPtr& e, const Text& text) {
    if (!IsNamed(e) || !e->data.empty()) return false;
    if (text.empty()) return true;
    e->data = text;
    e->kind = e->kind == 0 ? 2 : e->kind == 1 ? 3 : e->kind;
    return true;
}
ElementPtr Tag(const Text& name, const Text& value) {
    ElementPtr e;
    SetName(e, name);
    AddText(e, value);
    return e;
}
// The content that is left, children or data, gives the kind.
bool Empty(const ElementPtr& e, bool elements, bool data) {
    if (!IsNamed(e)) return false;
    if (elements && !e->children.empty()) e->children.clear(), e->kind = e->data.empty() ? 0 : 2;
    if (data && !e->data.empty()) e->data.clear(), e->kind = e->children.empty() ? 0 : 1;
    return true;
}
std::size_t Insert(const ElementPtr& e, const ElementPtr& child, std::size_t index) {
    if (!IsNamed(e) || !e->data.empty()) return kNone;
    Place(e, child, std::min(index, e->children.size()));
    return index;
}
std::size_t SlotWith(const ElementPtr& e, const ElementPtr& child) {
    const auto found = std::find(e->children.begin(), e->children.end(), child);
    return child && found != e->children.end() ? static_cast<std::size_t>(found - e->children.begin()) : kNone;
}
bool DeleteAt(const ElementPtr& e, std::size_t index) {
    if (!IsNamed(e) || index >= e->children.size()) return false;
    e->children.erase(e->children.begin() + static_cast<std::ptrdiff_t>(index));
    return true;
}
std::size_t Find(const ElementPtr& e, const Text& name, std::size_t from, int step) {
    for (std::size_t i = from; i < e->children.size(); i += static_cast<std::size_t>(step))
        if (e->children[i] && e->children[i]->name == name) return i;
    return kNone;
}
bool Reaches(const ElementPtr& from, const ElementPtr& target) {
    if (from == target) return true;
    return from && std::any_of(from->children.begin(), from->children.end(),
                               [&](const ElementPtr& child) { return Reaches(child, target); });
}
std::size_t Size(const ElementPtr& e) {
    std::size_t size = 1;
    if (e)
        for (auto& child : e->children) size += Size(child);
    return size;
}

} // namespace naive

bool IsEqual(const CPXMLObject& real, const ElementPtr& model) {
    if (!detail::IsLive(real)) return !model;
    if (!model) return false;
    const detail::Node& node = detail::NodeOf(real);
    const std::size_t attributes = detail::Attributes::Count(node.attributes);
    const std::size_t children = detail::Elements::Count(node.elements);
    std::vector<std::pair<Text, Text>> pairs;
    for (std::size_t i = 0; i < attributes; ++i) {
        const detail::Attribute& attribute = detail::Attributes::First(node.attributes)[i];
        pairs.emplace_back(support::Plain(attribute.name), support::Plain(attribute.value));
    }
    if (support::Plain(node.name) != model->name || support::Plain(node.data) != model->data ||
        node.contentKind != model->kind || pairs != model->attributes || children != model->children.size() ||
        (node.attributes.key() != 0) != (attributes != 0) || (node.elements.key() != 0) != (children != 0))
        return false;
    for (std::size_t i = 0; i < children; ++i)
        if (!IsEqual(detail::Elements::First(node.elements)[i], model->children[i])) return false;
    return true;
}

class Walk {
public:
    explicit Walk(unsigned seed) : m_random(seed) {}

    // One random operation on both; what they answered.
    std::pair<std::size_t, std::size_t> Step() {
        static const Text kTexts[] = {u"a", u"b", u"c", u"\x4E00", u"", u"1", u"a b"};
        const std::size_t changed = Below(kHandles), other = Below(kHandles);
        CPXMLObject& e = m_real[changed];
        ElementPtr& m = m_model[changed];
        const CPXMLObject child(m_real[other]);
        const ElementPtr modelChild = m_model[other];
        const Text &name = kTexts[Below(7)], &text = kTexts[Below(7)];
        const auto pooled = support::Pooled(name), value = support::Pooled(text);
        const std::size_t count = m ? m->children.size() : 0, index = Below(count + 2);
        const bool mayPlace = naive::Size(m) + naive::Size(modelChild) < 60 && !naive::Reaches(modelChild, m);
        const unsigned operation = Below(27);
        static constexpr std::uint32_t kEmptying = 1 << 0 | 1 << 6 | 1 << 7 | 1 << 14 | 1 << 16 | 1 << 20 | 1 << 23;
        if (m && (kEmptying >> operation & 1) && Below(8)) return {}; // rarely, so that trees grow
        if (!mayPlace && operation >= 8 && operation <= 16) return {};
        std::size_t n;
        const CPXMLObject* slots = e.GetElements(n);
        const auto find = [&](const CPXMLObject* found) { return found ? std::size_t(found - slots) : kNone; };
        if (operation == 0) return {e.SetName(pooled), naive::SetName(m, name)};
        if (operation == 1) return {e.Rename(pooled), m && naive::IsGood(name) && (m->name = name, true)};
        if (operation == 2) return {e.AddAttribute(pooled, value), naive::AddAttribute(m, name, text)};
        if (operation == 3)
            return {e.SetAttribute(pooled, value),
                    (naive::DeleteAttribute(m, name), naive::AddAttribute(m, name, text))};
        if (operation == 4) return {e.DeleteAttribute(pooled), naive::DeleteAttribute(m, name)};
        if (operation == 5) return {e.MergeAttributes(child, index & 1), naive::Merge(m, modelChild, index & 1)};
        if (operation == 6) {
            e = child, m = modelChild;
            return {};
        }
        if (operation == 7) {
            e.Reset();
            if (m) *m = Element{m->name, 0, {}, {}, {}};
            return {};
        }
        if (operation == 8) return {e.Add(child).sIndex(), naive::Add(m, modelChild)};
        if (operation == 9)
            return {e.CAdd(child),
                    !modelChild || !naive::HasContent(*modelChild) || naive::Add(m, modelChild) != kNone};
        if (operation == 10) return {e.Insert(child, index).sIndex(), naive::Insert(m, modelChild, index)};
        if (operation == 11) {
            const bool placed = naive::IsNamed(m) && !naive::IsDefault(modelChild) && index < count;
            if (placed) m->children[index] = modelChild;
            return {e.Replace(child, index), placed};
        }
        if (operation <= 13) { // the child in a place, an empty handle, too; or the child that is another
            const CPXMLObject old(index < n ? slots[index] : CPXMLObject());
            const bool isPlace = operation == 12, isNamed = naive::IsNamed(m);
            const bool placed = isNamed && index < count && (isPlace || !naive::IsDefault(modelChild));
            const std::size_t at = placed ? naive::SlotWith(m, m->children[index]) : kNone;
            if (at != kNone) m->children[at] = modelChild;
            if (isPlace) return {e.Replace(child, &old).sIndex(), isNamed ? at : 0};
            return {e.Replace(child, old).sIndex(), at};
        }
        if (operation == 14) return {e.Set(child), naive::Empty(m, true, true) && naive::Add(m, modelChild) != kNone};
        if (operation <= 16) {
            const bool placed =
                naive::IsGood(name) && (operation == 15 ? naive::IsNamed(m) : naive::Empty(m, true, true));
            return {(operation == 15 ? e.AddTag(pooled, value) : e.SetTag(pooled, value)).sIndex(),
                    placed ? naive::Add(m, naive::Tag(name, text)) : kNone};
        }
        if (operation == 17) return {e.Delete(index), naive::DeleteAt(m, index)};
        if (operation == 18)
            return {e.Delete(child), naive::IsNamed(m) && naive::DeleteAt(m, naive::SlotWith(m, modelChild))};
        if (operation == 19) return {index < n && e.Delete(slots + index), index < n && naive::DeleteAt(m, index)};
        if (operation == 20) return {e.DeleteElements(), naive::Empty(m, true, false)};
        if (operation == 21) return {e.DeleteData(), naive::Empty(m, false, true)};
        if (operation == 22) return {e.Add(value), naive::AddText(m, text)};
        if (operation == 23) return {e.Set(value), naive::Empty(m, true, true) && naive::AddText(m, text)};
        if (operation == 24) {
            if (m) m = std::make_shared<Element>(*m);
            const CPXMLObject shared(e); // so that it is copied even when it was alone
            return {e.clone(), true};
        }
        // From a child, backwards from the one behind it; or from either end.
        const bool goesOn = index < count && Below(3);
        const CPXMLObject* from = goesOn ? slots + index : nullptr;
        if (!naive::IsNamed(m)) return {};
        if (operation == 25)
            return {find(e.FindNextElement(pooled, from)), naive::Find(m, name, goesOn ? index + 1 : 0, 1)};
        return {find(e.FindPrevElement(pooled, from)), naive::Find(m, name, goesOn ? index + 1 : count - 1, -1)};
    }

    // Whether all handles are as they should be.
    bool IsRight() const {
        for (std::size_t i = 0; i < kHandles; ++i)
            if (!IsEqual(m_real[i], m_model[i])) return false;
        return true;
    }

private:
    static constexpr std::size_t kHandles = 6;

    unsigned Below(std::size_t limit) { return static_cast<unsigned>(m_random() % limit); }
    std::mt19937 m_random;
    CPXMLObject m_real[kHandles];
    ElementPtr m_model[kHandles];
};

} // namespace

TEST(XmlTreeModel, RandomOperationsGiveTheSameTrees) {
    for (unsigned seed = 1; seed <= 30; ++seed) {
        Walk walk(seed);
        for (int step = 0; step < 1500; ++step) {
            const auto [real, model] = walk.Step();
            ASSERT_TRUE(real == model && walk.IsRight()) << "seed " << seed << ", step " << step;
        }
    }
}

TEST(XmlTreeModel, ArraysGrowBySteps) {
    using namespace detail;
    for (std::size_t built : {0u, 1u, 15u, 16u, 17u, 64u, 96u, 100u}) {
        TAVO::Buffers::CPObjectMemory array;
        std::vector<Attribute> run(built);
        ASSERT_TRUE(Attributes::Build(array, run.data(), built));
        for (std::size_t i = 0; i < built; ++i) new (&run[i]) Attribute(); // they were moved out bitwise
        const auto capacity = [&array] { return TAVO::Buffers::Block::Of(array)->sAllocated / sizeof(Attribute); };
        EXPECT_EQ(built, built ? capacity() : 0) << "what is built at once takes what it needs";
        for (std::size_t count = built; count < 400; ++count) {
            ASSERT_TRUE(Attributes::Append(array, {L"name", CPPoolString(count)}));
            ASSERT_EQ(capacity(), (count + 1 + 15) / 16 * 16);
        }
        for (std::size_t i = built; i < 400; ++i) ASSERT_TRUE(Attributes::First(array)[i].value == CPPoolString(i));
    }
}
