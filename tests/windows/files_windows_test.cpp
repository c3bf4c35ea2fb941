// What only Windows can show about files: another process, attributes.

#include "support/scratch.h"
#include "support/sharing.h"

#include <windows.h>

using namespace TAVO::Files::OS;
using File = support::FileTest;

// Run by KindsThatOpenElsewhere as a process of its own.
TEST(FileSharingChild, DISABLED_OpensEveryKind) {
    wchar_t path[MAX_PATH];
    ASSERT_NE(GetEnvironmentVariableW(L"TAVO_SHARED_FILE", path, MAX_PATH), 0u);
    TerminateProcess(GetCurrentProcess(), support::KindsThatOpen(path));
}

unsigned support::KindsThatOpenElsewhere(const wchar_t* sharedFile) {
    SetEnvironmentVariableW(L"TAVO_SHARED_FILE", sharedFile);
    wchar_t program[MAX_PATH];
    GetModuleFileNameW(nullptr, program, MAX_PATH);
    wchar_t command[] = L"child --gtest_also_run_disabled_tests --gtest_filter=FileSharingChild.*";
    STARTUPINFOW start = {};
    start.cb = sizeof start;
    PROCESS_INFORMATION process;
    DWORD code = ~0u;
    if (!CreateProcessW(program, command, nullptr, nullptr, FALSE, 0, nullptr, nullptr, &start, &process)) return code;
    WaitForSingleObject(process.hProcess, 60000);
    GetExitCodeProcess(process.hProcess, &code);
    CloseHandle(process.hThread);
    CloseHandle(process.hProcess);
    return code;
}

TEST_F(File, LeaveOpenAndReadOnlyFilesAlone) {
    support::Put(path, "x");
    ASSERT_TRUE(file.Open(path, FileAccessRead, OpenFileExisting));
    EXPECT_FALSE(_DeleteFile(path));
    file.Close();
    SetFileAttributesW(path, FILE_ATTRIBUTE_READONLY);
    CDirectoryEnumerator listing;
    CFindData entry;
    ASSERT_TRUE(listing.BeginEnumerate(folder.Path(), L"FILE", true) && listing.GetNext(entry));
    EXPECT_TRUE(entry.isReadOnly());
    EXPECT_NE(entry.GetCreated(), 0u);
    listing.EndEnumerate();
    EXPECT_FALSE(_DeleteFile(path));
    SetFileAttributesW(path, FILE_ATTRIBUTE_NORMAL);
    EXPECT_TRUE(_DeleteFile(path));
}
