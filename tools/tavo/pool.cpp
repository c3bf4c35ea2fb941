// tavo pool stat

#include "commands.h"
#include "document.h"
#include "progress.h"
#include "streams.h"

#include <algorithm>
#include <string>
#include <TAVO/string.h>
#include <TAVO/threading.h>

namespace tool {

namespace {

using namespace TAVO;
using TAVO::String::CStringPool;

constexpr ulong32 kSweepBudget = 10000; // milliseconds

void PrintPool(const char* moment) {
    const auto entries = CStringPool::GetNItems();
    const auto bytes = CStringPool::GetSize();
    char line[160];
    std::snprintf(line, sizeof(line), "%-24s %12s strings %14s bytes %9.1f bytes each\n", moment,
                  Grouped(entries).c_str(), Grouped(bytes).c_str(),
                  entries ? static_cast<double>(bytes) / static_cast<double>(entries) : 0.0);
    Print(line);
}

// Looks on while the maintenance thread sweeps, until the pool is as it was at the start or the time is over.
bool Watch(unsigned seconds, unsigned long long entriesAtStart) {
    Print("watching the library's own sweeps\n");
    const auto begun = Core::OS::GetTimeNow();
    for (unsigned second = 1; second <= seconds; ++second) {
        const auto next = begun + second * 1000ull;
        for (auto now = begun; (now = Core::OS::GetTimeNow()) < next;)
            Threading::CurrentThread::sleep(static_cast<ulong32>(next - now));
        const bool back = CStringPool::GetNItems() <= entriesAtStart;
        PrintPool(("after " + std::to_string(second) + " s").c_str());
        std::fflush(stdout);
        if (back) return true;
    }
    return false;
}

} // namespace

int PoolStat(const PoolStatOptions& options) {
    const auto entriesAtStart = CStringPool::GetNItems();
    PrintPool("at the start");
    int worst = kFine;
    if (!options.files.empty()) {
        std::vector<CPXMLObject> trees;
        Progress progress("reading", options.files.size());
        for (const std::string& file : options.files) {
            progress.Step(file);
            Document document;
            worst = std::max(worst, document.Need(file));
            trees.push_back(document.Root());
        }
        progress.Hide();
        PrintPool("documents open");
    }
    if (!options.files.empty()) PrintPool("documents closed");
    if (options.watch) {
        if (!Watch(options.watch, entriesAtStart)) Print("strings were left when the time was over\n");
    } else {
        // The first sweep finds strings idle, the second lets them go.
        CStringPool::Collect(kSweepBudget);
        PrintPool("after one sweep");
        CStringPool::Collect(kSweepBudget);
        PrintPool("after two sweeps");
    }
    const bool intact = CStringPool::Verify();
    Print(intact ? "every string matches its key\n" : "the pool is damaged\n");
    return intact ? worst : kBadInput;
}

} // namespace tool
