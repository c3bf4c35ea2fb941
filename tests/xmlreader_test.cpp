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

// What a capital letter of a grammar stands for, separated by '|'; other units stand for themselves.
const struct {
    char letter;
    bool isGrammar; // capitals in the choices are letters in their turn
    const char* choices;
} kGrammar[] = {
    {'D', true, "MEM|MMEMM|BEB"}, // document
    {'M', true, "B|<!--T-->|<?NAB?>|L"},
    {'L', false, "<!DOCTYPE a>|<!x '>'>|<?xml version='1.0'?>|<?xml version='1.0' encoding='utf-8'?>"},
    {'B', false, "|| |\n|\r\n |\t"},
    {'N', false, "a|b|name|x:y|_1|\xC3\xA9|\xE4\xB8\xAD-.1|attributeName"},
    {'A', true, "|| NB=B'T'| N='T'\nNB=\"T\"B| N=\"T\"N='T'"}, // attributes
    {'T', true, "|W|WW|WWW|WWWW"},
    {'W', false,
     "a| |  \n|word|&#32;|&lt;|&#65;|\xC3\xA9|\xF0\x9F\x98\x80|]|]]|>|more than sixteen units|\x02|&#128512;"},
    {'E', true, "<NAB/>|<aAB>BCB</a>|<x:yA>BCB</x:yB>|<\xC3\xA9 AB>C</\xC3\xA9>|<a>C</N>|<_1A>C</_1>"},
    {'C', true, "||E|EBE|EBMBEBE|T|TKT]]>T|T<!--T-->T"}, // content
    {'K', false, "<![CDATA["},
};

const char kTokens[] =
    "<|<|>|/>|</|</a>|<a>|<b |a|b|xml|=|='|=\"|'|\"| |\n|\r\t|<!|<!--|-->|<?|?>|<?xml|version='1.0'|encoding='UTF-8'|"
    "encoding='UTF-16'|version='2'|<![CDATA[|]]>|]|&|&#|&#65;|&#6:;|&lt;|&gt;|&amp;|;|x y|&#x41;|\x01|\xC3\xA9|"
    "\xE4\xB8\xAD|\xF0\x9F\x98\x80|\xEF\xBB\xBF|\xEF\xBF\xBF|text of more than sixteen units|&#1048576;|"
    "<a b='1' c='2'>|<a b='' b='x'/>|/|?|-|0|.";

// Random texts: a grammar of good ones, and a soup of their tokens.
class Source {
public:
    explicit Source(unsigned seed) : m_random(seed) {}

    std::string Document() { return Expand("D", 0); }

    std::string Soup() {
        std::string text = Below(2) ? "<a>" : "";
        for (std::size_t n = Below(16); n; --n) text += Pick(kTokens);
        return text;
    }

    template <class Text> void Damage(Text& text) {
        for (std::size_t n = Below(4); n && !text.empty(); --n) {
            const std::size_t at = Below(text.size()), kind = Below(4);
            if (kind == 0) text[at] = static_cast<typename Text::value_type>(m_random());
            if (kind == 1) text.erase(at, 1 + Below(3));
            if (kind == 2) text.insert(at, text.substr(Below(text.size()), Below(8)));
            if (kind == 3) text[at] = text[Below(text.size())];
        }
    }

private:
    std::size_t Below(std::size_t limit) { return m_random() % limit; }

    std::string Pick(const std::string& choices) {
        std::size_t at = 0;
        for (std::size_t n = Below(static_cast<std::size_t>(std::count(choices.begin(), choices.end(), '|')) + 1); n;
             --n)
            at = choices.find('|', at) + 1;
        return choices.substr(at, choices.find('|', at) - at);
    }

    std::string Expand(const std::string& symbols, int depth) {
        std::string text;
        for (char symbol : symbols) {
            const auto rule = std::find_if(std::begin(kGrammar), std::end(kGrammar),
                                           [&](const auto& row) { return row.letter == symbol; });
            if (rule == std::end(kGrammar))
                text += symbol;
            else if (depth < 20)
                text += rule->isGrammar ? Expand(Pick(rule->choices), depth + 1) : Pick(rule->choices);
        }
        return text;
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

TEST(XmlReader, RandomTexts) {
    Source source(1);
    unsigned good = 0;
    for (int i = 0; i < 12000; ++i) {
        std::string bytes = i % 4 ? source.Soup() : source.Document();
        std::u16string units = Wide(bytes);
        good += i % 4 == 0 && XmlReference::Read(bytes).code == 128;
        if (i % 16 < 3) {
            source.Damage(bytes);
            source.Damage(units);
            TAVO::String::CStringPool::Collect(60000); // pairs again: forget the last texts
            TAVO::String::CStringPool::Collect(60000);
        }
        Compare(bytes);
        Compare(units);
        if (HasFatalFailure()) return;
    }
    EXPECT_GT(good, 1000u) << "the grammar should mostly give good documents";
}
