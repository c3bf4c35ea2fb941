#include "support/process.h"

#include <gtest/gtest.h>
#include <windows.h>

namespace support {

namespace {

std::vector<wchar_t> Widen(const std::string& text) {
    std::vector<wchar_t> wide(text.size() + 1);
    MultiByteToWideChar(CP_UTF8, 0, text.c_str(), -1, wide.data(), static_cast<int>(wide.size()));
    return wide;
}

// By the rules that programs take their command line apart with.
std::string Quote(const std::string& argument) {
    std::string quoted = "\"";
    std::size_t backslashes = 0;
    for (const char c : argument) {
        if (c == '"') quoted.append(backslashes + 1, '\\');
        backslashes = c == '\\' ? backslashes + 1 : 0;
        quoted += c;
    }
    return quoted.append(backslashes, '\\') + '"';
}

// An open file that other processes inherit, and that goes when it is closed.
HANDLE MakeStream() {
    wchar_t folder[MAX_PATH], path[MAX_PATH];
    GetTempPathW(MAX_PATH, folder);
    GetTempFileNameW(folder, L"tav", 0, path);
    SECURITY_ATTRIBUTES inherited = {sizeof(inherited), nullptr, TRUE};
    return CreateFileW(path, GENERIC_READ | GENERIC_WRITE, FILE_SHARE_READ | FILE_SHARE_WRITE | FILE_SHARE_DELETE,
                       &inherited, CREATE_ALWAYS, FILE_ATTRIBUTE_TEMPORARY | FILE_FLAG_DELETE_ON_CLOSE, nullptr);
}

std::string TakeContents(HANDLE stream) {
    std::string bytes(GetFileSize(stream, nullptr), 0);
    DWORD got = 0;
    SetFilePointer(stream, 0, nullptr, FILE_BEGIN);
    EXPECT_TRUE(ReadFile(stream, bytes.data(), static_cast<DWORD>(bytes.size()), &got, nullptr));
    EXPECT_EQ(got, bytes.size());
    CloseHandle(stream);
    return bytes;
}

} // namespace

Finished RunTool(const std::vector<std::string>& arguments, const std::string& input) {
    std::string line = "tavo.exe";
    for (const std::string& argument : arguments) line += ' ' + Quote(argument);
    auto command = Widen(line);

    const HANDLE in = MakeStream(), out = MakeStream(), err = MakeStream();
    DWORD done = 0;
    EXPECT_TRUE(WriteFile(in, input.data(), static_cast<DWORD>(input.size()), &done, nullptr));
    SetFilePointer(in, 0, nullptr, FILE_BEGIN);
    STARTUPINFOW start = {};
    start.cb = sizeof(start);
    start.dwFlags = STARTF_USESTDHANDLES;
    start.hStdInput = in;
    start.hStdOutput = out;
    start.hStdError = err;

    Finished finished;
    PROCESS_INFORMATION process = {};
    DWORD code = 0;
    if (!CreateProcessW(nullptr, command.data(), nullptr, nullptr, TRUE, 0, nullptr, nullptr, &start, &process)) {
        ADD_FAILURE() << "not started: error " << GetLastError();
    } else {
        WaitForSingleObject(process.hProcess, INFINITE);
        if (GetExitCodeProcess(process.hProcess, &code)) finished.code = static_cast<int>(code);
        CloseHandle(process.hThread);
        CloseHandle(process.hProcess);
    }
    CloseHandle(in);
    finished.output = TakeContents(out);
    finished.errors = TakeContents(err);
    return finished;
}

} // namespace support
