#include "console.h"

#include "text.h"

#include <cstdio>
#include <cstdlib>
#include <fcntl.h>
#include <io.h>

#include <windows.h>
// After windows.h, which they need.
#include <psapi.h>
#include <shellapi.h>

namespace tool::console {

namespace {

UINT g_codePage = 0; // the terminal's before we came

} // namespace

void Prepare() {
    for (std::FILE* stream : {stdin, stdout, stderr}) _setmode(_fileno(stream), _O_BINARY);
    constexpr DWORD kEscapeSequences = 4; // for the progress line
    DWORD mode = 0;
    const HANDLE error = GetStdHandle(STD_ERROR_HANDLE);
    if (GetConsoleMode(error, &mode)) SetConsoleMode(error, mode | kEscapeSequences);
    g_codePage = GetConsoleOutputCP();
    if (g_codePage == 0 || !SetConsoleOutputCP(CP_UTF8)) return;
    std::atexit([] { SetConsoleOutputCP(g_codePage); });
}

std::vector<std::string> Arguments(int, char**) {
    std::vector<std::string> arguments;
    int count = 0;
    wchar_t** texts = CommandLineToArgvW(GetCommandLineW(), &count);
    for (int i = 1; texts && i < count; ++i) arguments.push_back(ToUtf8(texts[i], Pairs::Standard));
    LocalFree(texts);
    return arguments;
}

bool IsErrorTerminal() {
    DWORD mode = 0;
    return GetConsoleMode(GetStdHandle(STD_ERROR_HANDLE), &mode) != 0;
}

std::size_t ProcessMemory() {
    PROCESS_MEMORY_COUNTERS counters = {};
    return GetProcessMemoryInfo(GetCurrentProcess(), &counters, sizeof(counters)) ? counters.WorkingSetSize : 0;
}

} // namespace tool::console
