// The string pool against a map: operations from the input, texts from a small set of forms, sweeps in between.
// Input: per operation one byte (what to do), one byte (which text or handle), for a new text a length byte and the
// text.

#include "require.h"

#include <cstdint>
#include <map>
#include <string>
#include <TAVO/string.h>
#include <tuple>
#include <vector>

namespace {

using namespace TAVO::String;
using Units = std::vector<wchar_t>;

class Input {
public:
    Input(const std::uint8_t* data, std::size_t size) : m_data(data), m_left(size) {}
    bool AtEnd() const { return m_left == 0; }
    unsigned Byte() {
        if (!m_left) return 0;
        --m_left;
        return *m_data++;
    }
    std::string Bytes(std::size_t count) {
        if (count > m_left) count = m_left;
        const std::string bytes(reinterpret_cast<const char*>(m_data), count);
        m_data += count;
        m_left -= count;
        return bytes;
    }

private:
    const std::uint8_t* m_data;
    std::size_t m_left;
};

// A text in its own form; nothing may be read behind it.
struct Text {
    bool wide;
    bool counted; // given with its length, and not terminated
    std::vector<unsigned char> bytes;
    Units units;

    Text(bool isWide, bool isCounted, const std::string& from) : wide(isWide), counted(isCounted) {
        if (wide)
            for (std::size_t i = 0; i + 1 < from.size(); i += 2)
                units.push_back(static_cast<wchar_t>(static_cast<unsigned char>(from[i]) |
                                                     static_cast<unsigned char>(from[i + 1]) << 8));
        else
            bytes.assign(from.begin(), from.end());
        if (counted) return;
        bytes.push_back(0);
        units.push_back(0);
    }
    std::size_t Length() const { return wide ? units.size() : bytes.size(); }

    CPPoolString Get(bool anyCase) const { return wide ? Get(units.data(), anyCase) : Get(bytes.data(), anyCase); }
    CPPoolString Query(bool anyCase) const {
        return wide ? Query(units.data(), anyCase) : Query(bytes.data(), anyCase);
    }

private:
    template <class Unit> CPPoolString Get(const Unit* text, bool anyCase) const {
        if (counted)
            return anyCase ? CStringPool::GetStringRefni(text, Length()) : CStringPool::GetStringRefn(text, Length());
        return anyCase ? CStringPool::GetStringRefi(text) : CStringPool::GetStringRef(text);
    }
    template <class Unit> CPPoolString Query(const Unit* text, bool anyCase) const {
        if (counted)
            return anyCase ? CStringPool::QueryStringRefni(text, Length())
                           : CStringPool::QueryStringRefn(text, Length());
        return anyCase ? CStringPool::QueryStringRefi(text) : CStringPool::QueryStringRef(text);
    }
};

const wchar_t* Entry(const CPPoolString& text) { return text; }

// What identifies an entry: both hashes, length and the first ten units.
using Key = std::tuple<unsigned long long, unsigned long long, std::size_t, Units>;
Key KeyOf(const CPPoolString& text) {
    Units first;
    for (const wchar_t* unit = text; *unit && first.size() < 10; ++unit) first.push_back(*unit);
    return {text.sHash(), text.sHashi(), text.len(), first};
}

} // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    Input input(data, size);
    std::vector<CPPoolString> held;
    std::map<Key, const wchar_t*> entries; // of what is held
    const auto items = CStringPool::GetNItems();
    while (!input.AtEnd()) {
        const unsigned what = input.Byte();
        const Text text(what & 8, what & 16, what & 7 ? std::string() : input.Bytes(input.Byte()));
        switch (what & 7) {
        case 0: { // intern
            const bool anyCase = what & 32;
            const CPPoolString before = text.Query(anyCase), got = text.Get(anyCase);
            if (before.isdef()) Require(Entry(got) == Entry(before));
            Require(Entry(text.Query(anyCase)) == Entry(got));
            if (!got.isdef()) break;
            Require(got.Verify());
            if (anyCase) Require(text.Get(false).iequals(got) || text.Get(false).sHashi() == got.sHashi());
            const auto [known, added] = entries.emplace(KeyOf(got), Entry(got));
            Require(added || known->second == Entry(got));
            held.push_back(got);
            break;
        }
        case 1: // let one go
        case 2:
            if (held.empty()) break;
            held.erase(held.begin() + static_cast<long>(input.Byte() % held.size()));
            entries.clear();
            for (const auto& one : held) entries.emplace(KeyOf(one), Entry(one));
            break;
        case 3:
            Require(CStringPool::Collect(60000));
            break;
        case 4: // the UTF-8 form
            if (held.empty()) break;
            {
                const CPPoolString& one = held[input.Byte() % held.size()];
                const std::string form(reinterpret_cast<const char*>(static_cast<const unsigned char*>(one)));
                Require(form.size() <= one.UTF8Size());
            }
            break;
        case 5: { // join and split
            CPPoolStringArray array(what & 8);
            for (const auto& one : held) Require(array.Add(one));
            const CPPoolString joined = array.Flatten(L'|');
            Require(joined.isnull() || joined.Verify());
            Require(array.Inflate(joined, L'|'));
            break;
        }
        case 6:
            if (held.empty()) break;
            held.push_back(held[input.Byte() % held.size()].inc());
            if (!held.back().isdef())
                held.pop_back();
            else
                entries.emplace(KeyOf(held.back()), Entry(held.back()));
            break;
        default:
            Require(CStringPool::Verify());
        }
        for (const auto& one : held) Require(entries.count(KeyOf(one)) == 1);
    }
    Require(CStringPool::Verify());
    held.clear();
    entries.clear();
    Require(CStringPool::Collect(60000) && CStringPool::Collect(60000));
    Require(CStringPool::GetNItems() <= items);
    return 0;
}
