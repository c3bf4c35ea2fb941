// The parser against a second reader: cut texts, damaged texts, random texts.

#include "support/xmltexts.h"

#include <algorithm>
#include <gtest/gtest.h>
#include <random>

using namespace support;

namespace {

// In UTF-16 with the pair that a character of UTF-8 becomes: texts that differ in nothing but pairs behind the tenth
// unit are one entry of the pool.
std::u16string Wide(const std::string& text) {
    std::u16string units = ToUtf16(text);
    std::replace(units.begin(), units.end(), u'\xD83D', u'\xD87D');
    return units;
}

const std::string kDocuments[] = {
    "<a/>",
    "<?xml version='1.0'?><!DOCTYPE a \"b\"><!-- 'c' --><a b = \"1\" c='&#65;&lt;'>\r\n<b>x <![CDATA[]]]> ]]>&amp;</b>"
    "<!-- d --><?e f='g'?></a >\n<?h?>",
    "<list><item n='1'>first one</item><item n='2'/><item>a &#38; b &gt;c</item></list>",
    "<\xC3\xA9 \xE4\xB8\xAD='\xC3\xA9 \xF0\x9F\x98\x80'>&\xC3\xA9\xC3\xA9\xE4\xB8\xAD \xF0\x9F\x98\x80</\xC3\xA9>",
    "<a>  leading and  double   blanks\tand a long text that fills more than one block of sixteen bytes ]] > </a>",
};

// Separated by '|'.
const char kTokens[] =
    "<|<|>|/>|</|</a>|<a>|<b |a|b|xml|=|='|=\"|'|\"| |\n|\r\t|<!|<!--|-->|<?|?>|<?xml|version='1.0'|encoding='UTF-8'|"
    "encoding='UTF-16'|version='2'|<![CDATA[|]]>|]|&|&#|&#65;|&#6:;|&lt;|&gt;|&amp;|;|x y|&#x41;|\x01|\xC3\xA9|"
    "\xE4\xB8\xAD|\xF0\x9F\x98\x80|\xEF\xBB\xBF|\xEF\xBF\xBF|text of more than sixteen units|&#1048576;|"
    "<a b='1' c='2'>|<a b='' b='x'/>|/|?|-|0|.";

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
    for (std::size_t at = 0; at < text.size(); ++at)
        for (int value = 0; value < 256; ++value) {
            std::string damaged = text;
            damaged[at] = static_cast<char>(value);
            Compare(damaged);
            std::u16string wide = units;
            wide[at] = static_cast<char16_t>(value << 8 | (value & 1 ? units[at] : 0));
            Compare(wide);
            wide[at] = static_cast<char16_t>(value);
            if (value >= 0x80) Compare(wide); // others as above
            if (HasFatalFailure()) return;
        }
}

// Tokens anywhere in a document, or nothing but tokens. Damage to bytes is the business of the fuzz target's replay.
TEST(XmlReader, RandomTokens) {
    std::vector<std::string> tokens(1);
    for (std::istringstream texts(kTokens); std::getline(texts, tokens.back(), '|');) tokens.emplace_back();
    std::mt19937 random(1);
    const auto below = [&random](std::size_t limit) { return random() % limit; };
    unsigned good = 0;
    for (int i = 0; i < 12000; ++i) {
        std::string text = i % 2 ? kDocuments[below(std::size(kDocuments))] : "<a>";
        for (std::size_t n = below(i % 2 ? 4 : 16); n; --n)
            text.insert(i % 2 ? below(text.size() + 1) : text.size(), tokens[below(tokens.size())]);
        good += XmlReference::Read(text).code == 128;
        Compare(text);
        // Bytes inserted within a character are no text that has a form in UTF-16.
        if (XmlReference::Read(text).code != 13) Compare(Wide(text));
        if (HasFatalFailure()) return;
    }
    EXPECT_GT(good, 1000u) << "enough good documents";
}
