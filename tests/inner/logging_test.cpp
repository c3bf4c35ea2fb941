// The assertion lock and the prefix of a line.

#include "logging.h"

#include <gtest/gtest.h>
#include <mutex>
#include <thread>

using namespace TAVO::Develop;

TEST(AssertionLock, IsRecursiveAndExcludesOthers) {
    AssertionLock lock;
    std::atomic<bool> left{false};
    for (int level = 0; level < 2; ++level) lock.lock();
    std::thread other([&] {
        const std::lock_guard guard(lock);
        EXPECT_TRUE(left);
    });
    lock.unlock();
    std::this_thread::sleep_for(std::chrono::milliseconds(30)); // one level is still held
    left = true;
    lock.unlock();
    other.join();
}

TEST(Prefix, HasTheFixedForm) {
    wchar_t out[kPrefixUnits + 1];
    FormatPrefix(out, 1.2346, FindLevelLabel(acfDebugFull), L"host", "a/b", -7);
    EXPECT_STREQ(out, L"   1.235 [FULL   ] [host] [] {[file:a/b] [line:-7]} ");
    out[kPrefixUnits] = L'#';
    FormatPrefix(out, 0, L"INFO   ", L"c", std::string(1000, 'x').c_str(), 1);
    EXPECT_TRUE(out[kPrefixUnits - 2] == L'x' && out[kPrefixUnits - 1] == 0) << "511 units are kept";
    EXPECT_EQ(out[kPrefixUnits], L'#');
    for (int level : {0, 3, 32, -2}) EXPECT_EQ(FindLevelLabel(static_cast<_acfDebugLevel>(level)), nullptr);
}
