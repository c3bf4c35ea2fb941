#include "support/process.h"

#include <cstdio>
#include <gtest/gtest.h>
#include <spawn.h>
#include <sys/wait.h>
#include <unistd.h>

extern char** environ;

namespace support {

static std::string Contents(std::FILE* file) {
    std::string bytes(static_cast<std::size_t>(lseek(fileno(file), 0, SEEK_END)), 0);
    EXPECT_EQ(pread(fileno(file), bytes.data(), bytes.size(), 0), static_cast<ssize_t>(bytes.size()));
    std::fclose(file);
    return bytes;
}

std::string ToolPath() {
    char path[4096];
    const auto length = readlink("/proc/self/exe", path, sizeof path);
    const std::string self(path, length > 0 ? static_cast<std::size_t>(length) : 0);
    return self.substr(0, self.rfind('/') + 1) + "tavo";
}

Finished RunTool(const std::vector<std::string>& arguments, const std::string& input) {
    const std::string tool = ToolPath();
    std::vector<char*> texts{const_cast<char*>(tool.c_str())};
    for (const std::string& argument : arguments) texts.push_back(const_cast<char*>(argument.c_str()));
    texts.push_back(nullptr);

    std::FILE* const streams[] = {std::tmpfile(), std::tmpfile(), std::tmpfile()};
    std::fwrite(input.data(), 1, input.size(), streams[0]);
    std::fflush(streams[0]);
    lseek(fileno(streams[0]), 0, SEEK_SET);
    posix_spawn_file_actions_t actions;
    posix_spawn_file_actions_init(&actions);
    for (int i = 0; i < 3; ++i) posix_spawn_file_actions_adddup2(&actions, fileno(streams[i]), i);

    Finished finished;
    pid_t child = 0;
    const int failed = posix_spawn(&child, tool.c_str(), &actions, nullptr, texts.data(), environ);
    posix_spawn_file_actions_destroy(&actions);
    EXPECT_EQ(failed, 0) << tool;
    int status = 0;
    if (!failed && waitpid(child, &status, 0) == child && WIFEXITED(status)) finished.code = WEXITSTATUS(status);
    std::fclose(streams[0]);
    finished.output = Contents(streams[1]);
    finished.errors = Contents(streams[2]);
    return finished;
}

} // namespace support
