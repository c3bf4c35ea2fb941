// Reads the clips of a timeline document, prints them as an edit list, and sums their durations, each system by itself.
//
//     example_edit_list examples/data/timeline.xml

#include <cstdio>
#include <TAVO/string.h>
#include <TAVO/timecode.h>
#include <TAVO/xml.h>

using namespace TAVO::String;
using namespace TAVO::TimeCode;
using namespace TAVO::XML;
using TAVO::ulong32;

constexpr ulong32 kSystems = 14;

// The UTF-8 form of a pooled string is kept with it, for as long as somebody holds it.
static const char* Utf8(const CPPoolString& text) {
    return reinterpret_cast<const char*>(static_cast<const unsigned char*>(text));
}

// The fixed text form, whose separators tell the system.
struct Fixed {
    CUTF8Char text;
    explicit Fixed(const timecode& value) : text(SZTC(value).text) {}
    operator const char*() const { return reinterpret_cast<const char*>(*text); }
};

// Reads "01:03:49;10" and its rate "30000/1001". In these documents ';' marks drop frame, and the rate never tells.
static timecode Read(const CPPoolString& label, const CPPoolString& rate) {
    unsigned hh, mm, ss, ff, num, den;
    char separator;
    if (std::sscanf(Utf8(label), "%2u:%2u:%2u%c%2u", &hh, &mm, &ss, &separator, &ff) != 5) return timecode();
    if (std::sscanf(Utf8(rate), "%u/%u", &num, &den) != 2) return timecode();
    const ulong32 system = timecode::GetTCSystemOf(num, den);
    return timecode(static_cast<TAVO::long32>(hh), mm, ss, ff,
                    separator == ';' ? timecode::GetDFSystem(system) : system); // tests every field
}

int main(int argc, char** argv) {
    CXMLDoc document;
    if (argc != 2 || !document.OpenDocFile(CACFWChar(argv[1]), XMLEncodingAutomatic)) {
        std::puts("give the name of a timeline document");
        return 2;
    }
    const CPXMLObject root = document.GetRootElement();
    const CPXMLObject* bins = root.FindFirstElement(L"bins");
    if (!bins) return 1;

    // The clips one after the other on a reel of 25 frames a second, each as long as it really lasts.
    timecode record(10, 0, 0, 0, eSystemPAL);
    const timecode begin = record;
    timecode totals[kSystems];
    unsigned clips[kSystems] = {}, events = 0;
    const CPPoolString binName = L"bin", clipName = L"clip", name = L"name", rate = L"rate", start = L"start",
                       duration = L"duration";
    for (const CPXMLObject* bin = bins->FindNextElement(binName, nullptr); bin;
         bin = bins->FindNextElement(binName, bin))
        for (const CPXMLObject* clip = bin->FindNextElement(clipName, nullptr); clip;
             clip = bin->FindNextElement(clipName, clip)) {
            const timecode in = Read(clip->FindAttribute(start), clip->FindAttribute(rate));
            const timecode length = Read(clip->FindAttribute(duration), clip->FindAttribute(rate));
            if ((in + length).sys() >= kSystems || !length.IsAssigned()) {
                std::printf("%s has no valid timecode\n", Utf8(clip->FindAttribute(name)));
                return 1;
            }
            totals[length.sys()] += length; // the first one replaces the unassigned value
            ++clips[length.sys()];
            const timecode next = record + length.XlatedToSystem(eSystemPAL).Align();
            std::printf("%03u %s %s %s %s  %s\n", ++events, static_cast<const char*>(Fixed(in)),
                        static_cast<const char*>(Fixed(in + length)), static_cast<const char*>(Fixed(record)),
                        static_cast<const char*>(Fixed(next)), Utf8(clip->FindAttribute(name)));
            record = next;
        }

    double seconds = 0;
    unsigned summed = 0;
    for (ulong32 system = 0; system < kSystems; ++system) {
        if (!totals[system].IsAssigned()) continue;
        const double real = totals[system];
        seconds += real;
        summed += clips[system];
        std::printf("%-10s %3u clips %s  %9.3f s\n",
                    reinterpret_cast<const char*>(*CUTF8Char(timecode::GetSystemString(system))), clips[system],
                    static_cast<const char*>(Fixed(totals[system])), real);
    }
    const double reel = record - begin;
    std::printf("%u events, %.3f s in all, %.3f s on the reel\n", events, seconds, reel);

    // Every clip was summed, and rounding to frames moved each by half a frame at most.
    const double slack = 0.02 * events;
    return events > 0 && summed == events && reel > seconds - slack && reel < seconds + slack ? 0 : 1;
}
