// Linux: library names, UTF-8 as the code page, turns at the pool's lock, threads of the host's Boost.

#include "platform/platform.h"
#include "poollock.h"

#include <atomic>
#include <boost/thread/thread_only.hpp>
#include <chrono>
#include <cstring>
#include <gtest/gtest.h>
#include <sched.h>
#include <TAVO/threading.h>
#include <thread>

using namespace TAVO;
using namespace TAVO::Threading;

TEST(ConfigurationPath, DropsVersionDigits) {
    using Row = std::pair<const wchar_t*, std::size_t>;
    for (const auto& [path, stem] :
         {Row{L"/lib/libTAVO.so", 12}, Row{L"/lib/libTAVO.so.1.20.3", 12}, Row{L"/lib/a-1.2.so.3", 10}, Row{L"", 0},
          Row{L"/lib/libTAVO.1.2", 14}, Row{L"/lib/libTAVO.so.x1", 15}, Row{L"/a.b/lib", 0}, Row{L"/a.so.1/lib", 0}}) {
        std::size_t length = 0;
        while (path[length]) ++length;
        EXPECT_EQ(Platform::FindConfigurationStem(path, length), stem);
    }
}

TEST(CodePage, IsUtf8AndReplacesWhatHasNoForm) {
    const std::pair<const char*, const wchar_t*> rows[] = {
        {"\x7F\xC2\x80\xDF\xBF\xE0\xA0\x80\xED\x9F\xBF\xEE\x80\x80", L"\x7F\x80\x7FF\x800\xD7FF\xE000"},
        {"\xEF\xBF\xBF\xF0\x90\x80\x80\xF4\x8F\xBF\xBF", L"\xFFFF\xD800\xDC00\xDBFF\xDFFF"},
        {"a\x80z", L"a\xFFFDz"},
        {"\xC0\x80\xC1z\xE0\x9F\xBF", L"\xFFFD\xFFFD\xFFFDz\xFFFD\xFFFD\xFFFD"}, // overlong
        {"\xED\xA0\x80", L"\xFFFD\xFFFD\xFFFD"},                                 // surrogate
        {"\xF0\x8F\xBF\xBF", L"\xFFFD\xFFFD\xFFFD\xFFFD"},                       // overlong
        {"\xF4\x90\x80\x80\xF5", L"\xFFFD\xFFFD\xFFFD\xFFFD\xFFFD"},             // above the last
        {"\xE2\x82z\xF0\x9F\x98", L"\xFFFDz\xFFFD"},                             // one for a start that is cut short
    };
    wchar_t wide[16];
    char narrow[32];
    for (const auto& [utf8, units] : rows) {
        ASSERT_GT(Platform::AnsiToWide(utf8, -1, wide, 16), 0);
        EXPECT_STREQ(wide, units) << utf8;
        Platform::WideToAnsi(units, -1, narrow, 32);
        EXPECT_EQ(std::strcmp(narrow, utf8) == 0, units[0] != L'a' && units[0] != 0xFFFD) << "these lose something";
    }
    EXPECT_EQ(Platform::WideToAnsi(L"\xD83D\xDE00", 1, narrow, 8), 3) << "a length that cuts a pair";
    ASSERT_EQ(Platform::WideToAnsi(L"\xDC00\xD800", -1, narrow, 32), 7);
    EXPECT_STREQ(narrow, "\xEF\xBF\xBD\xEF\xBF\xBD");
    EXPECT_EQ(Platform::AnsiToWide("\xF0\x9F\x98\x80", 4, wide, 1), 0) << "a pair needs two";
    EXPECT_EQ(Platform::AnsiToWide("\xF0\x9F\x98\x80", 4, wide, 2), 2);
}

// On one processor, where the scheduler does as told: a thread that leaves the lock only to take it again. The other,
// of the lowest class, never runs in between, so without being handed the lock over it would wait for ever.
TEST(PoolLock, IsHandedOverToASleeper) {
    String::pool::Lock lock;
    std::atomic<bool> held{false};
    std::atomic<int> turns{0};
    const auto onOneProcessor = [](auto body) {
        return std::thread([=] {
            cpu_set_t allowed;
            sched_getaffinity(0, sizeof allowed, &allowed);
            for (int i = 0; CPU_COUNT(&allowed) > 1; ++i) CPU_CLR(i, &allowed);
            sched_setaffinity(0, sizeof allowed, &allowed);
            body();
        });
    };
    constexpr int kNever = 600; // some ten do, more on a busy machine, since the sleeper runs when nobody else wants to
    int holds = 0;
    auto greedy = onOneProcessor([&] {
        lock.Enter();
        held = true;
        for (; turns < 5 && holds < kNever; ++holds) {
            std::this_thread::sleep_for(std::chrono::milliseconds(5));
            lock.Leave();
            lock.Enter();
        }
        lock.Leave();
    });
    while (!held) std::this_thread::yield();
    auto sleeper = onOneProcessor([&] {
        const sched_param parameters{};
        sched_setscheduler(0, SCHED_IDLE, &parameters);
        for (; turns < 5; ++turns) lock.Enter(), lock.Leave();
    });
    greedy.join();
    sleeper.join();
    EXPECT_LT(holds, kNever);
}

// Threads that a host started with the Boost that the library uses, too.
TEST(ForeignThread, IsNotInterruptedByWaits) {
    bool asked = false;
    const CPEvent event(false);
    boost::thread host([&] {
        event.Wait(WaitForever);
        EXPECT_EQ(event.Wait(2), WaitTimedOut);
        CurrentThread::sleep(2);
        asked = boost::this_thread::interruption_requested();
    });
    host.interrupt();
    event.Set();
    host.join();
    EXPECT_TRUE(asked) << "still to be answered by the host";
}
