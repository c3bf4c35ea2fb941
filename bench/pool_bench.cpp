// Interning beside g_intern_string and a set behind a mutex; handles beside boost::intrusive_ptr.

#include <atomic>
#include <benchmark/benchmark.h>
#include <boost/smart_ptr/intrusive_ptr.hpp>
#include <boost/smart_ptr/intrusive_ref_counter.hpp>
#include <cstdio>
#include <mutex>
#include <string>
#include <TAVO/string.h>
#include <unordered_set>
#include <vector>
#if defined(TAVO_PEER_GLIB_2_0)
#include <glib.h>
#endif

namespace {

using TAVO::String::CPPoolString;
using TAVO::String::CStringPool;

// Clip names, in no order of their numbers.
std::vector<std::string> Names(std::size_t count) {
    std::vector<std::string> names;
    for (std::size_t i = 0; i < count; ++i) {
        char name[40];
        std::snprintf(name, sizeof name, "clip-%07u", static_cast<unsigned>(i * 7919 % 10000019));
        names.emplace_back(name);
    }
    return names;
}

const unsigned char* Utf8(const std::string& text) { return reinterpret_cast<const unsigned char*>(text.c_str()); }

void Sweep() {
    CStringPool::Collect(60000);
    CStringPool::Collect(60000);
}

// Interns present strings over and over. The peer's strings live for ever, so ours are kept too and let go untimed;
// the next one releases each at once.
void InternPresentTavo(benchmark::State& state) {
    const auto names = Names(state.range(0));
    std::vector<CPPoolString> present, kept;
    for (const auto& name : names) present.emplace_back(Utf8(name));
    kept.reserve(names.size());
    std::size_t i = state.thread_index() * names.size() / 2;
    for (auto _ : state) {
        kept.push_back(CStringPool::GetStringRef(Utf8(names[i])));
        if (++i == names.size()) i = 0;
        if (kept.size() == names.size()) {
            state.PauseTiming();
            kept.clear();
            state.ResumeTiming();
        }
    }
}
BENCHMARK(InternPresentTavo)->Arg(1000)->Arg(100000)->ThreadRange(1, 2)->UseRealTime();

void InternAndReleaseTavo(benchmark::State& state) {
    const auto names = Names(state.range(0));
    std::vector<CPPoolString> present;
    for (const auto& name : names) present.emplace_back(Utf8(name));
    std::size_t i = 0;
    for (auto _ : state) {
        benchmark::DoNotOptimize(CStringPool::GetStringRef(Utf8(names[i])));
        if (++i == names.size()) i = 0;
    }
}
BENCHMARK(InternAndReleaseTavo)->Arg(1000)->Arg(100000);

#if defined(TAVO_PEER_GLIB_2_0)
void InternPresentGlib(benchmark::State& state) {
    const auto names = Names(state.range(0));
    for (const auto& name : names) g_intern_string(name.c_str());
    std::size_t i = state.thread_index() * names.size() / 2;
    for (auto _ : state) {
        benchmark::DoNotOptimize(g_intern_string(names[i].c_str()));
        if (++i == names.size()) i = 0;
    }
}
BENCHMARK(InternPresentGlib)->Arg(1000)->Arg(100000)->ThreadRange(1, 2)->UseRealTime();
#endif

void InternNewTavo(benchmark::State& state) {
    const auto names = Names(state.range(0));
    std::vector<CPPoolString> made;
    made.reserve(names.size());
    for (auto _ : state) {
        for (const auto& name : names) made.push_back(CStringPool::GetStringRef(Utf8(name)));
        state.PauseTiming();
        made.clear();
        Sweep();
        state.ResumeTiming();
    }
    state.SetItemsProcessed(static_cast<std::int64_t>(state.iterations() * names.size()));
}
BENCHMARK(InternNewTavo)->Arg(1000)->Arg(100000)->Arg(1000000)->Unit(benchmark::kMicrosecond);

void InternNewSet(benchmark::State& state) {
    const auto names = Names(state.range(0));
    std::mutex mutex;
    std::vector<const std::string*> made;
    made.reserve(names.size());
    for (auto _ : state) {
        std::unordered_set<std::string> set;
        for (const auto& name : names) {
            const std::lock_guard lock(mutex);
            made.push_back(&*set.insert(name).first);
        }
        state.PauseTiming();
        made.clear();
        set = {};
        state.ResumeTiming();
    }
    state.SetItemsProcessed(static_cast<std::int64_t>(state.iterations() * names.size()));
}
BENCHMARK(InternNewSet)->Arg(1000)->Arg(100000)->Arg(1000000)->Unit(benchmark::kMicrosecond);

void CopyHandleTavo(benchmark::State& state) {
    const CPPoolString text(L"a text to share");
    for (auto _ : state) {
        CPPoolString copy(text);
        benchmark::DoNotOptimize(copy);
    }
}
BENCHMARK(CopyHandleTavo);

struct Counted : boost::intrusive_ref_counter<Counted, boost::thread_safe_counter> {
    int value = 0;
};
void CopyHandleBoost(benchmark::State& state) {
    const boost::intrusive_ptr<Counted> text(new Counted);
    for (auto _ : state) {
        boost::intrusive_ptr<Counted> copy(text);
        benchmark::DoNotOptimize(copy);
    }
}
BENCHMARK(CopyHandleBoost);

} // namespace
