// Where the library leaves the textbook: every line is tried, and the program fails when one is not so.

#include "contract.h"

#include <cstdio>
#include <TAVO/core.h>

namespace contract {

static int g_wrong = 0;

static void Line(const char* form, const char* sentence, bool good) {
    std::printf(form, sentence, good ? "" : "   NOT SO");
    g_wrong += !good;
}
void Is(const char* rule, bool holds) { Line("  %s%s\n", rule, holds); }
void Instead(const char* way, bool works) { Line("      instead: %s%s\n", way, works); }

} // namespace contract

int main() {
    using namespace contract;
    const struct {
        const char* name;
        void (*show)();
    } areas[] = {{"Core", Core},
                 {"Memory", Memory},
                 {"Text", Text},
                 {"Pooled strings", PooledStrings},
                 {"Bytes as text", BytesAsText},
                 {"XML", Xml},
                 {"Fractions", Fractions},
                 {"Timecode", Timecode},
                 {"Files", Files},
                 {"URLs", Urls},
                 {"Threads", Threads},
                 {"Maintenance", Maintenance},
                 {"Components", Components}};
    for (const auto& area : areas) {
        std::printf("%s\n", area.name);
        area.show();
    }
    return g_wrong == 0 ? 0 : 1;
}
