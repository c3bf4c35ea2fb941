#include "path.h"

#include "streams.h"

namespace tool {

namespace {

// The library's own rule for names, asked through an element.
bool IsName(std::string_view text) {
    WideText wide;
    return !text.empty() && ToWide(text, Pairs::Standard, wide) &&
           CPXMLObject().SetName(static_cast<const wchar_t*>(wide));
}

bool IsPath(std::string_view text) {
    for (;;) {
        const auto slash = text.find('/');
        if (!IsName(text.substr(0, slash))) return false;
        if (slash == text.npos) return true;
        text.remove_prefix(slash + 1);
    }
}

} // namespace

bool Path::Parse(const std::string& path, const std::string& attribute) {
    m_text = path;
    m_root = path == ".";
    if (!m_root && !IsPath(path)) {
        Complain("'" + path + "' is no path: give names from the root's children down, like a/b/c, or . for the root");
        return false;
    }
    ToWide(path, Pairs::Standard, m_path);
    if (attribute.empty()) return true;
    WideText name;
    if (!IsName(attribute)) {
        Complain("'" + attribute + "' is no attribute's name");
        return false;
    }
    ToWide(attribute, Pairs::Standard, name);
    m_attribute = static_cast<const wchar_t*>(name);
    return true;
}

CPXMLObject* Path::Find(Document& document) const {
    if (m_root) return &document.Root();
    CPXMLObject* element = document.Root().FindFirstElement(m_path);
    if (!element) Complain(document.Name() + ": there is no " + m_text + " below the root");
    return element;
}

} // namespace tool
