// tavo pool stat

#include "commands.h"
#include "document.h"
#include "progress.h"
#include "streams.h"

#include <algorithm>
#include <TAVO/string.h>

namespace tool {

namespace {

using TAVO::String::CStringPool;

constexpr TAVO::ulong32 kSweepBudget = 10000; // milliseconds

void PrintPool(const char* moment) {
    const auto entries = CStringPool::GetNItems();
    const auto bytes = CStringPool::GetSize();
    char line[160];
    std::snprintf(line, sizeof(line), "%-24s %12s strings %14s bytes %9.1f bytes each\n", moment,
                  Grouped(entries).c_str(), Grouped(bytes).c_str(),
                  entries ? static_cast<double>(bytes) / static_cast<double>(entries) : 0.0);
    Print(line);
}

} // namespace

int PoolStat(const PoolStatOptions& options) {
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
    // The first sweep finds strings idle, the second lets them go.
    CStringPool::Collect(kSweepBudget);
    PrintPool("after one sweep");
    CStringPool::Collect(kSweepBudget);
    PrintPool("after two sweeps");
    const bool intact = CStringPool::Verify();
    Print(intact ? "every string matches its key\n" : "the pool is damaged\n");
    return intact ? worst : kBadInput;
}

} // namespace tool
