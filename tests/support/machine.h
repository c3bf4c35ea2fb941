#pragma once
// What the tests need of the machine: copies of the library with a configuration of their own, plug-ins, a process
// under a debugger and threads with small stacks.

#include <filesystem>
#include <fstream>
#include <functional>
#include <random>
#include <string>

namespace support {

extern const char* const kModuleEnding; // of a file name
extern const char* const kCopyEnding;   // with version digits where they are usual

std::filesystem::path LibraryPath(); // of the library under test, which stands beside the program

// A library that is loaded; Find gives null when it could not be.
class Module {
public:
    explicit Module(const std::filesystem::path& file);
    ~Module();
    Module(const Module&) = delete;
    Module& operator=(const Module&) = delete;

    // Its function of that linker's name; `windowsName` where its parameters make it another.
    template <class Function> Function Find(const char* name, const char* windowsName = nullptr) const {
        return reinterpret_cast<Function>(FindSymbol(name, windowsName ? windowsName : name));
    }

private:
    void* FindSymbol(const char* name, const char* windowsName) const;

    void* m_module;
};

// A plug-in of the tests.
struct Plugin : Module {
    explicit Plugin(const char* name) : Module(LibraryPath().replace_filename(std::string(name) + kModuleEnding)) {}
};

struct FreshFolder {
    const std::filesystem::path folder =
        std::filesystem::temp_directory_path() / ("tavo_copy_" + std::to_string(std::random_device()()));
    FreshFolder() { std::filesystem::create_directory(folder); }
    ~FreshFolder() {
        std::error_code ignored;
        std::filesystem::remove_all(folder, ignored);
    }
};

// The library copied as `name` + the system's ending into a fresh folder, beside a configuration file with this text,
// and loaded. Null text: no file.
struct LibraryCopy : FreshFolder, Module {
    LibraryCopy(const std::string& name, const char* configuration) : Module(Copy(name, configuration)) {}

private:
    std::filesystem::path Copy(const std::string& name, const char* configuration) const {
        if (configuration) std::ofstream(folder / (name + ".ini"), std::ios::binary) << configuration;
        std::filesystem::copy_file(LibraryPath(), folder / (name + kCopyEnding));
        return folder / (name + kCopyEnding);
    }
};

// Runs this program again, under a debugger that lets it run, with one (disabled) test only. Gives what reached the
// debugger: its output channel on Windows, standard error elsewhere. `exitCode` is the child's.
std::string RunUnderDebugger(const char* test, int& exitCode);

// Runs `body` on a thread with a stack of that many bytes, and waits for its end.
void RunOnStack(std::size_t bytes, const std::function<void()>& body);

} // namespace support
