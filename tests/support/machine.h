#pragma once
// What the tests need of the machine: copies of the library with a configuration of their own, plug-ins and
// child processes.

#include <cstddef>
#include <functional>
#include <string>

namespace support {

// The library copied as `name` + the system's extension into a fresh folder, beside a configuration file with this
// text, and loaded. Null text: no file.
class LibraryCopy {
public:
    LibraryCopy(const std::string& name, const char* configuration);
    ~LibraryCopy();
    LibraryCopy(const LibraryCopy&) = delete;
    LibraryCopy& operator=(const LibraryCopy&) = delete;

    // The copy's function of that C++ name; `windowsName` where its parameters make it another.
    template <class Function> Function Find(const char* name, const char* windowsName = nullptr) const {
        return reinterpret_cast<Function>(FindSymbol(name, windowsName ? windowsName : name));
    }
    bool IsLoaded() const { return m_module != nullptr; }

private:
    void* FindSymbol(const char* name, const char* windowsName) const;

    std::string m_folder, m_library, m_configuration;
    void* m_module = nullptr;
};

// A plug-in of the tests: the library `name` beside this program, loaded by its full path.
class Plugin {
public:
    explicit Plugin(const char* name);
    ~Plugin();
    Plugin(const Plugin&) = delete;
    Plugin& operator=(const Plugin&) = delete;

    // Its C function of that name; null when there is none or the plug-in was not loaded.
    template <class Function> Function Find(const char* name) const {
        return reinterpret_cast<Function>(FindSymbol(name));
    }

private:
    void* FindSymbol(const char* name) const;

    void* m_module;
};

// Runs this program again, under a debugger that lets it run, with one (disabled) test only. Gives what reached the
// debugger: its output channel on Windows, standard error elsewhere. `exitCode` is the child's.
std::string RunUnderDebugger(const char* test, int& exitCode);

// Runs `body` on a thread with a stack of that many bytes, and waits for its end.
void RunOnStack(std::size_t bytes, const std::function<void()>& body);

} // namespace support
