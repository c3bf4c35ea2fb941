// The parser against a second reader: cut texts, damaged texts, random texts.

#include "support/xmltexts.h"

#include <algorithm>
#include <gtest/gtest.h>
#include <random>

using namespace support;

namespace {

// The text ends at its first zero unit.
template <class Text> Text UpToZero(const Text& text) {
    return text.substr(0, text.find(typename Text::value_type(0)));
}

// In UTF-16 with the pair that a character of UTF-8 becomes: texts that differ in nothing but pairs behind the tenth
// unit are one entry of the pool.
std::u16string Wide(const std::string& text) {
    std::u16string units = ToUtf16(text);
    std::replace(units.begin(), units.end(), u'\xD83D', u'\xD87D');
    return units;
}

void Compare(const std::string& whole) {
    const std::string text = UpToZero(whole);
    ASSERT_EQ(OpenUtf8(text), XmlReference::Read(text)) << text;
    const std::string marked = WithMark(text);
    if (marked.size() >= 4) {
        ASSERT_EQ(OpenRaw(marked), XmlReference::Read(marked)) << text;
    }
}

void Compare(const std::u16string& whole) {
    const std::u16string text = UpToZero(whole);
    ASSERT_EQ(OpenUtf16(text), XmlReference::Read(text)) << Printable(text);
    if (text.empty()) return;
    const std::u16string marked = u"\xFEFF" + text;
    const Reading expected = XmlReference::Read(marked);
    ASSERT_EQ(OpenRaw(BytesOf(marked)), expected) << Printable(text);
    ASSERT_EQ(OpenRaw(BytesOf(marked, true)), expected) << Printable(text);
}

const std::string kDocuments[] = {
    "<a/>",
    "<?xml version='1.0'?><!DOCTYPE a \"b\"><!-- 'c' --><a b = \"1\" c='&#65;&lt;'>\r\n<b>x <![CDATA[]]]> ]]>&amp;</b>"
    "<!-- d --><?e f='g'?></a >\n<?h?>",
    "<list><item n='1'>first one</item><item n='2'/><item>a &#38; b &gt;c</item></list>",
    "<\xC3\xA9 \xE4\xB8\xAD='\xC3\xA9 \xF0\x9F\x98\x80'>&\xC3\xA9\xC3\xA9\xE4\xB8\xAD \xF0\x9F\x98\x80</\xC3\xA9>",
    "<a>  leading and  double   blanks\tand a long text that fills more than one block of sixteen bytes ]] > </a>",
};

// Random texts: a grammar of good ones, and a soup of their tokens.
class Source {
public:
    explicit Source(unsigned seed) : m_random(seed) {}

    unsigned Below(unsigned limit) { return m_random() % limit; }

    std::string Document() {
        std::string text;
        while (Below(3) == 0) text += Misc();
        text += Element(0);
        while (Below(3) == 0) text += Misc();
        return text;
    }

    std::string Soup() {
        static const char* const kTokens[] = {"<",
                                              "<",
                                              ">",
                                              "/>",
                                              "</",
                                              "</a>",
                                              "<a>",
                                              "<b ",
                                              "a",
                                              "b",
                                              "xml",
                                              "=",
                                              "='",
                                              "=\"",
                                              "'",
                                              "\"",
                                              " ",
                                              "\n",
                                              "\r\t",
                                              "<!",
                                              "<!--",
                                              "-->",
                                              "<?",
                                              "?>",
                                              "<?xml",
                                              "version='1.0'",
                                              "encoding='UTF-8'",
                                              "encoding='UTF-16'",
                                              "version='2'",
                                              "<![CDATA[",
                                              "]]>",
                                              "]",
                                              "&",
                                              "&#",
                                              "&#65;",
                                              "&#6:;",
                                              "&lt;",
                                              "&gt;",
                                              "&amp;",
                                              ";",
                                              "x y",
                                              "&#x41;",
                                              "\x01",
                                              "\xC3\xA9",
                                              "\xE4\xB8\xAD",
                                              "\xF0\x9F\x98\x80",
                                              "\xEF\xBB\xBF",
                                              "\xEF\xBF\xBF",
                                              "text of more than sixteen units",
                                              "&#1048576;",
                                              "<a b='1' c='2'>",
                                              "<a b='' b='x'/>",
                                              "/",
                                              "?",
                                              "-",
                                              "0",
                                              "."};
        std::string text = Below(2) ? "<a>" : "";
        for (unsigned n = Below(16); n; --n) text += kTokens[Below(std::size(kTokens))];
        return text;
    }

