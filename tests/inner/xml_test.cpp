// Element trees and their writer against naive ones, at the edges of buffers and with targets that fail; and the
// characters of names.

#include "support/heapwatch.h"
#include "support/xmlreference.h"
#include "xmlnames.h"
#include "xmlnode.h"
#include "xmlout.h"

#include <map>
#include <memory>

using namespace TAVO::XML;
using namespace std::string_literals;
using TAVO::String::CPPoolString;
using Text = std::u16string;

namespace {

constexpr std::size_t kNone = TAVO::Buffers::NotFound;

CPPoolString Pooled(const Text& text) {
    std::vector<wchar_t> units(text.begin(), text.end());
    units.push_back(0);
    return CPPoolString(units.data());
}

struct Element {
    Text name;
    std::uint32_t kind = 0;
    std::vector<std::pair<Text, Text>> attributes;
    std::vector<std::shared_ptr<Element>> children; // a null pointer is an empty handle
    Text data;
};
using ElementPtr = std::shared_ptr<Element>;

// The writer the naive way: units first, then one character after the other.
class NaiveWriter {
public:
    NaiveWriter(int encoding, bool pretty) : m_encoding(encoding), m_pretty(pretty) {}

    // The bytes without the final zero; false when it cannot be written.
    bool Write(const Element& root) {
        Line(Text(u"<?xml version=\"1.0\" encoding=\"UTF-") + (m_encoding == 1 ? u"8\"?>" : u"16\"?>"));
        return Put(root, 0) && Encode();
    }
    const std::string& Bytes() const { return m_bytes; }

private:
    void Add(const Text& text, std::size_t level = 0) {
        if (m_pretty && m_atLineStart) m_units.append(level * 2, u' ');
        m_atLineStart = false;
        m_units += text;
    }
    bool Line(const Text& text, std::size_t level = 0) {
        Add(text, level);
        if (m_pretty) m_units += u"\r\n";
        return m_atLineStart = true;
    }
    static Text Escaped(const Text& text) {
        static const std::map<char16_t, Text> kEscapes{
            {u'&', u"&amp;"}, {u'<', u"&lt;"}, {u'>', u"&gt;"}, {u'"', u"&quot;"}, {u'\'', u"&apos;"}};
        Text out;
        for (char16_t c : text) out += kEscapes.count(c) ? kEscapes.at(c) : Text(1, c);
        return out;
    }
    static Text Section(Text text) {
        if (Escaped(text) == text) return text;
        for (std::size_t at = 0; (at = text.find(u"]]>", at)) != Text::npos; at += 14)
            text.replace(at, 3, u"]]]]><![CDATA[>");
        return u"<![CDATA[" + text + u"]]>";
    }
    bool Put(const Element& element, std::size_t level) {
        if (element.name.empty()) return false;
        if (element.kind == 4) {
            Add(u"<?" + element.name + u" " + element.data + u"?>", level);
            return !element.data.empty();
        }
        const bool bare = element.name[0] == u'<';
        const Text end = u"</" + element.name + u">";
        if (!bare) {
            Text tag = u"<" + element.name;
            for (auto& [name, value] : element.attributes) tag += u" " + name + u"=\"" + Escaped(value) + u"\"";
            if (element.kind > 2) return false;
            if (element.kind == 0) return Line(tag + u"/>", level);
            if (element.kind == 2) return Line(tag + u">" + Section(element.data) + end, level);
            Line(tag + u">", level);
        }
        for (auto& child : element.children)
            if (!child || !Put(*child, bare ? level : level + 1)) return false;
        return bare || Line(end, level);
    }

    bool Encode() {
        if (m_encoding == 3) return m_bytes = support::BytesOf(m_units), true;
        for (std::size_t i = 0; i < m_units.size();) {
            const support::Character c = support::LookAtUtf16(m_units, i, m_units.size());
            if (c.look != support::Look::Good) return false;
            i += c.units;
            if (m_encoding == 2)
                m_bytes += support::BytesOf(Text(1, static_cast<char16_t>(c.value)));
            else if (c.value == 0xFFFF && 16384 - m_bytes.size() % 16384 < 4)
                m_bytes += "\xF0\x8F\xBF\xBF";
            else
                for (auto byte : support::Encoded8(c.value)) m_bytes += static_cast<char>(byte);
        }
        return true;
    }

