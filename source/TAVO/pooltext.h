#pragma once
// A text on its way into the pool, in the form in which the caller has it. Each form offers
//   key                       what it is searched by
//   Compare(stored)           the order of its first ten units against those of a stored text
//   CompareFolded(stored)     the same regardless of case
//   Units()                   units of the whole text
//   Write(out)                the whole text; false when it has no wide form
//   IsCaseless(stored)        whether it is its own lower case; it has been written to `stored`
// so that a text becomes a stored string only when it is missing.

#include "poolentry.h"
#include "transcoding.h"

namespace TAVO::String::pool {

// Intended (ten-units): once length and both hashes agree, ten units of the actual texts decide, so two texts that
// agree so far are one entry. A textbook pool would compare them whole; look-ups here never touch more than the first
// cache lines.
constexpr std::size_t kComparedUnits = 10;

// Whether a text of up to `units` units is its own lower case, as far as tables look. Texts can be made whose capitals
// cancel out in the hash, so the units that are compared are asked too.
template <class Unit> bool IsCaseless(const Key& key, const Unit* text, std::size_t units) {
    if (key.hash != key.hashi) return false;
    for (std::size_t i = 0; i < kComparedUnits && i < units && text[i]; ++i)
        if (text[i] >= 'A' && text[i] <= 'Z') return false;
    return true;
}

template <bool folded, class Unit> int CompareFirstUnits(const Unit* text, std::size_t units, const wchar_t* stored) {
    for (std::size_t i = 0; i < kComparedUnits; ++i) {
        wchar_t mine = i < units ? static_cast<wchar_t>(text[i]) : L'\0', theirs = stored[i];
        if constexpr (folded) mine = detail::FoldUnit(mine), theirs = detail::FoldUnit(theirs);
        if (mine != theirs) return mine < theirs ? -1 : 1;
        if (!mine) return 0;
    }
    return 0;
}

// Wide text, or bytes below 80: what one unit of the form is, one unit of the entry is.
template <class Unit> struct PlainText {
    const Key& key;
    const Unit* text;
    std::size_t units;

    int Compare(const wchar_t* stored) const {
        // Nearly every entry that is asked for is the one.
        if (units >= kComparedUnits && SameFirstUnits(stored)) return 0;
        return CompareFirstUnits<false>(text, units, stored);
    }
    int CompareFolded(const wchar_t* stored) const { return CompareFirstUnits<true>(text, units, stored); }
    // Not from the stored text, which was written a moment ago: reading it would wait until it has reached memory.
    bool IsCaseless(const wchar_t*) const { return pool::IsCaseless(key, text, units); }
    std::size_t Units() const { return units; }
    bool Write(wchar_t* out) const {
        if constexpr (sizeof(Unit) == sizeof(wchar_t)) {
            detail::WideCopy(out, text, units);
        } else {
            std::size_t i = 0;
            for (; units - i >= Simd::kBlock; i += Simd::kBlock) {
                const auto block = Simd::Load(text + i);
                Simd::Store(out + i, Simd::WidenLow(block));
                Simd::Store(out + i + Simd::kBlock / 2, Simd::WidenHigh(block));
            }
            const std::size_t left = units - i;
            if (left == 0) return true;
            const auto block = Simd::LoadPart(text + i, left);
            if (left >= Simd::kBlock / 2) Simd::Store(out + i, Simd::WidenLow(block));
            if (left > Simd::kBlock / 2)
                Simd::StorePart(out + i + Simd::kBlock / 2, Simd::WidenHigh(block), 2 * left - Simd::kBlock);
            if (left < Simd::kBlock / 2) Simd::StorePart(out + i, Simd::WidenLow(block), 2 * left);
        }
        return true;
    }

private:
    bool SameFirstUnits(const wchar_t* stored) const;
};
template <class Unit> bool PlainText<Unit>::SameFirstUnits(const wchar_t* stored) const {
    // Two runs of eight that overlap. An entry of the same length has as many units.
    static_assert(kComparedUnits == 10);
    using namespace Simd;
    const auto eight = [this](std::size_t from) {
        if constexpr (sizeof(Unit) == sizeof(wchar_t)) return Load(text + from);
        std::uint64_t bytes;
        std::memcpy(&bytes, text + from, 8);
        return WidenLow(Pair(bytes, 0));
    };
    return Mask(And(Equal16(eight(0), Load(stored)), Equal16(eight(2), Load(stored + 2)))) == 0xFFFF;
}
using WideText = PlainText<wchar_t>;
using AsciiText = PlainText<unsigned char>;

// UTF-8 whose sequences are all good.
struct Utf8Text {
    const Key& key;
    const unsigned char* text;
    std::size_t bytes;

    int Compare(const wchar_t* stored) const { return CompareAs<false>(stored); }
    int CompareFolded(const wchar_t* stored) const { return CompareAs<true>(stored); }
    bool IsCaseless(const wchar_t* stored) const { return pool::IsCaseless(key, stored, kComparedUnits); }
    std::size_t Units() const { return key.length; } // a character above FFFF counts 2
    bool Write(wchar_t* out) const { return detail::ConvertUtf8(text, detail::MeasureUtf8(text, bytes), out); }

private:
    template <bool folded> int CompareAs(const wchar_t* stored) const {
        wchar_t first[kComparedUnits + 1], *end = first; // one more: a pair may begin at the last place
        for (const unsigned char* in = text; in < text + bytes && end < first + kComparedUnits;) {
            ulong32 value;
            detail::StepUtf8(value, in);
            if (!detail::EncodeUtf16(end, value)) break;
        }
        return CompareFirstUnits<folded>(first, static_cast<std::size_t>(end - first), stored);
    }
};

// An entry's own text.
struct StoredText {
    Key key;
    const wchar_t* text;

    StoredText(const Key& known, const wchar_t* stored) : key(known), text(stored) {}
    explicit StoredText(const PoolEntry& entry)
        : key{entry.length, entry.utf8Size, entry.hash, entry.hashi}, text(entry.text) {}
    bool IsCaseless() const { return pool::IsCaseless(key, text, kComparedUnits); }
    int Compare(const wchar_t* stored) const { return CompareFirstUnits<false>(text, kComparedUnits, stored); }
    int CompareFolded(const wchar_t* stored) const { return CompareFirstUnits<true>(text, kComparedUnits, stored); }
};

} // namespace TAVO::String::pool
