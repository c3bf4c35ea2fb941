// tavo tc

#include "commands.h"
#include "facts.h"
#include "position.h"
#include "streams.h"
#include "text.h"

namespace tool {

using namespace TAVO::TimeCode;
using TAVO::long32;

namespace {

// The position that a text says; false, after complaining, when it says none.
bool Need(const std::string& text, ulong32 system, timecode& value) {
    const Reading reading = ReadPosition(text, system);
    if (!reading.IsPosition()) {
        Complain(Named(text) + " is " + reading.Verdict() + ": " + reading.reason);
        return false;
    }
    value = reading.value;
    WarnOf(value.sys());
    return true;
}

long long CountOf(const timecode& value) { return value; }

std::string SystemJson(ulong32 system) {
    return "{\"code\":" + std::to_string(system) + ",\"name\":" + Quoted(NameOf(system)) + '}';
}

std::string FixedText(const timecode& value) { return Shown(SZTC(value).text, Pairs::Standard); }

// In fields or frames, halves away from zero; the library's own numbers have 32 bits and would wrap.
std::string In(const timecode& value, ulong32 unit) {
    const long long count = value;
    const long long rest = count % unit, nearest = count / unit;
    const bool up = 2 * (rest < 0 ? -rest : rest) >= static_cast<long long>(unit);
    return std::to_string(nearest + (up ? (count < 0 ? -1 : 1) : 0));
}

Facts Describe(const timecode& value) {
    const ulong32 system = value.sys();
    ulong32 hh = 0, mm = 0, ss = 0, ff = 0;
    int sign = 1;
    const TCINFO record(value);
    record.GetInfo(&hh, &mm, &ss, &ff, &sign, nullptr);
    Facts facts;
    facts.Add("system", SystemJson(system), std::to_string(system) + ' ' + NameOf(system));
    facts.Add("count", std::to_string(CountOf(value)));
    facts.Add("fields", In(value, timecode::GetFieldBU(system)));
    facts.Add("frames", In(value, timecode::GetFrameBU(system)));
    facts.Add("whole frames", value.AssertAligned());
    facts.Add("seconds", Decimal(static_cast<double>(value)));
    facts.Add("sign", std::to_string(sign));
    facts.Add("days", std::to_string(record.dd() < 0 ? -1 - record.dd() : record.dd()));
    facts.Add("hh", std::to_string(record.hh()));
    facts.Add("mm", std::to_string(mm));
    facts.Add("ss", std::to_string(ss));
    facts.Add("ff", std::to_string(ff));
    facts.AddText("fixed text", FixedText(value));
    facts.AddText("universal text", Shown(SZUTC(value).text, Pairs::Standard));
    return facts;
}

int PrintPosition(const timecode& value, bool json) {
    const Facts facts = Describe(value);
    Print(json ? facts.Json() + '\n' : facts.Lines());
    return kFine;
}

std::string RuleText(const DropRule& rule) {
    if (rule.frames == 0) return "none";
    return "00 to 0" + std::to_string(rule.frames - 1) + ", not each " + std::to_string(rule.period) + "th minute";
}

std::string SystemJsonRow(ulong32 system) {
    const DropRule rule = DropRuleOf(system);
    Facts facts;
    facts.Add("code", std::to_string(system));
    facts.AddText("name", NameOf(system));
    facts.AddText("rate", RateOf(system));
    facts.Add("frame units", std::to_string(timecode::GetFrameBU(system)));
    facts.Add("field units", std::to_string(timecode::GetFieldBU(system)));
    facts.Add("unit seconds", Decimal(timecode::BULen(system)));
    facts.Add("drop", rule.frames == 0 ? "null"
                                       : "{\"frames\":" + std::to_string(rule.frames) +
                                             ",\"period\":" + std::to_string(rule.period) + '}');
    facts.AddText("separators", SeparatorsOf(system));
    return facts.Json();
}

// A sum or difference.
int PrintSum(const TcSumOptions& options, bool subtract) {
    ulong32 system = kAnySystem;
    timecode left, right;
    if (!FindSystem(options.system, system)) return kUsage;
    if (!Need(options.left, system, left)) return kBadInput;
    if (system == kAnySystem && IsCount(options.right)) system = left.sys();
    if (!Need(options.right, system, right)) return kBadInput;
    if (timecode::BULen(left.sys()) != timecode::BULen(right.sys()))
        Complain("note: base units of " + NameOf(left.sys()) + " and of " + NameOf(right.sys()) +
                 " last differently in real time; their counts are taken together as they are");
    const timecode result = subtract ? left - right : left + right;
    if (!result.IsDefined()) {
        Complain("the result does not fit 64 bits of base units");
        return kBadInput;
    }
    return PrintPosition(result, options.json);
}

// The first label of the first minute: where drop frame shows.
timecode MinuteOne(ulong32 system) { return timecode(0, 1, 0, DropRuleOf(system).frames, system); }

} // namespace

int TcSystems(const TcSystemsOptions& options) {
    if (options.json) {
        std::vector<std::string> rows;
        for (ulong32 system = 0; system < kSystems; ++system) rows.push_back(SystemJsonRow(system));
        Print(JsonArray(rows));
        return kFine;
    }
    constexpr const char* kRow = "%4s  %-10s  %10s  %5s  %5s  %-10s  %s\n";
    char line[160];
    std::snprintf(line, sizeof(line), kRow, "code", "name", "rate", "frame", "field", "separators", "skipped labels");
    Print(line);
    for (ulong32 system = 0; system < kSystems; ++system) {
        std::snprintf(line, sizeof(line), kRow, std::to_string(system).c_str(), NameOf(system).c_str(),
                      RateOf(system).c_str(), std::to_string(timecode::GetFrameBU(system)).c_str(),
                      std::to_string(timecode::GetFieldBU(system)).c_str(), SeparatorsOf(system).c_str(),
                      RuleText(DropRuleOf(system)).c_str());
        Print(line);
    }
    Print("Frames and fields are in base units of 1/1200 nominal second. No standard knows " + NameOf(eSystemHDFilmDF) +
          ".\n");
    return kFine;
}

int TcConvert(const TcConvertOptions& options) {
    ulong32 from = kAnySystem, to = kAnySystem;
    timecode value;
    if (!FindSystem(options.from, from) || !FindSystem(options.to, to)) return kUsage;
    if (!Need(options.text, from, value)) return kBadInput;
    WarnOf(to);
    const timecode result = options.align    ? value.AlignedToSystem(to)
                            : options.retime ? value.XlatedToSystem(to)
                                             : timecode(CountOf(value), to);
    if (!result.IsDefined()) {
        Complain(Named(options.text) + " does not fit 64 bits of base units in " + NameOf(to));
        return kBadInput;
    }
    return PrintPosition(result, options.json);
}

int TcAdd(const TcSumOptions& options) { return PrintSum(options, false); }
int TcSub(const TcSumOptions& options) { return PrintSum(options, true); }

int TcShow(const TcShowOptions& options) {
    ulong32 system = kAnySystem;
    timecode value;
    if (!FindSystem(options.system, system)) return kUsage;
    if (!Need(options.text, system, value)) return kBadInput;
    return PrintPosition(value, options.json);
}

int TcTable(const TcTableOptions& options) {
    ulong32 system = kAnySystem;
    timecode middle;
    if (!FindSystem(options.system, system)) return kUsage;
    if (options.text.empty() && system == kAnySystem) {
        Complain("a table needs a position or --system");
        return kUsage;
    }
    if (options.text.empty()) {
        WarnOf(system);
        middle = MinuteOne(system);
    } else if (!Need(options.text, system, middle)) {
        return kBadInput;
    }
    middle.Align();

    const auto frames = static_cast<long long>(options.frames);
    const auto frame = static_cast<long long>(middle.GetFrameBU());
    std::vector<std::string> rows;
    for (long long i = -frames; i <= frames; ++i) {
        const timecode value = middle + i * frame;
        if (!value.IsDefined()) continue; // beyond 64 bits
        if (options.json) {
            rows.push_back(Describe(value).Json());
            continue;
        }
        char line[160];
        std::snprintf(line, sizeof(line), "%+6lld  %14lld  %s  %s\n", i, CountOf(value), FixedText(value).c_str(),
                      Shown(SZUTC(value).text, Pairs::Standard).c_str());
        Print(line);
    }
    if (options.json) Print(JsonArray(rows));
    return kFine;
}

int TcCheck(const TcCheckOptions& options) {
    ulong32 system = kAnySystem;
    if (!FindSystem(options.system, system)) return kUsage;
    int worst = kFine;
    std::vector<std::string> rows;
    for (const std::string& text : options.texts) {
        const Reading reading = ReadPosition(text, system);
        const timecode& value = reading.value;
        if (reading.IsPosition())
            WarnOf(value.sys());
        else
            worst = kBadInput;
        if (options.json) {
            Facts facts;
            facts.AddText("text", Cleaned(text));
            facts.AddText("verdict", reading.Verdict());
            if (reading.IsPosition())
                facts.Add("position", Describe(value).Json());
            else
                facts.AddText("reason", reading.reason);
            rows.push_back(facts.Json());
            continue;
        }
        Print(Named(text) + ": " + reading.Verdict() +
              (reading.IsPosition() ? ", " + NameOf(value.sys()) + ", " + std::to_string(CountOf(value)) + " base units"
                                    : ": " + reading.reason) +
              '\n');
    }
    if (options.json) Print(JsonArray(rows));
    return worst;
}

} // namespace tool
