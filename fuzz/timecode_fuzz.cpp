// Timecode texts: any text gives one of the forms, a form is read as what it says, and nothing behind the end is
// touched. Input: 16-bit units, used as free text and put into the characters of both forms as they are.

#include "require.h"

#include <algorithm>
#include <cstdint>
#include <cstring>
#include <TAVO/timecode.h>
#include <vector>

namespace {

using namespace TAVO;
using namespace TAVO::TimeCode;

bool SameText(const wchar_t* a, const wchar_t* b) {
    while (*a && *a == *b) ++a, ++b;
    return *a == *b;
}

// A record read from text composes to a count whose own label says the same, unless its numbers are out of range.
void CheckRecord(const TCINFO& record) {
    if (!record.IsDefined()) {
        Require(static_cast<long long>(record) == 0 && record.hh() + record.mm() + record.ss() + record.ff() == 0);
        return;
    }
    Require(record.hh() < 100 && record.mm() < 100 && record.ss() < 100 && record.ff() < 100);
    const long32 hours = static_cast<long32>(record.hh());
    const TCINFO strict(hours, record.mm(), record.ss(), record.ff(), record.sys());
    if (!strict.IsDefined()) return;
    const long long magnitude = strict;
    Require(static_cast<long long>(record) == (record.dd() < 0 ? -magnitude : magnitude));
    const TCINFO label(magnitude, record.sys());
    Require(label.ff() == strict.ff() && label.ss() == strict.ss() && label.mm() == strict.mm() &&
            label.hh() == strict.hh() && label.dd() == strict.dd());
}

template <class Text> Text Holding(const std::vector<wchar_t>& units) {
    Text text;
    std::fill(std::begin(text.text), std::end(text.text), L'\0');
    std::copy_n(units.begin(), std::min(units.size(), std::size(text.text)), text.text);
    return text;
}

} // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    std::vector<wchar_t> units(size / 2);
    if (size > 1) std::memcpy(units.data(), data, size / 2 * 2);

    CheckRecord(TCINFO(Holding<SZTC>(units)));
    const timecode value = Holding<SZUTC>(units);
    Require(timecode::NormalizeSystem(value.sys()) == value.sys());

    units.push_back(0);
    const SZTC fixed(units.data());
    Require(fixed.text[12] == 0 && SameText(SZTC(fixed.text).text, fixed.text));
    const TCINFO record(fixed);
    CheckRecord(record);
    if (record.IsDefined()) Require(SameText(SZTC(record).text, fixed.text));

    const SZUTC exchange(units.data());
    const timecode exchanged = exchange;
    const bool isShown = exchange.text[0] != 0 && exchange.text[0] != L'-';
    // "PAL(PX)" writes a "/D" that it does not read.
    if (isShown)
        Require(exchanged.IsAssigned() || std::find(exchange.text, exchange.text + 48, L'D') != exchange.text + 48);
    return 0;
}
