#pragma once
// A document as the tool sees it: its bytes, the tree that the library read from them, or the first error in words.

#include "text.h"

#include <cstdint>
#include <string>
#include <TAVO/xml.h>
#include <utility>
#include <vector>

namespace tool {

using TAVO::XML::CPXMLObject;

// Where and why reading ended.
struct ReadError {
    std::uint32_t code = 0;
    std::size_t line = 1;   // line feeds before the place, plus one
    std::size_t column = 1; // characters since the last line feed, plus one
    std::size_t offset = 0; // code units from the start of the text
    std::string title;      // the library's name for the error
    std::string excerpt;    // the text around it; empty when the library gives none
    std::string meaning;    // what to look for
};

class Document {
public:
    // Reads and parses; gives an exit code. kBadInput fills Error(), the others complain on standard error.
    int Open(const std::string& name);
    // As Open, and complains about a bad document too: for commands that need the tree.
    int Need(const std::string& name);
    // Parses the bytes of the last Open once more; the tree is the caller's.
    CPXMLObject Parse() const;

    const std::string& Name() const { return m_name; }
    CPXMLObject& Root() { return m_root; }
    const ReadError& Error() const { return m_error; }
    // "file:line:column: error 6 (Bad attribute) at offset 17: ...", and the excerpt on a line of its own.
    std::string Describe() const;

    std::size_t Size() const { return m_size; }
    bool IsUtf16() const { return m_form != Form::Utf8; }
    Pairs PairsKept() const { return IsUtf16() ? Pairs::Standard : Pairs::Library; }
    // References such as &amp; outside comments and CDATA sections. The library reads them by a rule of its own.
    std::size_t CountNamedReferences() const;
    // Complains when there are any.
    void NoteNamedReferences() const;

private:
    enum class Form { Utf8, Utf16, Utf16Swapped };

    void FindForm();
    std::size_t Units() const { return IsUtf16() ? m_size / 2 : m_size; }
    std::uint32_t Unit(std::size_t index) const;
    bool StartsWith(std::size_t index, std::string_view ascii) const;
    std::size_t SkipBehind(std::size_t index, std::string_view ascii) const;
    std::size_t FindBadSequence() const;
    void SetError(TAVO::XML::CXMLDoc& document);
    void FindPlace(std::size_t offset);

    std::string m_name;
    std::string m_bytes; // and four zero bytes
    std::size_t m_size = 0;
    Form m_form = Form::Utf8;
    CPXMLObject m_root;
    ReadError m_error;
};

// Visits a tree in document order. enter(element, depth) and leave(element, depth); the root's depth is 0. No
// recursion: documents may be as deep as they like.
template <class Enter, class Leave> void Walk(const CPXMLObject& root, Enter enter, Leave leave) {
    struct Level {
        const CPXMLObject* element;
        const CPXMLObject* next;
        const CPXMLObject* end;
    };
    std::vector<Level> levels;
    const auto open = [&](const CPXMLObject& element) {
        enter(element, levels.size());
        std::size_t count = 0;
        const CPXMLObject* children = element.GetElements(count);
        levels.push_back({&element, children, children + count});
    };
    open(root);
    while (!levels.empty()) {
        if (levels.back().next != levels.back().end) {
            open(*levels.back().next++);
            continue;
        }
        const CPXMLObject* element = levels.back().element;
        levels.pop_back();
        leave(*element, levels.size());
    }
}

} // namespace tool
