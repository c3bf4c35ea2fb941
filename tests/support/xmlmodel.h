#pragma once
// Element trees the naive way, and their output: what the library's are compared with.

#include <memory>
#include <string>
#include <TAVO/xml.h>
#include <utility>
#include <vector>

namespace support {

using Text = std::u16string;

inline TAVO::String::CPPoolString Pooled(const Text& text) {
    std::vector<wchar_t> units(text.begin(), text.end());
    units.push_back(0);
    return TAVO::String::CPPoolString(units.data());
}

inline Text Plain(const TAVO::String::CPPoolString& pooled) {
    Text text;
    for (const wchar_t* unit = pooled; *unit; ++unit) text += static_cast<char16_t>(*unit);
    return text;
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
        Line(m_encoding == 1 ? u"<?xml version=\"1.0\" encoding=\"UTF-8\"?>"
                             : u"<?xml version=\"1.0\" encoding=\"UTF-16\"?>");
        return Put(root, 0) && Encode();
    }
    const std::string& Bytes() const { return m_bytes; }

private:
    void Add(const Text& text, std::size_t level = 0) {
        if (m_pretty && m_atLineStart) m_units.append(level * 2, u' ');
        m_atLineStart = false;
        m_units += text;
    }
    void Line(const Text& text, std::size_t level = 0) {
        Add(text, level);
        if (m_pretty) m_units += u"\r\n";
        m_atLineStart = true;
    }
    static Text Escaped(const Text& text) {
        Text out;
        for (char16_t c : text)
            out += c == u'&'    ? u"&amp;"
                   : c == u'<'  ? u"&lt;"
                   : c == u'>'  ? u"&gt;"
                   : c == u'"'  ? u"&quot;"
                   : c == u'\'' ? u"&apos;"
                                : Text(1, c);
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
        if (!bare) {
            Text tag = u"<" + element.name;
            for (auto& [name, value] : element.attributes) tag += u" " + name + u"=\"" + Escaped(value) + u"\"";
            if (element.kind > 2) return false;
            if (element.kind == 0) return Line(tag + u"/>", level), true;
            if (element.kind == 2)
                return Line(tag + u">" + Section(element.data) + u"</" + element.name + u">", level), true;
            Line(tag + u">", level);
        }
        for (auto& child : element.children)
            if (!child || !Put(*child, bare ? level : level + 1)) return false;
        if (!bare) Line(u"</" + element.name + u">", level);
        return true;
    }

    void Unit(unsigned unit) {
        m_bytes += static_cast<char>(unit);
        m_bytes += static_cast<char>(unit >> 8);
    }
    bool Encode() {
        for (std::size_t i = 0; i < m_units.size(); ++i) {
            unsigned c = m_units[i];
            if (m_encoding == 3) {
                Unit(c);
                continue;
            }
            if (c >= 0xD800 && c <= 0xDFFF) {
                if (c >= 0xDC00 || i + 1 == m_units.size() || m_units[i + 1] < 0xDBFF) return false;
                const unsigned second = m_units[++i];
                c = (c & 0x3FF) || (second & 0x3FF) ? 1 : 0;
            }
            if (m_encoding == 2) {
                Unit(c);
                continue;
            }
            const std::size_t free = 16384 - m_bytes.size() % 16384;
            const auto trail = [&](int shift) { return static_cast<char>(0x80 | (c >> shift & 0x3F)); };
            if (c < 0x80)
                m_bytes += static_cast<char>(c);
            else if (c < 0x800)
                m_bytes += {static_cast<char>(0xC0 | c >> 6), trail(0)};
            else if (c == 0xFFFF && free < 4)
                m_bytes += "\xF0\x8F\xBF\xBF";
            else
                m_bytes += {static_cast<char>(0xE0 | c >> 12), trail(6), trail(0)};
        }
        return true;
    }

    int m_encoding;
    bool m_pretty;
    bool m_atLineStart = true;
    Text m_units;
    std::string m_bytes;
};

} // namespace support
