// A host that works for a long time: strings, documents, locks, events, threads and maintenance requests on every
// processor, while the library sweeps its pool. At the end everything is as at the beginning: the pool empty and sound,
// the memory steady, and the last of the time as fast as the rest.
//
// Usage: tavo_soak SECONDS

#include "loading/loading.h"

#include <algorithm>
#include <atomic>
#include <cstdio>
#include <cstdlib>
#include <ctime>
#include <random>
#include <string>
#include <TAVO/maintenance.h>
#include <TAVO/string.h>
#include <TAVO/threading.h>
#include <TAVO/xml.h>
#include <thread>
#include <vector>

namespace {

using namespace TAVO;
using String::CPPoolString;
using String::CStringPool;

std::atomic<bool> g_stop{false};
std::atomic<unsigned long long> g_jobs{0};

// Texts of which some are met again and again and some seldom; few enough for sweeps of 10 ms every 10 seconds.
CPPoolString SomeText(std::mt19937& random) {
    char text[48];
    const unsigned range = 1u << (random() % 17);
    std::snprintf(text, sizeof(text), random() % 2 ? "Clip %u" : "marker_%u_of_a_longer_text",
                  static_cast<unsigned>(random()) % range);
    return CPPoolString(text);
}

void Documents(std::mt19937& random) {
    std::string document = "<timeline>";
    for (int i = 0; i < 50; ++i)
        document += "<clip name='Clip " + std::to_string(random() % 10000) + "' rate='25'><in>01:00:00:00</in></clip>";
    document += "</timeline>";
    XML::CXMLDoc doc;
    Buffers::CPPlainMemory written;
    if (!doc.OpenDocText(document.data(), document.size())) std::abort();
    if (!doc.GetRootElement().Write(written, XML::XMLEncodingUTF8, true)) std::abort();
}

struct Request final : Maintenance::IMaintenanceRequest {
    std::atomic<unsigned> runs{0};
    const wchar_t* GetName() override { return L"soak"; }
    unsigned long long GetDueTime() override { return runs ? ~0ull : 0; }
    std::int32_t GetPriority() override { return 0; }
    void Run() override { ++runs; }
};

void Requests() {
    const Maintenance::CPRequest<Request> request;
    if (!Maintenance::RegisterRequest(request) || !Maintenance::UnregisterRequest(request)) std::abort();
}

struct Pulse {
    static constexpr _acfUID uid = {0x0B8F3F6E, 0x6C1D, 0x4E0A, {0xA2, 0x77, 0x5B, 0x10, 0xC4, 0x39, 0xD8, 0x62}};
    static Threading::CPEvent event;
    void Run(unsigned long long) { event.Set(); }
};
Threading::CPEvent Pulse::event{false};

void Threads() {
    Threading::CPThread thread;
    if (!thread.Execute(Threading::CThreadWrapper<Pulse>::Create(), 0)) std::abort();
    if (Pulse::event.Wait(60000) != 0 || thread.Wait(Threading::WaitForever) != 0) std::abort();
}

void Work(unsigned seed) {
    std::mt19937 random(seed);
    std::vector<CPPoolString> held(5000);
    Threading::CPRWInterlock lock;
    while (!g_stop) {
        for (int i = 0; i < 5000; ++i) {
            held[random() % held.size()] = SomeText(random);
            lock.Enter();
            lock.Leave();
        }
        Documents(random);
        Requests();
        if (seed == 0) Threads();
        ++g_jobs;
    }
}

double CpuSeconds() { return static_cast<double>(std::clock()) / CLOCKS_PER_SEC; }

void Report(const char* moment, double rate) {
    std::printf("%-12s %8.1f jobs per processor second %10llu strings %8zu KiB\n", moment, rate,
                CStringPool::GetNItems(), loading::PrivateBytes() >> 10);
    std::fflush(stdout);
}

int Fail(const char* what) {
    std::printf("FAILED: %s\n", what);
    return 1;
}

} // namespace

int main(int argc, char** argv) {
    const int seconds = argc > 1 ? std::atoi(argv[1]) : 60;
    if (!AppInit()) return Fail("start");
    const auto entries = CStringPool::GetNItems();
    std::vector<std::thread> workers;
    for (unsigned i = 0; i < std::max(2u, std::thread::hardware_concurrency()); ++i) workers.emplace_back(Work, i);

    std::vector<double> rates;
    std::vector<std::size_t> memory;
    for (int tenth = 1; tenth <= 10; ++tenth) {
        const auto jobs = g_jobs.load();
        const double cpu = CpuSeconds();
        std::this_thread::sleep_for(std::chrono::milliseconds(seconds * 100));
        rates.push_back(static_cast<double>(g_jobs - jobs) / (CpuSeconds() - cpu));
        memory.push_back(loading::PrivateBytes());
        Report((std::to_string(tenth * 10) + " %").c_str(), rates.back());
    }
    g_stop = true;
    for (auto& worker : workers) worker.join();

    // The library's own sweeps: the first comes after 20 seconds at most, the second 20 later; large pools take
    // several.
    for (int waited = 0; waited < 180 && CStringPool::GetNItems() > entries; ++waited)
        std::this_thread::sleep_for(std::chrono::seconds(1));
    Report("at rest", 0);
    const bool swept = CStringPool::GetNItems() <= entries;
    const bool sound = CStringPool::Verify();
    AppExit();
    if (!swept) return Fail("strings are left");
    if (!sound) return Fail("the pool is damaged");
    const double latest = *std::max_element(rates.end() - 3, rates.end()); // a busy machine slows single ones down
    std::nth_element(rates.begin(), rates.begin() + 5, rates.end());
    if (latest < 0.7 * rates[5]) return Fail("it has become slower");
    if (memory.back() > memory[2] + memory[2] / 10) return Fail("memory grows");
    std::printf("sound, swept, steady\n");
    return 0;
}
