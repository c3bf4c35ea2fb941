#pragma once
// Timecode systems and positions as they are given on the command line.

#include <string>
#include <TAVO/timecode.h>

namespace tool {

using TAVO::ulong32;
using TAVO::TimeCode::timecode;

constexpr ulong32 kSystems = 14;
constexpr ulong32 kAnySystem = TAVO::TimeCode::kUnassigned; // the text has to tell

std::string NameOf(ulong32 system);
std::string RateOf(ulong32 system);       // "30000/1001"
std::string SeparatorsOf(ulong32 system); // behind hours, minutes and seconds: three characters
ulong32 FrameLimit(ulong32 system);       // frame numbers within a second are below it

// The labels that a system skips: the first frames of every minute but each `period`-th. 0 frames when it skips none.
struct DropRule {
    ulong32 frames, period;
};
DropRule DropRuleOf(ulong32 system);

// By name ("NTSC(DF)", in any case), code ("2") or rate. A rate that two systems share must say which one is meant,
// "30000/1001/D" with and "30000/1001/ND" without drop frame. False after complaining. An empty text leaves `system`.
bool FindSystem(const std::string& text, ulong32& system);

// Warns of a system that is only ours, once.
void WarnOf(ulong32 system);

// What a text says: a position, or a flagged value and the reason.
struct Reading {
    timecode value;
    std::string reason; // begins in lower case, names the character or field; empty for a position

    bool IsPosition() const { return reason.empty(); }
    const char* Verdict() const; // "valid", "invalid" or "unassigned"
};

// Reads the universal form, the fixed form, or a count with its unit ("1200", "1200bu", "25frames", "50fields",
// "1.5s"). With a system, the fixed form may have that system's separators or colons throughout, and for a drop-frame
// system a
// ';' before the frames; and the universal form's rate must be that system's.
Reading ReadPosition(const std::string& text, ulong32 system = kAnySystem);

// Whether the text is a count, which does not tell its system.
bool IsCount(const std::string& text);

// The text in quotes for a message: what is long is cut, what is no UTF-8 replaced.
std::string Named(const std::string& text);
// Valid UTF-8 whatever the text.
std::string Cleaned(const std::string& text);

} // namespace tool
