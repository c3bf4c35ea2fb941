#include "support/machine.h"

#include <cstdlib>
#include <fstream>
#include <windows.h>

namespace support {

LibraryCopy::LibraryCopy(const std::string& name, const char* configuration) {
    char temporary[MAX_PATH];
    char folder[MAX_PATH];
    GetTempPathA(MAX_PATH, temporary);
    if (!GetTempFileNameA(temporary, "tav", 0, folder)) return;
    DeleteFileA(folder);
    CreateDirectoryA(folder, nullptr);
    m_folder = folder;
    m_library = m_folder + "\\" + name + ".dll";
    m_configuration = m_folder + "\\" + name + ".ini";
    char library[MAX_PATH];
    GetModuleFileNameA(GetModuleHandleA("TAVO.dll"), library, MAX_PATH);
    if (!CopyFileA(library, m_library.c_str(), FALSE)) return;
    if (configuration) std::ofstream(m_configuration, std::ios::binary) << configuration;
    m_module = LoadLibraryA(m_library.c_str());
}

LibraryCopy::~LibraryCopy() {
    if (m_module) FreeLibrary(static_cast<HMODULE>(m_module));
    DeleteFileA(m_library.c_str());
    DeleteFileA(m_configuration.c_str());
    RemoveDirectoryA(m_folder.c_str());
}

void* LibraryCopy::FindSymbol(const char*, const char* windowsName) const {
    return reinterpret_cast<void*>(GetProcAddress(static_cast<HMODULE>(m_module), windowsName));
}

Plugin::Plugin(const char* name) {
    wchar_t path[MAX_PATH];
    const DWORD length = GetModuleFileNameW(nullptr, path, MAX_PATH);
    std::wstring file(path, length);
    file.resize(file.rfind(L'\\') + 1);
    for (; *name; ++name) file += static_cast<wchar_t>(*name);
    m_module = LoadLibraryW((file + L".dll").c_str());
}

Plugin::~Plugin() {
    if (m_module) FreeLibrary(static_cast<HMODULE>(m_module));
}

void* Plugin::FindSymbol(const char* name) const {
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
        switch (event.dwDebugEventCode) {
        case OUTPUT_DEBUG_STRING_EVENT:
            text += ReadText(process, event.u.DebugString);
            break;
        case CREATE_PROCESS_DEBUG_EVENT:
            CloseHandle(event.u.CreateProcessInfo.hFile);
            break;
        case LOAD_DLL_DEBUG_EVENT:
            if (event.u.LoadDll.hFile) CloseHandle(event.u.LoadDll.hFile);
            break;
        case EXCEPTION_DEBUG_EVENT:
            if (event.u.Exception.ExceptionRecord.ExceptionCode != static_cast<DWORD>(EXCEPTION_BREAKPOINT))
                how = DBG_EXCEPTION_NOT_HANDLED;
            break;
        case EXIT_PROCESS_DEBUG_EVENT:
            exitCode = static_cast<int>(event.u.ExitProcess.dwExitCode);
            break;
        }
        const bool last = event.dwDebugEventCode == EXIT_PROCESS_DEBUG_EVENT;
        ContinueDebugEvent(event.dwProcessId, event.dwThreadId, how);
        if (last) break;
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