    template <class Text> void Damage(Text& text) {
        for (unsigned n = Below(4); n && !text.empty(); --n) {
            const std::size_t at = Below(static_cast<unsigned>(text.size()));
            switch (Below(4)) {
            case 0:
                text[at] = static_cast<typename Text::value_type>(m_random());
                break;
            case 1:
                text.erase(at, 1 + Below(3));
                break;
            case 2:
                text.insert(at, text.substr(Below(static_cast<unsigned>(text.size())), Below(8)));
                break;
            default:
                text[at] = text[Below(static_cast<unsigned>(text.size()))];
            }
        }
    }

private:
    std::string Pick(std::initializer_list<const char*> texts) {
        return texts.begin()[Below(static_cast<unsigned>(texts.size()))];
    }
    std::string Blank() { return Pick({"", "", " ", "\n", "\r\n ", "\t"}); }
    std::string Name() { return Pick({"a", "b", "name", "x:y", "_1", "\xC3\xA9", "\xE4\xB8\xAD-.1", "attributeName"}); }
    std::string Text() {
        std::string text;
        for (unsigned n = Below(6); n; --n)
            text += Pick({"a", " ", "  \n", "word", "&#32;", "&lt;", "&#65;", "\xC3\xA9", "\xF0\x9F\x98\x80", "]", "]]",
                          ">", "sixteen units and some more", "\x02", "&#128512;"});
        return text;
    }
    std::string Attributes() {
        std::string text;
        for (unsigned n = Below(4); n; --n) {
            const std::string quote = Pick({"'", "\""});
            text += Pick({" ", "\n", " ", ""}) + Name() + Blank() + "=" + Blank() + quote + Text() + quote;
        }
        return text;
    }
    std::string Misc() {
        switch (Below(4)) {
        case 0:
            return "<!--" + Text() + "-->";
        case 1:
            return "<?" + Name() + Attributes() + Blank() + "?>";
        case 2:
            return Pick(
                {"<!DOCTYPE a>", "<!x '>'>", "<?xml version='1.0'?>", "<?xml version='1.0' encoding='utf-8'?>"});
        default:
            return Blank();
        }
    }
    std::string Element(int depth) {
        const std::string name = Name();
        std::string text = "<" + name + (Below(2) ? " " : "") + Attributes() + Blank();
        if (Below(3) == 0) return text + "/>";
        text += ">" + Blank();
        if (Below(2)) {
            for (unsigned n = Below(4); n; --n) {
                text += Text();
                if (Below(3) == 0) text += "<![CDATA[" + Text() + "]]>";
                if (Below(6) == 0) text += "<!--" + Text() + "-->";
            }
        } else {
            for (unsigned n = depth > 6 ? 0 : Below(4); n; --n)
                text += (Below(4) ? Element(depth + 1) : Misc()) + Blank();
        }
        return text + "</" + (Below(40) ? name : Name()) + Blank() + ">";
    }

    std::mt19937 m_random;
};

} // namespace

TEST(XmlReader, CutAnywhere) {
    for (const std::string& text : kDocuments) {
        for (std::size_t n = 0; n <= text.size(); ++n) Compare(text.substr(0, n));
        const std::u16string units = Wide(text);
        for (std::size_t n = 0; n <= units.size(); ++n) Compare(units.substr(0, n));
        for (std::size_t n = 0; n <= units.size(); ++n) Compare(units.substr(n));
    }
}

TEST(XmlReader, AnyByteAtAnyPlace) {
    const std::string text = "<?xml?><a b='1 &lt;'>\n<c>&#65; x<![CDATA[y]]></c><!----></a>";
    const std::u16string units = Wide(text);
    for (std::size_t at = 0; at < text.size(); ++at) {
        for (int value = 0; value < 256; ++value) {
            std::string damaged = text;
            damaged[at] = static_cast<char>(value);
            Compare(damaged);
            std::u16string wide = units;
            wide[at] = static_cast<char16_t>(value << 8 | (value & 1 ? units[at] : 0));
            Compare(wide);
            wide[at] = static_cast<char16_t>(value);
            if (value < 0x80) continue; // as above
            Compare(wide);
            if (HasFatalFailure()) return;
        }
    }
}

TEST(XmlReader, RandomDocuments) {
    Source source(1);
    unsigned good = 0;
    for (int i = 0; i < 4000; ++i) {
        const std::string text = source.Document();
        Compare(text);
        Compare(Wide(text));
        if (HasFatalFailure()) return;
        good += XmlReference::Read(text).code == 128;
    }
    EXPECT_GT(good, 1000u) << "the grammar should mostly give good documents";
}

TEST(XmlReader, RandomDamage) {
    Source source(2);
    for (int i = 0; i < 3000; ++i) {
        const std::string text = i % 2 ? source.Document() : source.Soup();
        std::string bytes = text;
        source.Damage(bytes);
        Compare(bytes);
        std::u16string units = Wide(text);
        source.Damage(units);
        TAVO::String::CStringPool::Collect(60000); // pairs again: forget the last texts
        TAVO::String::CStringPool::Collect(60000);
        Compare(units);
        if (HasFatalFailure()) return;
    }
}

TEST(XmlReader, RandomTokens) {
    Source source(3);
    for (int i = 0; i < 20000; ++i) {
        const std::string text = source.Soup();
        Compare(text);
        Compare(Wide(text));
        if (HasFatalFailure()) return;
    }
}