    int m_encoding;
    bool m_pretty;
    bool m_atLineStart = true;
    Text m_units;
    std::string m_bytes;
};

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
    if (IsGood(name)) e = std::make_shared<Element>(Element{name, 0, {}, {}, {}});
    return IsGood(name);
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
std::size_t Place(const ElementPtr& e, const ElementPtr& child, std::size_t index) {
    e->children.insert(e->children.begin() + static_cast<std::ptrdiff_t>(std::min(index, e->children.size())), child);
    e->kind |= 1;
    return index;
}
std::size_t Add(const ElementPtr& e, const ElementPtr& child) {
    return IsDefault(child) || !IsNamed(e) ? kNone : Place(e, child, e->children.size());
}
bool AddText(const ElementPtr& e, const Text& text) {
    if (!IsNamed(e) || !e->data.empty()) return false;
    e->data = text;
    e->kind |= text.empty() ? 0 : 2;
    return true;
}
// The content that is left, children or data, gives the kind.
bool Empty(const ElementPtr& e, bool elements, bool data) {
    if (!IsNamed(e)) return false;
    if (elements && !e->children.empty()) e->children.clear(), e->kind = e->data.empty() ? 0 : 2;
    if (data && !e->data.empty()) e->data.clear(), e->kind = e->children.empty() ? 0 : 1;
    return true;
}
std::size_t Insert(const ElementPtr& e, const ElementPtr& child, std::size_t index) {
    return IsNamed(e) && e->data.empty() ? Place(e, child, index) : kNone;
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
// Elements of the tree; many when `target` is among them.
std::size_t Size(const ElementPtr& e, const ElementPtr& target) {
    std::size_t size = e == target ? 1000 : 1;
    if (e)
        for (auto& child : e->children) size += Size(child, target);
    return size;
}

} // namespace naive

bool IsEqual(const CPXMLObject& real, const ElementPtr& model) {
    if (!detail::IsLive(real) || !model) return !detail::IsLive(real) && !model;
    const detail::Node& node = detail::NodeOf(real);
    const auto* const attributes = detail::Attributes::First(node.attributes);
    const auto* const children = detail::Elements::First(node.elements);
    return support::Units(node.name) == model->name && support::Units(node.data) == model->data &&
           node.contentKind == model->kind && (node.attributes.key() == 0) == model->attributes.empty() &&
           (node.elements.key() == 0) == model->children.empty() &&
           std::equal(
               attributes, attributes + detail::Attributes::Count(node.attributes), model->attributes.begin(),
               model->attributes.end(),
               [](auto& a, auto& b) { return std::pair(support::Units(a.name), support::Units(a.value)) == b; }) &&
           std::equal(children, children + detail::Elements::Count(node.elements), model->children.begin(),
                      model->children.end(), IsEqual);
}

// Whether both writers do the same, plain and pretty.
bool WriteAlike(const CPXMLObject& real, const Element& model, int encoding) {
    bool alike = true;
    for (bool pretty : {false, true}) {
        NaiveWriter naive(encoding, pretty);
        const bool writes = naive.Write(model);
        TAVO::Buffers::CPPlainMemory out;
        alike &= real.Write(out, static_cast<eXMLEncoding>(encoding), pretty) == writes;
        const std::string bytes(static_cast<const char*>(static_cast<void*>(out)), out.GetSize());
        alike &= !writes || bytes == naive.Bytes() + std::string(encoding == 1 ? 1 : 2, 0);
    }
    return alike;
}

class Walk {
public:
    explicit Walk(unsigned seed) : m_random(seed) {}

    // One random operation on both; what they answered.
    std::pair<std::size_t, std::size_t> Step() {
        static const Text kNames[] = {u"a", u"b", u"longer-name.with_parts", u"\x4E00", u"", u"1", u"a b"};
        // One pair only: the pool may take texts that differ in pairs alone for one.
        static const Text kTexts[] = {u"",
                                      u"12345678",
                                      u"&",
                                      u"<>\"'",
                                      u"x]]>]]",
                                      u" \r\n",
                                      u"\xE9\x3005\xFFFF",
                                      u"\xD83D\xDE00",
                                      u"plain text that is longer than a block"};
        const std::size_t changed = Below(kHandles), other = Below(kHandles);
        CPXMLObject& e = m_real[changed];
        ElementPtr& m = m_model[changed];
        const CPXMLObject child(m_real[other]);
        const ElementPtr modelChild = m_model[other];
        const Text &name = kNames[Below(7)], &text = kTexts[Below(9)];
        const auto pooled = Pooled(name), value = Pooled(text);
        const std::size_t count = m ? m->children.size() : 0, index = Below(count + 2);
        const bool mayPlace = naive::Size(m, m) + naive::Size(modelChild, m) < 1060;
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
        if (operation == 6) return e = child, m = modelChild, std::pair(kNone, kNone);
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
            const auto tag = std::make_shared<Element>(Element{name, text.empty() ? 0u : 2u, {}, {}, text});
            const bool isAdded = operation == 15;
            const bool placed = naive::IsGood(name) && (isAdded || naive::Empty(m, true, true));
            return {(isAdded ? e.AddTag(pooled, value) : e.SetTag(pooled, value)).sIndex(),
                    placed ? naive::Add(m, tag) : kNone};
        }
        if (operation == 17) return {e.Delete(index), naive::DeleteAt(m, index)};
        if (operation == 18) return {e.Delete(child), m && naive::DeleteAt(m, naive::SlotWith(m, modelChild))};
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
    bool IsRight() const { return std::equal(m_real, m_real + kHandles, m_model, IsEqual); }
    // How many of them can be written, if the naive writer agrees.
    int Written(int encoding) const {
        int written = 0;
        for (std::size_t i = 0; i < kHandles; ++i) {
            if (!m_model[i]) continue;
            EXPECT_TRUE(WriteAlike(m_real[i], *m_model[i], encoding));
            written += NaiveWriter(encoding, false).Write(*m_model[i]);
        }
        return written;
    }

private:
    static constexpr std::size_t kHandles = 6;

