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

// Compares both writers in every encoding, plain and pretty.
testing::AssertionResult WritesAlike(const Element& model) {
    const CPXMLObject real = Build(std::make_shared<Element>(model));
    for (int encoding = 1; encoding <= 3; ++encoding)
        for (bool pretty : {false, true}) {
            support::NaiveWriter naive(encoding, pretty);
            const bool expected = naive.Write(model);
            TAVO::Buffers::CPPlainMemory out;
            const auto where = [&] {
                return testing::AssertionFailure() << "encoding " << encoding << " pretty " << pretty;
            };
            if (real.Write(out, static_cast<eXMLEncoding>(encoding), pretty) != expected) return where() << ": result";
            if (expected && Bytes(out) != naive.Bytes() + std::string(encoding == 1 ? 1 : 2, 0))
                return where() << ": text";
        }
    return testing::AssertionSuccess();
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
    for (unsigned seed = 1; seed <= 600; ++seed) {
        RandomTrees trees(seed);
        const Element model = trees.Make();
        ASSERT_TRUE(WritesAlike(model)) << "seed " << seed;
        written += support::NaiveWriter(1, false).Write(model);
    }
    EXPECT_GT(written, 300) << "most trees can be written";
    EXPECT_LT(written, 600) << "and some cannot";
}

TEST(XmlWriter, CharactersAcrossTheEndOfTheBufferIntended) {
    // FFFF takes four bytes where fewer than four are free, and three everywhere else.
    for (const Text character : {u"a", u"\xE9", u"\x4E00", u"\xFFFF", u"\xD83D\xDE00", u"&"})
        for (std::size_t full : {16384u, 8192u, 2 * 16384u}) // units that fill the buffer, or two
            for (std::size_t fill = full - 50; fill <= full - 38; ++fill) {
                Element model;
                model.name = u"e";
                model.kind = 2;
                model.data = Text(fill, u'x') + character + character + u"y" + character;
                ASSERT_TRUE(WritesAlike(model)) << "fill " << fill;
            }
}

TEST(XmlWriter, InstructionsContainersAndLevels) {
    Element instruction, bare, root, leaf;
    instruction.name = u"pi", instruction.kind = 4, instruction.data = u"a < b";
    leaf.name = u"leaf";
    bare.name = u"<any", bare.kind = 3, bare.data = u"dropped";
    bare.children = {std::make_shared<Element>(instruction), std::make_shared<Element>(leaf),
                     std::make_shared<Element>(leaf)};
    root.name = u"root", root.kind = 1;
    root.children = {std::make_shared<Element>(bare), std::make_shared<Element>(leaf)};
    TAVO::Buffers::CPPlainMemory out;
    ASSERT_TRUE(Build(std::make_shared<Element>(root)).Write(out, XMLEncodingUTF8, true));
    EXPECT_STREQ(
        static_cast<const char*>(static_cast<void*>(out)),
        "<?xml version=\"1.0\" encoding=\"UTF-8\"?>\r\n<root>\r\n  <?pi a < b?><leaf/>\r\n  <leaf/>\r\n  <leaf/>\r\n"
        "</root>\r\n");
    ASSERT_TRUE(WritesAlike(root));
    bare.children.push_back(nullptr);
    ASSERT_TRUE(WritesAlike(bare));
    instruction.data.clear();
    ASSERT_TRUE(WritesAlike(instruction));

    CountingOut sink(9);
    EXPECT_EQ(sink.Outdent(), 0u) << "not below 0";
    sink.Indent(), sink.Indent();
    EXPECT_EQ(sink.Outdent(), 1u);
}

TEST(XmlWriter, SinksStopAtTheFirstFailure) {
    Element root;
    root.name = u"root", root.kind = 1;
    for (int i = 0; i < 6000; ++i) {
        Element child;
        child.name = u"\x4E00\x4E01", child.kind = 2, child.data = u"\x3005&\xFFFF";
        child.attributes.emplace_back(u"a", u"<\x4E00>");
        root.children.push_back(std::make_shared<Element>(child));
    }
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
    EXPECT_TRUE(sink.HasFailed());
    EXPECT_FALSE(CountingOut(1).Write(L"x", 1)) << "no encoding yet";
    support::FailingHeap heap(0);
    EXPECT_FALSE(CountingOut(1).Begin(XMLEncodingUTF8, false)) << "no buffer";
}
