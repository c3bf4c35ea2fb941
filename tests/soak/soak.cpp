// A host that works for a long time: strings, documents, locks, threads and maintenance requests on every processor,
// while the library sweeps its pool. At the end the pool is empty and sound, the memory was steady, and the last of the
// time as fast as the rest.
//
// Usage: tavo_soak SECONDS

#include "loading/loading.h"
#include "support/jobs.h"

#include <algorithm>
#include <cstdio>
#include <cstdlib>
#include <ctime>
#include <random>
#include <string>
#include <TAVO/maintenance.h>
#include <TAVO/string.h>
#include <TAVO/xml.h>

using namespace TAVO;
using String::CPPoolString;
using String::CStringPool;

namespace {

std::atomic<bool> g_stop{false};
std::atomic<unsigned> g_jobs{0};

// Texts of which some are met again and again and some seldom; few enough for sweeps of 10 ms every 10 seconds.
std::string SomeText(std::mt19937& random) {
    const std::string number = std::to_string(random() % (1u << random() % 17));
    return random() % 2 ? "Clip " + number : "marker_" + number + "_of_a_longer_text";
}

struct Request final : Maintenance::IMaintenanceRequest {
    const wchar_t* GetName() override { return L"soak"; }
    unsigned long long GetDueTime() override { return 0; }
    std::int32_t GetPriority() override { return 0; }
    void Run() override {}
};

void Work() {
    std::mt19937 random(++g_jobs);
    std::vector<CPPoolString> held(5000);
    const Threading::CPRWInterlock lock;
    for (; !g_stop; ++g_jobs) {
        std::string text = "<timeline>";
        for (int i = 0; i < 5000; ++i) {
            held[random() % held.size()] = CPPoolString(SomeText(random).c_str());
            lock.Enter();
            lock.Leave();
            if (i % 100 == 0) text += "<clip name='" + SomeText(random) + "'><in>01:00:00:00</in></clip>";
        }
        text += "</timeline>";
        XML::CXMLDoc document;
        Buffers::CPPlainMemory written;
        bool good = document.OpenDocText(text.data(), text.size()) &&
                    document.GetRootElement().Write(written, XML::XMLEncodingUTF8, true);
        const Maintenance::CPRequest<Request> request;
        good = good && Maintenance::RegisterRequest(request) && Maintenance::UnregisterRequest(request);
        const support::Job thread([&] { good = good && Threading::CPEvent(true).Wait(0) == Threading::WaitTimedOut; });
        if (!good) std::abort();
    }
}

double CpuSeconds() { return static_cast<double>(std::clock()) / CLOCKS_PER_SEC; }

} // namespace

int main(int argc, char** argv) {
    if (!AppInit()) return 1;
    const auto entries = CStringPool::GetNItems();
    std::vector<std::thread> workers;
    for (unsigned i = 0; i < std::max(2u, std::thread::hardware_concurrency()); ++i) workers.emplace_back(Work);
    std::vector<double> rates;
    std::vector<std::size_t> memory;
    for (int tenth = 1; tenth <= 10; ++tenth) {
        const double jobs = g_jobs, cpu = CpuSeconds();
        std::this_thread::sleep_for(std::chrono::milliseconds((argc > 1 ? std::atoi(argv[1]) : 60) * 100));
        rates.push_back((g_jobs - jobs) / (CpuSeconds() - cpu));
        memory.push_back(loading::PrivateBytes());
        std::printf("%3d %% %8.1f jobs per processor second %10llu strings %8zu KiB\n", tenth * 10, rates.back(),
                    CStringPool::GetNItems(), memory.back() >> 10);
        std::fflush(stdout);
    }
    g_stop = true;
    for (auto& worker : workers) worker.join();
    // The library's own sweeps: the first comes after 20 seconds at most, the second 20 later; large pools take
    // several.
    for (int waited = 0; waited < 180 && CStringPool::GetNItems() > entries; ++waited)
        std::this_thread::sleep_for(std::chrono::seconds(1));
    const bool swept = CStringPool::GetNItems() <= entries, sound = CStringPool::Verify();
    AppExit();
    const double latest = *std::max_element(rates.end() - 3, rates.end()); // a busy machine slows single ones down
    std::nth_element(rates.begin(), rates.begin() + 5, rates.end());
    const bool fast = latest >= 0.7 * rates[5], steady = memory.back() <= memory[2] + memory[2] / 10;
    std::printf("sound %d, swept %d, fast %d, steady %d\n", sound, swept, fast, steady);
    return sound && swept && fast && steady ? 0 : 1;
}