    unsigned Below(std::size_t limit) { return static_cast<unsigned>(m_random() % limit); }
    std::mt19937 m_random;
    CPXMLObject m_real[kHandles];
    ElementPtr m_model[kHandles];
};

TEST(XmlTreeModel, RandomOperationsGiveTheSameTreesAndTexts) {
    int written = 0;
    for (unsigned seed = 1; seed <= 30; ++seed) {
        Walk walk(seed);
        for (int step = 0; step < 1500; ++step) {
            const auto [real, model] = walk.Step();
            ASSERT_TRUE(real == model && walk.IsRight()) << "seed " << seed << ", step " << step;
            if (step % 20 == 0) written += walk.Written(1 + step / 20 % 3);
        }
    }
    EXPECT_TRUE(written > 2000 && written < 10000) << written << ": most trees can be written, and some cannot";
}

// Builds what public calls refuse, too: unnamed elements, instructions, bare containers, every kind.
CPXMLObject Build(const ElementPtr& model) {
    if (!model) return {};
    CPXMLObject element = NodeAccess::Adopt(detail::NewNode());
    detail::Node& node = detail::NodeOf(element);
    node.name = model->name.empty() ? CPPoolString::pempty : Pooled(model->name);
    node.data = model->data.empty() ? CPPoolString::pempty : Pooled(model->data);
    node.contentKind = model->kind;
    for (auto& [name, value] : model->attributes)
        EXPECT_TRUE(detail::Attributes::Append(node.attributes, {Pooled(name), Pooled(value)}));
    for (auto& child : model->children) EXPECT_TRUE(detail::Elements::Append(node.elements, Build(child)));
    return element;
}

bool WritesAlike(const Element& model, std::initializer_list<int> encodings = {1, 2, 3}) {
    const CPXMLObject real = Build(std::make_shared<Element>(model));
    return std::all_of(encodings.begin(), encodings.end(), [&](int e) { return WriteAlike(real, model, e); });
}

// A sink that counts and fails at will.
struct CountingOut : _CXMLOut {
    explicit CountingOut(std::size_t n) : allowed(n) {}
    bool Flush() override {
        if (allowed == 0) return false;
        --allowed;
        flushed.append(reinterpret_cast<const char*>(Buffered()), BufferedSize());
        return EmptyBuffer(), true;
    }
    std::size_t allowed;
    std::string flushed;
};

// Intended: xml-ffff
TEST(XmlWriter, CharactersAcrossTheEndOfTheBufferIntended) {
    // FFFF takes four bytes where fewer than four are free, and three everywhere else.
    for (const Text character : {u"a", u"\xE9", u"\x4E00", u"\xFFFF", u"\xD83D\xDE00", u"&"})
        for (int encoding = 1; encoding <= 3; ++encoding) {
            const std::size_t full = encoding == 1 ? 16384 : 8192; // units that fill the buffer
            for (std::size_t fill = full - 50; fill <= full - 38; ++fill) {
                const Text data = Text(fill, u'x') + character + character + u"y" + character;
                ASSERT_TRUE(WritesAlike({u"e", 2, {}, {}, data}, {encoding})) << "fill " << fill;
            }
        }
}

TEST(XmlWriter, TextsOfManyScriptsCrossBuffersAtAnyPlace) {
    const Text characters[] = {u"a", u"\xE9", u"\x43B", u"\x4E00", u"\xFFFF", u"\xD83D\xDE00", u"\xD800\xDC00", u"]]>"};
    std::mt19937 random(1);
    for (int round = 0; round < 60; ++round) {
        const std::size_t longest = std::size_t{1} << random() % 8; // of the runs
        Text data;
        while (data.size() < 18000)
            for (std::size_t left = 1 + random() % longest, which = random() % std::size(characters); left; --left)
                data += characters[which];
        ASSERT_TRUE(WritesAlike({u"e", 2, {{u"a", data}}, {}, data})) << "round " << round;
    }
}

TEST(XmlWriter, InstructionsContainersAndLevels) {
    const auto make = std::make_shared<Element, const Element&>;
    const auto instruction = make({u"pi", 4, {}, {}, u"a < b"}), leaf = make({u"leaf", 0, {}, {}, {}});
    const auto bare = make({u"<any", 3, {}, {instruction, leaf, leaf}, u"dropped"});
    const Element root{u"root", 1, {}, {bare, leaf}, {}};
    NaiveWriter naive(1, true);
    ASSERT_TRUE(naive.Write(root));
    EXPECT_EQ(naive.Bytes().substr(38), "\r\n<root>\r\n  <?pi a < b?><leaf/>\r\n  <leaf/>\r\n  <leaf/>\r\n</root>\r\n");
    ASSERT_TRUE(WritesAlike(root));
    bare->children.push_back(nullptr);
    ASSERT_TRUE(WritesAlike(*bare));
    instruction->data.clear();
    ASSERT_TRUE(WritesAlike(*instruction));

    Element nested = *leaf;
    for (int depth = 1; depth < 140; ++depth) nested = {u"d", 1, {}, {make(nested)}, {}};
    ASSERT_TRUE(WritesAlike(nested, {1}));
    EXPECT_EQ(CountingOut(9).Outdent(), 0u) << "not below 0";
}

TEST(XmlWriter, SinksStopAtTheFirstFailure) {
    const Element child{u"\x4E00\x4E01", 2, {{u"a", u"<\x4E00>"}}, {}, u"\x3005&\xFFFF"};
    const Element root{u"root", 1, {}, {2000, std::make_shared<Element>(child)}, {}};
    const CPXMLObject real = Build(std::make_shared<Element>(root));
    for (const auto encoding : {XMLEncodingUTF8, XMLEncodingUTF16, XMLEncodingUTF16Raw}) {
        NaiveWriter naive(encoding, true);
        ASSERT_TRUE(naive.Write(root));
        const std::size_t buffers = naive.Bytes().size() / _CXMLOut::kBufferSize;
        for (std::size_t allowed = 0; allowed <= buffers; ++allowed) {
            CountingOut sink(allowed);
            ASSERT_TRUE(sink.Begin(encoding, true));
            EXPECT_EQ(WriteElement(real, sink) && !sink.HasFailed(), allowed == buffers) << allowed;
            EXPECT_TRUE(sink.flushed == naive.Bytes().substr(0, allowed * _CXMLOut::kBufferSize));
        }
    }
    CountingOut sink(0);
    EXPECT_FALSE(sink.Begin(XMLEncodingAutomatic, false) || sink.Begin(static_cast<eXMLEncoding>(4), false));
    EXPECT_TRUE(sink.HasFailed() && !CountingOut(1).Write(L"x", 1)) << "no encoding yet";
    support::FailingHeap heap(0);
    EXPECT_FALSE(CountingOut(1).Begin(XMLEncodingUTF8, false)) << "no buffer";
}

TEST(XmlNames, TablesHaveTheRecommendationsRanges) {
    const auto& [baseChar, ideographic, combiningChar, digit, extender] = detail::g_nameTables;
    std::vector<std::size_t> sizes;
    std::vector<int> members(0x10000);
    for (const auto table : {baseChar, ideographic, combiningChar, digit, extender}) {
        sizes.push_back(table.size());
        for (detail::Range range : table)
            for (unsigned c = range.first; c <= range.last; ++c) ASSERT_EQ(++members[c], 1) << "in two classes: " << c;
    }
    EXPECT_EQ(sizes, (std::vector<std::size_t>{202, 3, 95, 15, 11}));
    for (detail::Range range : digit) EXPECT_LE(range.last - range.first, 9);
}

// 1: starts a name, 2: in names, 4: digit, 8: letter
TEST(XmlNames, MembersOfManyScripts) {
    using namespace detail;
    using Row = std::pair<unsigned, std::u32string>;
    for (const auto& [classes, characters] :
         {Row{0, U" /@[\x7F\x80\xD7\xF7\x132\x346\x66A\x1101\x4DFF\x9FA6\xD7A4\xD800\xFFFF\x10041"},
          Row{2, U"-.\xB7\x300\x387\xE31\x3005\x30FC"}, Row{1 | 2, U"_:"}, Row{2 | 4, U"0\x660\xF29"},
          Row{1 | 2 | 8, U"AZ\xC0\x386\x430\x5D0\x905\x1100\x2126\x212A\x3007\x3021\x3041\x4E00\x9FA5\xAC00\xD7A3"}})
        for (const TAVO::ulong32 c : characters)
            EXPECT_EQ(IsNameStart(c) * 1u + IsNameChar(c) * 2u + IsDigit(c) * 4u + IsLetter(c) * 8u, classes) << c;
}

} // namespace
