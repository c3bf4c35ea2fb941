// The command-line tool on a terminal, and with arguments that are no Unicode.

#include "support/process.h"

#include <cstdlib>
#include <fcntl.h>
#include <gtest/gtest.h>
#include <sys/wait.h>
#include <unistd.h>

// Its standard error is a terminal here.
TEST(ToolProgress, ShowsOnATerminalAndGoesAway) {
    const std::string document = TAVO_TEST_DATA "/timeline.xml", tool = support::ToolPath();
    const std::string repeats = support::RepeatsFor(1500, document);
    const int terminal = posix_openpt(O_RDWR | O_NOCTTY);
    ASSERT_TRUE(terminal >= 0 && grantpt(terminal) == 0 && unlockpt(terminal) == 0);
    const int side = open(ptsname(terminal), O_RDWR | O_NOCTTY);
    const pid_t child = fork();
    if (child == 0) {
        dup2(side, STDERR_FILENO);
        dup2(open("/dev/null", O_WRONLY), STDOUT_FILENO);
        execl(tool.c_str(), "tavo", "xml", "stat", "--repeat", repeats.c_str(), document.c_str(), nullptr);
        _exit(127);
    }
    close(side);
    std::string text;
    char piece[4096];
    // Reading fails when the last process has closed the terminal.
    for (ssize_t got; (got = read(terminal, piece, sizeof piece)) > 0;) text.append(piece, std::size_t(got));
    int status = 0;
    EXPECT_TRUE(waitpid(child, &status, 0) == child && WIFEXITED(status) && WEXITSTATUS(status) == 0);
    close(terminal);
    EXPECT_NE(text.find("timing "), text.npos) << text;
    EXPECT_NE(text.find(" of " + repeats + ": " + document), text.npos) << text;
    EXPECT_EQ(text.rfind("\r\x1b[K"), text.size() - 4) << "the line was taken away";
    EXPECT_EQ(text.find('\n'), text.npos) << "and was one line all the time";
}

TEST(ToolArguments, ThatAreNoUnicode) {
    auto run = support::RunTool({"xml", "set", "-", "b", "\xFF", "-o", "-"}, "<a><b/></a>");
    EXPECT_TRUE(run.code == 1 && run.output.empty());
    EXPECT_NE(run.errors.find("cannot be kept"), run.errors.npos);
    run = support::RunTool({"xml", "check", "no\xFFname"});
    EXPECT_EQ(run.code, 3);
    EXPECT_NE(run.errors.find("its name is not Unicode"), run.errors.npos);
    for (const char* bad : {"\xC0\x80", "\xE2\x82", "\xF5\x80\x80\x80", "\xF4\x90\x80\x80", "\xE0\x80\xAF", "\x80"})
        EXPECT_EQ(support::RunTool({"xml", "check", bad}).code, 3) << "and no other file is meant";
}
