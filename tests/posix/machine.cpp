#include "support/machine.h"

#include <cstdio>
#include <cstdlib>
#include <dlfcn.h>
#include <pthread.h>
#include <sys/ptrace.h>
#include <sys/wait.h>
#include <TAVO/core.h>
#include <unistd.h>

// The copies define the library's globals a second time: two equal ones are no fault here.
extern "C" __attribute__((visibility("default"))) const char* __asan_default_options() {
    return "detect_odr_violation=1";
}

namespace support {

const char* const kModuleEnding = ".so";
const char* const kCopyEnding = ".so.1.2";

std::filesystem::path LibraryPath() {
    Dl_info info = {};
    dladdr(reinterpret_cast<void*>(&TAVO::Core::OS::_falloc), &info);
    return info.dli_fname;
}

Module::Module(const std::filesystem::path& file) : m_module(dlopen(file.c_str(), RTLD_NOW | RTLD_LOCAL)) {
    if (!m_module) std::fprintf(stderr, "%s\n", dlerror());
}
Module::~Module() {
    if (m_module) dlclose(m_module);
}
void* Module::FindSymbol(const char* name, const char*) const { return m_module ? dlsym(m_module, name) : nullptr; }

std::string RunUnderDebugger(const char* test, int& exitCode) {
    int ends[2];
    if (pipe(ends) != 0) return "no pipe";
    const std::string filter = std::string("--gtest_filter=") + test;
    const pid_t child = fork();
    if (child == 0) {
        setenv("ASAN_OPTIONS", "detect_leaks=0", 1); // the leak checker is a tracer itself
        dup2(ends[1], STDERR_FILENO);
        ptrace(PTRACE_TRACEME, 0, nullptr, nullptr);
        execl("/proc/self/exe", "tavo_tests", filter.c_str(), "--gtest_also_run_disabled_tests", "--gtest_brief=1",
              static_cast<char*>(nullptr));
        _exit(127);
    }
    close(ends[1]);
    int status = 0; // it runs to its end, signals passed on
    while (waitpid(child, &status, 0) == child && WIFSTOPPED(status))
        ptrace(PTRACE_CONT, child, nullptr, WSTOPSIG(status) == SIGTRAP ? 0 : WSTOPSIG(status));
    exitCode = WIFEXITED(status) ? WEXITSTATUS(status) : -1;
    std::string text(1 << 16, 0); // the texts of a test are small enough to wait in the pipe
    const auto got = read(ends[0], text.data(), text.size());
    close(ends[0]);
    return text.substr(0, got > 0 ? static_cast<std::size_t>(got) : 0);
}

void RunOnStack(std::size_t bytes, const std::function<void()>& body) {
    const auto run = [](void* work) -> void* {
        (*static_cast<const std::function<void()>*>(work))();
        return nullptr;
    };
    pthread_attr_t attributes;
    pthread_attr_init(&attributes);
    pthread_t thread;
    if (pthread_attr_setstacksize(&attributes, bytes) != 0 ||
        pthread_create(&thread, &attributes, run, const_cast<std::function<void()>*>(&body)) != 0)
        std::abort();
    pthread_join(thread, nullptr);
    pthread_attr_destroy(&attributes);
}

} // namespace support
