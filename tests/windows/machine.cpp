#include "support/machine.h"

#include <cstdlib>
#include <windows.h>

namespace support {

const char* const kModuleEnding = ".dll";
const char* const kCopyEnding = ".dll";

std::filesystem::path LibraryPath() {
    wchar_t path[MAX_PATH] = L"";
    GetModuleFileNameW(GetModuleHandleW(L"TAVO.dll"), path, MAX_PATH);
    return path;
}

Module::Module(const std::filesystem::path& file) : m_module(LoadLibraryW(file.c_str())) {}
Module::~Module() {
    if (m_module) FreeLibrary(static_cast<HMODULE>(m_module));
}
void* Module::FindSymbol(const char*, const char* name) const {
    return m_module ? reinterpret_cast<void*>(GetProcAddress(static_cast<HMODULE>(m_module), name)) : nullptr;
}

namespace {

std::string ReadText(HANDLE process, const OUTPUT_DEBUG_STRING_INFO& info) {
    std::string text(info.nDebugStringLength, '\0');
    SIZE_T got = 0;
    ReadProcessMemory(process, info.lpDebugStringData, &text[0], text.size(), &got);
    return text.c_str(); // without the terminator, which was counted
}

// Takes the child's events until it ends.
std::string FollowChild(HANDLE process, int& exitCode) {
    std::string text;
    DEBUG_EVENT event;
    while (WaitForDebugEvent(&event, 60000)) {
        DWORD how = DBG_CONTINUE;
        const DWORD code = event.dwDebugEventCode;
        if (code == OUTPUT_DEBUG_STRING_EVENT) text += ReadText(process, event.u.DebugString);
        if (code == EXCEPTION_DEBUG_EVENT &&
            event.u.Exception.ExceptionRecord.ExceptionCode != static_cast<DWORD>(EXCEPTION_BREAKPOINT))
            how = DBG_EXCEPTION_NOT_HANDLED;
        if (code == EXIT_PROCESS_DEBUG_EVENT) exitCode = static_cast<int>(event.u.ExitProcess.dwExitCode);
        ContinueDebugEvent(event.dwProcessId, event.dwThreadId, how);
        if (code == EXIT_PROCESS_DEBUG_EVENT) break;
    }
    return text;
}

} // namespace

std::string RunUnderDebugger(const char* test, int& exitCode) {
    exitCode = -1;
    char program[MAX_PATH];
    GetModuleFileNameA(nullptr, program, MAX_PATH);
    std::string command =
        std::string("\"") + program + "\" --gtest_also_run_disabled_tests --gtest_brief=1 --gtest_filter=" + test;
    STARTUPINFOA startup = {};
    startup.cb = sizeof startup;
    PROCESS_INFORMATION child;
    if (!CreateProcessA(nullptr, &command[0], nullptr, nullptr, FALSE, DEBUG_ONLY_THIS_PROCESS, nullptr, nullptr,
                        &startup, &child))
        return "no process";
    const std::string text = FollowChild(child.hProcess, exitCode);
    CloseHandle(child.hThread);
    CloseHandle(child.hProcess);
    return text;
}

void RunOnStack(std::size_t bytes, const std::function<void()>& body) {
    const auto run = [](void* work) -> DWORD {
        (*static_cast<const std::function<void()>*>(work))();
        return 0;
    };
    const HANDLE thread = CreateThread(nullptr, bytes, run, const_cast<std::function<void()>*>(&body),
                                       STACK_SIZE_PARAM_IS_A_RESERVATION, nullptr);
    if (!thread) std::abort();
    WaitForSingleObject(thread, INFINITE);
    CloseHandle(thread);
}

} // namespace support
