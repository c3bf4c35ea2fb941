// Windows: the assertion box, answered by a helper thread.

#include "support/machine.h"

#include <atomic>
#include <gtest/gtest.h>
#include <string>
#include <thread>
#include <windows.h>

namespace {

using Box = bool (*)(const char*, const char*);

// Waits for a box of that caption, keeps its text and presses the button.
std::string Answer(const char* caption, WPARAM button) {
    for (int i = 0; i < 1000; ++i) {
        if (HWND window = FindWindowA("#32770", caption)) {
            char text[256] = "";
            GetWindowTextA(GetDlgItem(window, 0xFFFF), text, sizeof text);
            PostMessageA(window, WM_COMMAND, button, 0);
            return text;
        }
        Sleep(10);
    }
    return "no box";
}

} // namespace

TEST(AssertBox, TellsWhatTheUserChose) {
    const support::LibraryCopy copy("Boxed", "[Debug]\r\nAssertBox=1\r\n");
    ASSERT_TRUE(copy.IsLoaded());
    const auto box = copy.Find<Box>("_ZN4TAVO7Develop2OS6RTABoxEPKcS3_");
    ASSERT_NE(box, nullptr);
    for (const WPARAM button : {IDOK, IDCANCEL}) {
        const std::string caption = "assertion " + std::to_string(button);
        std::string seen;
        std::thread user([&] { seen = Answer(caption.c_str(), button); });
        const bool cancelled = box(caption.c_str(), "m_count > 0");
        user.join();
        EXPECT_EQ(cancelled, button == IDCANCEL);
        EXPECT_EQ(seen, "m_count > 0");
    }
}

TEST(AssertBox, OneAtATimeOnDifferentThreads) {
    const support::LibraryCopy copy("Boxed", "[Debug]\r\nAssertBox=1\r\n");
    ASSERT_TRUE(copy.IsLoaded());
    const auto box = copy.Find<Box>("_ZN4TAVO7Develop2OS6RTABoxEPKcS3_");
    std::atomic<int> answered{0};
    std::thread first([&] {
        box("first box", "x");
        ++answered;
    });
    while (!FindWindowA("#32770", "first box")) Sleep(10);
    std::thread second([&] {
        box("second box", "x");
        ++answered;
    });
    Sleep(200); // a second box would be there by now
    EXPECT_EQ(FindWindowA("#32770", "second box"), nullptr);
    Answer("first box", IDOK);
    EXPECT_EQ(Answer("second box", IDOK), "x");
    first.join();
    second.join();
    EXPECT_EQ(answered, 2);
}
