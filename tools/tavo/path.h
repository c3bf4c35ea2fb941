#pragma once
// A place in a document: an element by names from the root's children down, "." for the root, and maybe an attribute.

#include "document.h"

#include <string>
#include <TAVO/string.h>

namespace tool {

class Path {
public:
    // False, after complaining, for what is no path or no attribute's name. The library itself takes any text and goes
    // as far as it makes sense, which here would hide typing errors.
    bool Parse(const std::string& path, const std::string& attribute);

    // The first element there; null, after complaining, when there is none.
    CPXMLObject* Find(Document& document) const;

    bool HasAttribute() const { return m_attribute.isdef(); }
    const TAVO::String::CPPoolString& Attribute() const { return m_attribute; }

private:
    std::string m_text;
    WideText m_path;
    bool m_root = false;
    TAVO::String::CPPoolString m_attribute;
};

} // namespace tool
