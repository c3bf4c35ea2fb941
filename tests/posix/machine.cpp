#include "support/machine.h"

#include <cstdio>
#include <cstdlib>
#include <dlfcn.h>
#include <fstream>
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

LibraryCopy::LibraryCopy(const std::string& name, const char* configuration) {
    char folder[] = "/tmp/tavo_copy_XXXXXX";
    if (!mkdtemp(folder)) return;
    m_folder = folder;
    m_library = m_folder + "/" + name + ".so.1.2"; // with version digits, as installed
    m_configuration = m_folder + "/" + name + ".ini";
    Dl_info info;
    if (!dladdr(reinterpret_cast<void*>(&TAVO::Core::OS::_falloc), &info)) return;
    std::ofstream(m_library, std::ios::binary) << std::ifstream(info.dli_fname, std::ios::binary).rdbuf();
    if (configuration) std::ofstream(m_configuration, std::ios::binary) << configuration;
    m_module = dlopen(m_library.c_str(), RTLD_NOW | RTLD_LOCAL);
    if (!m_module) std::fprintf(stderr, "%s\n", dlerror());
}

LibraryCopy::~LibraryCopy() {
    if (m_module) dlclose(m_module);
    unlink(m_library.c_str());
    unlink(m_configuration.c_str());
    rmdir(m_folder.c_str());
}

void* LibraryCopy::FindSymbol(const char* name, const char*) const { return dlsym(m_module, name); }

Plugin::Plugin(const char* name) {
    char program[4096] = {};
    if (readlink("/proc/self/exe", program, sizeof program - 1) < 0) program[0] = 0;
    const std::string folder(program, std::string(program).rfind('/') + 1);
    m_module = dlopen((folder + name + ".so").c_str(), RTLD_NOW | RTLD_LOCAL);
    if (!m_module) std::fprintf(stderr, "%s\n", dlerror());
}

Plugin::~Plugin() {
    if (m_module) dlclose(m_module);
}

void* Plugin::FindSymbol(const char* name) const { return m_module ? dlsym(m_module, name) : nullptr; }

namespace {

// Lets the traced child run to its end, signals passed on.
int FollowChild(pid_t child) {
    int status = 0;
    while (waitpid(child, &status, 0) == child) {
        if (WIFEXITED(status)) return WEXITSTATUS(status);
        if (WIFSIGNALED(status)) return 128 + WTERMSIG(status);
        const int signal = WSTOPSIG(status) == SIGTRAP ? 0 : WSTOPSIG(status);
        ptrace(PTRACE_CONT, child, nullptr, signal);
    }
    return -1;
}

std::string ReadToEnd(int descriptor) {
    std::string text;
    char piece[4096];
    for (ssize_t got; (got = read(descriptor, piece, sizeof piece)) > 0;)
        text.append(piece, static_cast<std::size_t>(got));
    return text;
}

} // namespace

std::string RunUnderDebugger(const char* test, int& exitCode) {
    exitCode = -1;
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
    exitCode = FollowChild(child); // the texts of a test are small enough to wait in the pipe
    const std::string text = ReadToEnd(ends[0]);
    close(ends[0]);
    return text;
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
