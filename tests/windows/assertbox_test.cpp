// Windows: the assertion box, answered by a helper thread.

#include "support/machine.h"

#include <gtest/gtest.h>
#include <thread>
#include <windows.h>

namespace {

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

TEST(AssertBox, TellsWhatTheUserChoseOneAtATime) {
    const support::LibraryCopy copy("Boxed", "[Debug]\r\nAssertBox=1\r\n");
    const auto box = copy.Find<bool (*)(const char*, const char*)>("_ZN4TAVO7Develop2OS6RTABoxEPKcS3_");
    ASSERT_NE(box, nullptr);
    bool cancelled[2] = {true, false};
    std::thread first([&] { cancelled[0] = box("first box", "m_count > 0"); });
    while (!FindWindowA("#32770", "first box")) Sleep(10);
    std::thread second([&] { cancelled[1] = box("second box", "x"); });
    Sleep(200); // a second box would be there by now
    EXPECT_EQ(FindWindowA("#32770", "second box"), nullptr);
    EXPECT_EQ(Answer("first box", IDOK), "m_count > 0");
    EXPECT_EQ(Answer("second box", IDCANCEL), "x");
    first.join();
    second.join();
    EXPECT_TRUE(!cancelled[0] && cancelled[1]);
}
