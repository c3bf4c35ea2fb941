// What shells and man make of the tool's own reference. Shells that are not installed are left out.

#include "support/process.h"

#include <gtest/gtest.h>
#include <stdlib.h>
#include <sys/wait.h>

namespace {

struct Answer {
    std::string output;
    int code;
};

Answer Shell(const std::string& line) {
    std::FILE* const pipe = popen((line + " 2>&1").c_str(), "r");
    Answer answer{};
    for (int c; (c = std::fgetc(pipe)) != EOF;) answer.output += static_cast<char>(c);
    answer.code = WEXITSTATUS(pclose(pipe));
    return answer;
}

bool IsThere(const std::string& program) { return Shell("command -v " + program).code == 0; }

// In a folder with the files "take one.xml" and "reel.xml".
void ExpectCompletion(const std::string& shell, const std::string& ask) {
    char folder[] = "completion.XXXXXX";
    ASSERT_TRUE(mkdtemp(folder));
    const std::string enter = std::string("cd ") + folder + " && ";
    Shell(enter + "touch 'take one.xml' reel.xml && " + support::ToolPath() + " help completion " + shell + " >script");
    const std::pair<const char*, std::string> rows[] = {{"x", "xml\n"},
                                                        {"xml s", "set\nstat\n"},
                                                        {"xml check --k", "--keep-going\n"},
                                                        {"xml set reel.xml --encoding utf-16", "utf-16\nutf-16-raw\n"},
                                                        {"xml format reel.xml -o re", "reel.xml\n"},
                                                        {"xml check ta", "take one.xml\n"},
                                                        {"tc show --system NTSC", "NTSC\nNTSC(DF)\nNTSC(PX)\n"},
                                                        {"rational approx --max-den ", ""},
                                                        {"nothing --max", ""}};
    for (const auto& [words, expected] : rows)
        EXPECT_EQ(Shell(enter + ask + " '" + words + "' | sort").output, expected) << shell << ": " << words;
    Shell(std::string("rm -r ") + folder);
}

} // namespace

TEST(ToolReference, CompletesInBash) {
    ExpectCompletion("bash", R"(bash --norc -c '. ./script; COMP_WORDS=(tavo $0); [[ $0 == *" " ]] && COMP_WORDS+=("")
COMP_CWORD=$((${#COMP_WORDS[@]} - 1)); _tavo; ((${#COMPREPLY[@]})) && printf "%s\n" "${COMPREPLY[@]}"')");
}

TEST(ToolReference, CompletesInFish) {
    if (!IsThere("fish")) GTEST_SKIP() << "no fish here";
    ExpectCompletion("fish", "fish --no-config -c 'source script; complete -C \"tavo $argv\" | cut -f 1'");
}

TEST(ToolReference, IsReadByZshAndMan) {
    const std::string tool = support::ToolPath() + " help ";
    const std::pair<const char*, std::string> rows[] = {
        {"zsh", "completion zsh | zsh -n"},
        {"groff", "man | groff -man -Tutf8 -ww -z"},
        {"mandoc", "man | mandoc -T lint -W warning | grep -v date"}, // the page has none
    };
    for (const auto& [program, use] : rows) EXPECT_EQ(IsThere(program) ? Shell(tool + use).output : "", "") << program;
}
