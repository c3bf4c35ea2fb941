// Stores numbers, rates, positions, identifiers, flags and bytes in elements, and reads them back.

#include <cstdio>
#include <cstring>
#include <TAVO/acf.h>
#include <TAVO/xml.h>

using namespace TAVO;
using namespace TAVO::XML;

// Bits of a set and the names that files have for them.
enum Tracks : ulong32 { kVideo = 1, kAudio = 2, kTitles = 4 };
constexpr tagXMLFLAGMAP kTrackNames[] = {{kVideo, L"video"}, {kAudio, L"audio"}, {kTitles, L"titles"}};
constexpr std::size_t kTrackCount = sizeof kTrackNames / sizeof *kTrackNames;

int main() {
    // The type of the value picks the text; every writer can fail, for a bad name or without memory.
    const TimeCode::timecode start(10, 0, 0, 0, TimeCode::eSystemPAL);
    const ACF::cacfuid id(L"15603CD4-AB81-4D6F-B05F-C6BEA760A789");
    const unsigned char key[] = {0x12, 0xAB};
    CPXMLObject clip;
    if (!clip.SetName(L"clip") || !clip.AddAttribute(L"id", id) || !clip.AddAttribute(L"locked", true)) return 1;
    if (!clip.AddTag(L"rate", Math::CRational(30000, 1001)) || !clip.AddTag(L"start", start)) return 1;
    if (!clip.AddTag(L"gain", -4.5) || !clip.AddTag(L"size", 3896712182ULL) || !clip.AddTag(L"key", key, 2)) return 1;
    if (!clip.AddTag(L"tracks", kVideo | kTitles, kTrackNames, kTrackCount, L' ')) return 1;
    // Plain integers do not compile, since 16 could mean "16" or "10": say which.
    if (!clip.AddTag(L"channels", String::CPPoolString(16))) return 1;

    Buffers::CPPlainMemory text;
    if (!clip.Write(text, XMLEncodingUTF8, true)) return 1;
    std::fputs(static_cast<const char*>(static_cast<void*>(text)), stdout);

    // Readers take a default for what is missing or does not read as such a value.
    if (!acfIsSame(clip.FindAttributeGUID(L"id"), id) || !clip.FindAttributeBool(L"locked")) return 1;
    if (!(clip.FindElementRational(L"rate") == Math::CRational(30000, 1001))) return 1;
    if (clip.FindElementTimecode(L"start") != start || clip.FindElementInt(L"channels") != 16) return 1;
    if (clip.FindElementFlags(L"tracks", kTrackNames, kTrackCount, L' ') != (kVideo | kTitles)) return 1;
    if (clip.FindElementInt(L"rating", -1) != -1 || clip.FindElementInt(L"tracks", -1) != -1) return 1;
    // What stands behind a value is not looked at: "10:00:00:00 {25/1}Hz" begins with a number.
    if (clip.FindElementInt(L"start", -1) != 10) return 1;

    // A double keeps every bit, and is read with EDouble; Double is for decimal texts that other programs wrote.
    CPXMLObject other;
    if (!other.SetName(L"gain") || !other.Add(L"-4.5") || other.GetDataDouble() != -4.5) return 1;
    if (clip.FindElementEDouble(L"gain") != -4.5) return 1;

    // Bytes are read into a buffer of the caller's.
    unsigned char read[2];
    const CPXMLObject* stored = clip.FindFirstElement(L"key");
    if (!stored || stored->GetDataBinarySize() != sizeof read || !stored->GetDataBinary(read, sizeof read)) return 1;
    return std::memcmp(read, key, sizeof key) == 0 ? 0 : 1;
}
