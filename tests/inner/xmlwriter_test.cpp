// The element writer against a naive one, at the edges of its buffer, and with targets that fail.

#include "support/heapwatch.h"
#include "support/xmlmodel.h"
#include "xmlnode.h"
#include "xmlout.h"

#include <gtest/gtest.h>
#include <random>

using namespace TAVO::XML;
using support::Element;
using support::ElementPtr;
using support::Pooled;
using support::Text;
using TAVO::String::CPPoolString;

using namespace std::string_literals;

namespace {

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

std::string Bytes(const TAVO::Buffers::CPPlainMemory& memory) {
    return std::string(static_cast<const char*>(static_cast<void*>(memory)), memory.GetSize());
}

// Whether both writers do the same in these encodings, plain and pretty.
bool WritesAlike(const Element& model, std::initializer_list<int> encodings = {1, 2, 3}) {
    const CPXMLObject real = Build(std::make_shared<Element>(model));
    bool alike = true;
    for (int encoding : encodings)
        for (bool pretty : {false, true}) {
            support::NaiveWriter naive(encoding, pretty);
            const bool expected = naive.Write(model);
            TAVO::Buffers::CPPlainMemory out;
            alike &= real.Write(out, static_cast<eXMLEncoding>(encoding), pretty) == expected;
            alike &= !expected || Bytes(out) == naive.Bytes() + std::string(encoding == 1 ? 1 : 2, 0);
        }
    return alike;
}

class RandomTrees {
public:
    explicit RandomTrees(unsigned seed) : m_random(seed) {}

    Element Make(unsigned depth = 0) {
        Element e;
        e.name = Pick({u"a", u"name", u"longer-name.with_parts", u"\xE9t\xE9", u"<"});
        if (Below(60) == 0) e.name.clear();
        e.kind = depth > 5 ? Below(2) * 2 : Below(80) == 0 ? 3 : Below(3);
        if (Below(20) == 0) e.kind = 4;
        for (unsigned i = Below(4); i; --i)
            e.attributes.emplace_back(Pick({u"x", u"id", u"an:attribute"}), MakeText() + u"v");
        if (e.kind == 2 || e.kind == 4) e.data = MakeText();
        const bool bare = e.name == u"<";
        if (e.kind == 1 || (bare && depth < 5))
            for (unsigned i = Below(5); i; --i)
                e.children.push_back(Below(80) == 0 ? nullptr : std::make_shared<Element>(Make(depth + 1)));
        return e;
    }
    // One pair only: the pool may take texts that differ in pairs alone for one.
    Text MakeText() {
        Text text;
        for (unsigned runs = Below(5); runs; --runs)
            text += Pick({u"a", u"12345678", u"&", u"<>", u"\"'", u"]]>", u" ", u"\r\n", u"\xE9", u"\x4E00\x3005",
                          u"\xFFFF", u"\xD83D\xDE00", u"plain text that is longer than a block"});
        return text;
    }

private:
    unsigned Below(unsigned limit) { return m_random() % limit; }
    Text Pick(std::initializer_list<const char16_t*> texts) { return texts.begin()[Below(unsigned(texts.size()))]; }
    std::mt19937 m_random;
};

// A sink that counts and fails at will.
class CountingOut : public _CXMLOut {
public:
    explicit CountingOut(int allowed) : m_allowed(allowed) {}
    bool Flush() override {
        if (m_allowed == 0) return false;
        --m_allowed;
        flushed.append(reinterpret_cast<const char*>(Buffered()), BufferedSize());
        EmptyBuffer();
        return true;
    }
    std::string flushed;

private:
    int m_allowed;
};

} // namespace

TEST(XmlWriter, RandomTreesAgainstTheNaiveWriter) {
    int written = 0;
    for (unsigned seed = 1; seed <= 400; ++seed) {
        const Element model = RandomTrees(seed).Make();
        ASSERT_TRUE(WritesAlike(model)) << "seed " << seed;
        written += support::NaiveWriter(1, false).Write(model);
    }
    EXPECT_TRUE(written > 200 && written < 400) << "most trees can be written, and some cannot";
}

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

TEST(XmlWriter, InstructionsContainersAndLevels) {
    const auto make = [](const Element& element) { return std::make_shared<Element>(element); };
    const auto instruction = make({u"pi", 4, {}, {}, u"a < b"}), leaf = make({u"leaf", 0, {}, {}, {}});
    const auto bare = make({u"<any", 3, {}, {instruction, leaf, leaf}, u"dropped"});
    const Element root{u"root", 1, {}, {bare, leaf}, {}};
    TAVO::Buffers::CPPlainMemory out;
    ASSERT_TRUE(Build(make(root)).Write(out, XMLEncodingUTF8, true));
    EXPECT_EQ(Bytes(out).substr(38),
              "\r\n<root>\r\n  <?pi a < b?><leaf/>\r\n  <leaf/>\r\n  <leaf/>\r\n</root>\r\n"s + '\0');
    ASSERT_TRUE(WritesAlike(root));
    bare->children.push_back(nullptr);
    ASSERT_TRUE(WritesAlike(*bare));
    instruction->data.clear();
    ASSERT_TRUE(WritesAlike(*instruction));

    Element nested = *leaf;
    for (int depth = 1; depth < 140; ++depth) {
        nested = {u"d", 1, {}, {make(nested)}, {}};
        ASSERT_TRUE(WritesAlike(nested, {1})) << depth;
    }
    EXPECT_EQ(CountingOut(9).Outdent(), 0u) << "not below 0";
}

TEST(XmlWriter, SinksStopAtTheFirstFailure) {
    Element root{u"root", 1, {}, {}, {}};
    for (int i = 0; i < 2000; ++i)
        root.children.push_back(
            std::make_shared<Element>(Element{u"\x4E00\x4E01", 2, {{u"a", u"<\x4E00>"}}, {}, u"\x3005&\xFFFF"}));
    const CPXMLObject real = Build(std::make_shared<Element>(root));
    for (int encoding = 1; encoding <= 3; ++encoding) {
        CountingOut all(1 << 20);
        ASSERT_TRUE(all.Begin(static_cast<eXMLEncoding>(encoding), true) && WriteElement(real, all) && all.Flush());
        support::NaiveWriter naive(encoding, true);
        ASSERT_TRUE(naive.Write(root));
        ASSERT_EQ(all.flushed, naive.Bytes());
        for (std::size_t allowed = 0; allowed < all.flushed.size() / _CXMLOut::kBufferSize; ++allowed) {
            CountingOut sink(static_cast<int>(allowed));
            ASSERT_TRUE(sink.Begin(static_cast<eXMLEncoding>(encoding), true));
            EXPECT_FALSE(WriteElement(real, sink) && !sink.HasFailed()) << allowed;
            EXPECT_EQ(sink.flushed.size(), allowed * _CXMLOut::kBufferSize);
        }
    }
    CountingOut sink(0);
    EXPECT_FALSE(sink.Begin(XMLEncodingAutomatic, false) || sink.Begin(static_cast<eXMLEncoding>(4), false));
    EXPECT_TRUE(sink.HasFailed() && !CountingOut(1).Write(L"x", 1)) << "no encoding yet";
    support::FailingHeap heap(0);
    EXPECT_FALSE(CountingOut(1).Begin(XMLEncodingUTF8, false)) << "no buffer";
}
