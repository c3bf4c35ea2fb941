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
    std::string text;
    DEBUG_EVENT event = {};
    while (event.dwDebugEventCode != EXIT_PROCESS_DEBUG_EVENT && WaitForDebugEvent(&event, 60000)) {
        DWORD how = DBG_CONTINUE;
        if (event.dwDebugEventCode == OUTPUT_DEBUG_STRING_EVENT) {
            const OUTPUT_DEBUG_STRING_INFO& info = event.u.DebugString;
            std::string piece(info.nDebugStringLength, '\0');
            ReadProcessMemory(child.hProcess, info.lpDebugStringData, &piece[0], piece.size(), nullptr);
            text += piece.c_str(); // without the terminator, which was counted
        }
        if (event.dwDebugEventCode == EXCEPTION_DEBUG_EVENT &&
            event.u.Exception.ExceptionRecord.ExceptionCode != static_cast<DWORD>(EXCEPTION_BREAKPOINT))
            how = DBG_EXCEPTION_NOT_HANDLED;
        if (event.dwDebugEventCode == EXIT_PROCESS_DEBUG_EVENT)
            exitCode = static_cast<int>(event.u.ExitProcess.dwExitCode);
        ContinueDebugEvent(event.dwProcessId, event.dwThreadId, how);
    }
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
