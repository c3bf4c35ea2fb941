// Element trees built through the public calls, written in every encoding and read back: they must come back as they
// were. Input: a program of one-byte steps, each with the bytes it needs.
// Texts are those that do come back: no & < > " ' in attributes, no blanks at the ends of bare data, no runs of them,
// no line ends, no pairs.

#include "../tests/support/xmlreference.h"
#include "require.h"

#include <cstdint>
#include <cstring>
#include <vector>

namespace {

using namespace TAVO;
using namespace TAVO::XML;
using String::CPPoolString;
using String::CStringPool;

constexpr std::size_t kDeepest = 100; // the comparison below is recursive

class Program {
public:
    Program(const std::uint8_t* data, std::size_t size) : m_at(data), m_end(data + size) {}

    bool AtEnd() const { return m_at == m_end; }
    unsigned Next() { return AtEnd() ? 0 : *m_at++; }

    CPPoolString Name() {
        static constexpr wchar_t kFirst[] = L"abcXYZ_:\x00E9\x4E2D\x0391\xAC00";
        static constexpr wchar_t kRest[] = L"abcXYZ_:\x00E9\x4E2D\x0391\xAC00"
                                           L"09.-\x0301\x00B7\x0660";
        wchar_t name[8] = {};
        const unsigned length = 1 + Next() % 6;
        name[0] = kFirst[Next() % (std::size(kFirst) - 1)];
        for (unsigned i = 1; i < length; ++i) name[i] = kRest[Next() % (std::size(kRest) - 1)];
        return CStringPool::GetStringRef(name);
    }

    CPPoolString Value() { return Text(false); }
    CPPoolString Data() { return Text(true); }

private:
    CPPoolString Text(bool isData) {
        std::vector<wchar_t> units;
        bool needsSection = false;
        for (unsigned length = Next() % 40; length && !AtEnd(); --length) {
            const unsigned choice = Next();
            wchar_t unit = static_cast<wchar_t>(choice);
            if (choice >= 0x80 && choice < 0xA0) unit = L"]]>&<>\"'"[choice % 8];
            if (choice >= 0xA0) unit = static_cast<wchar_t>(Next() << 8 | choice);
            if (unit == 0 || (unit & 0xF800) == 0xD800) unit = L'x';
            if (unit == L'\t' || unit == L'\r' || unit == L'\n') unit = L' ';
            needsSection |= IsEscaped(unit);
            if (!isData && IsEscaped(unit)) unit = L'z';
            units.push_back(unit);
        }
        if (!isData || !needsSection) Bare(units);
        return CStringPool::GetStringRefn(units.data(), units.size());
    }

    static bool IsEscaped(wchar_t unit) {
        return unit == L'&' || unit == L'<' || unit == L'>' || unit == L'"' || unit == L'\'';
    }

    // No blank that would collapse.
    static void Bare(std::vector<wchar_t>& units) {
        std::vector<wchar_t> kept;
        for (const wchar_t unit : units)
            if (unit != L' ' || (!kept.empty() && kept.back() != L' ')) kept.push_back(unit);
        if (!kept.empty() && kept.back() == L' ') kept.pop_back();
        units.swap(kept);
    }

    const std::uint8_t* m_at;
    const std::uint8_t* m_end;
};

// The elements from the root to the current one.
CPXMLObject Build(Program& program) {
    std::vector<CPXMLObject> path(1);
    Require(path[0].SetName(program.Name()));
    for (int steps = 0; steps < 400 && !program.AtEnd(); ++steps) {
        CPXMLObject& element = path.back();
        std::size_t count = 0;
        element.GetElements(count);
        const unsigned step = program.Next() % 8;
        if (step < 2) {
            const CPPoolString name = program.Name(), value = program.Value();
            const bool fresh = !element.HasAttribute(name) && value.isdef();
            Require(element.AddAttribute(name, value) == fresh);
        } else if (step < 4 && !element.GetData().isdef() && path.size() < kDeepest) {
            CPXMLObject child;
            Require(child.SetName(program.Name()));
            Require(element.Add(child).sIndex() == count);
            path.push_back(child);
        } else if (step < 6 && count == 0) {
            const bool fresh = !element.GetData().isdef();
            Require(element.Add(program.Data()) == fresh);
        } else if (path.size() > 1) {
            path.pop_back();
        }
    }
    return path[0];
}

void CheckBack(const CPXMLObject& root, eXMLEncoding encoding, bool pretty) {
    Buffers::CPPlainMemory written;
    Require(root.Write(written, encoding, pretty));
    CXMLDoc document;
    Require(document.OpenDocText(static_cast<void*>(written), written.GetSize()));
    Require(support::Outline(support::Plain(document.GetRootElement())) == support::Outline(support::Plain(root)));

    // Written once more, it is the same text.
    Buffers::CPPlainMemory again;
    Require(document.GetRootElement().Write(again, encoding, pretty));
    Require(again.GetSize() == written.GetSize() &&
            std::memcmp(static_cast<void*>(again), static_cast<void*>(written), written.GetSize()) == 0);
}

} // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    Program program(data, size);
    const CPXMLObject root = Build(program);
    for (const auto encoding : {XMLEncodingUTF8, XMLEncodingUTF16, XMLEncodingUTF16Raw})
        for (const bool pretty : {false, true}) CheckBack(root, encoding, pretty);
    static unsigned runs = 0;
    if (++runs % 1024 == 0) CStringPool::Collect(60000); // or the pool would grow for ever
    return 0;
}
