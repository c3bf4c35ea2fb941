#pragma once
// Documents for the XML benchmarks: generated, deterministic, of a wanted size.

#include <cstdint>
#include <cstdio>
#include <string>

namespace documents {

enum class Kind { Small, Deep, LongText, Repeated, Distinct, Scripts };

inline const char* Name(Kind kind) {
    switch (kind) {
    case Kind::Small:
        return "small elements";
    case Kind::Deep:
        return "deep";
    case Kind::LongText:
        return "long text";
    case Kind::Repeated:
        return "repeated values";
    case Kind::Distinct:
        return "distinct values";
    default:
        return "many scripts";
    }
}

// About `bytes` bytes of UTF-8.
inline std::string Make(Kind kind, std::size_t bytes) {
    std::string text = "<?xml version=\"1.0\" encoding=\"UTF-8\"?>\n<project version=\"4\">\n";
    text.reserve(bytes + 4096);
    char line[1024];
    std::uint32_t seed = 12345;
    const auto next = [&seed] { return seed = seed * 1664525 + 1013904223, seed >> 8; };
    if (kind == Kind::Deep) {
        std::size_t depth = 0;
        for (; text.size() < bytes * 6 / 11; ++depth) text += depth % 2 ? "<group>" : "<level>";
        while (depth-- > 0) text += depth % 2 ? "</group>" : "</level>";
    }
    for (unsigned i = 0; text.size() < bytes; ++i) {
        switch (kind) {
        case Kind::Small:
            std::snprintf(line, sizeof line,
                          "  <clip id=\"clip-%u\" enabled=\"true\" rate=\"%s\">\n    <name>Shot %u take %u</name>\n"
                          "    <start>%02u:%02u:%02u:%02u</start>\n    <duration>%u</duration>\n  </clip>\n",
                          i, i % 3 ? "30000/1001" : "25", i / 7, i % 7, i / 90000 % 24, i / 1500 % 60, i / 25 % 60,
                          i % 25, next() % 500);
            break;
        case Kind::LongText: {
            text += "  <note lang=\"en\">";
            for (int word = 0; word < 400; ++word) {
                for (unsigned letter = 0, letters = 2 + next() % 9; letter < letters; ++letter)
                    text += static_cast<char>('a' + next() % 26);
                text += ' ';
            }
            text += "end</note>\n";
            continue;
        }
        case Kind::Repeated:
            std::snprintf(line, sizeof line,
                          "  <event type=\"%s\" track=\"V%u\" status=\"locked\"><rate>30000/1001</rate><mode>%s</mode>"
                          "</event>\n",
                          i % 2 ? "cut" : "dissolve", next() % 8, i % 5 ? "linked" : "free");
            break;
        case Kind::Scripts: {
            static constexpr const char* kWords[] = {"Größe", "façade", "съешь", "ещё", "этих",
                                                     "булок", "日本語", "字幕",  "the", "end"};
            std::snprintf(line, sizeof line, "  <clip id=\"клип-%u\"><name>Сцена %u, дубль %u</name><note>", i, i / 7,
                          i % 7);
            text += line;
            for (unsigned words = i % 10 ? next() % 6 : 200; words; --words) (text += kWords[next() % 10]) += ' ';
            text += "—</note></clip>\n";
            continue;
        }
        default:
            std::snprintf(line, sizeof line, "  <asset id=\"%08x-%04x\"><uri>media/%08x/%u.mxf</uri></asset>\n", next(),
                          i & 0xFFFF, next() * 31, i);
        }
        text += line;
    }
    return text + "</project>\n";
}

} // namespace documents
