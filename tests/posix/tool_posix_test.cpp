// The command-line tool on a terminal, and with arguments that are no Unicode.

#include "support/process.h"

#include <cstdlib>
#include <fcntl.h>
#include <gtest/gtest.h>
#include <poll.h>
#include <sys/wait.h>
#include <unistd.h>

namespace {

std::string ToolPath() {
    char path[4096];
    const auto length = readlink("/proc/self/exe", path, sizeof path);
    const std::string self(path, length > 0 ? static_cast<std::size_t>(length) : 0);
    return self.substr(0, self.rfind('/') + 1) + "tavo";
}

// What a run shows on a terminal that is its standard error.
std::string ErrorsOnTerminal(const std::string& document, const std::string& repeat) {
    const int terminal = posix_openpt(O_RDWR | O_NOCTTY);
    if (terminal < 0 || grantpt(terminal) != 0 || unlockpt(terminal) != 0) return "(no terminal)";
    const int side = open(ptsname(terminal), O_RDWR | O_NOCTTY);
    const std::string tool = ToolPath();
    const pid_t child = fork();
    if (child == 0) {
        dup2(side, STDERR_FILENO);
        dup2(open("/dev/null", O_WRONLY), STDOUT_FILENO);
        execl(tool.c_str(), "tavo", "xml", "stat", "--repeat", repeat.c_str(), document.c_str(), nullptr);
        _exit(127);
    }
    std::string text;
    char piece[4096];
    int status = 0;
    bool ended = false;
    do {
        ended = waitpid(child, &status, WNOHANG) == child;
        pollfd ready = {terminal, POLLIN, 0};
        while (poll(&ready, 1, ended ? 0 : 50) == 1 && (ready.revents & POLLIN)) {
            const auto got = read(terminal, piece, sizeof piece);
            if (got <= 0) break;
            text.append(piece, static_cast<std::size_t>(got));
        }
    } while (!ended);
    close(side);
    close(terminal);
    EXPECT_TRUE(WIFEXITED(status) && WEXITSTATUS(status) == 0);
    return text;
}

} // namespace

TEST(ToolProgress, ShowsOnATerminalAndGoesAway) {
    const std::string document = TAVO_TEST_DATA "/timeline.xml";
    const std::string repeats = support::RepeatsFor(1500, document);
    const std::string text = ErrorsOnTerminal(document, repeats);
    EXPECT_NE(text.find("timing "), text.npos) << text;
    EXPECT_NE(text.find(" of " + repeats + ": " + document), text.npos) << text;
    EXPECT_EQ(text.rfind("\r\x1b[K"), text.size() - 4) << "the line was taken away";
    EXPECT_EQ(text.find('\n'), text.npos) << "and was one line all the time";
}

TEST(ToolArguments, ThatAreNoUnicode) {
    auto run = support::RunTool({"xml", "set", "-", "b", "\xFF", "-o", "-"}, "<a><b/></a>");
    EXPECT_EQ(run.code, 1);
    EXPECT_EQ(run.output, "");
    EXPECT_NE(run.errors.find("cannot be kept"), run.errors.npos);
    run = support::RunTool({"xml", "check", "no\xFFname"});
    EXPECT_EQ(run.code, 3);
    EXPECT_NE(run.errors.find("its name is not Unicode"), run.errors.npos);
    for (const char* bad : {"\xC0\x80", "\xE2\x82", "\xF5\x80\x80\x80", "\xF4\x90\x80\x80", "\xE0\x80\xAF", "\x80"})
        EXPECT_EQ(support::RunTool({"xml", "check", bad}).code, 3) << "and no other file is meant";
}
