// The command-line tool on a terminal, with arguments that are no Unicode, and what shells and man make of its own
// reference. Shells that are not installed are left out.

#include "support/process.h"

#include <gtest/gtest.h>
#include <stdlib.h>

using support::RunTool;

namespace {

std::string Shell(const std::string& line) {
    std::FILE* const pipe = popen((line + " 2>&1").c_str(), "r");
    std::string output;
    for (int c; (c = std::fgetc(pipe)) != EOF;) output += static_cast<char>(c);
    pclose(pipe);
    return output;
}

bool IsThere(const std::string& program) { return !Shell("command -v " + program).empty(); }

// In a folder with the files "take one.xml" and "reel.xml".
void ExpectCompletion(const std::string& shell, const std::string& ask) {
    char folder[] = "completion.XXXXXX";
    ASSERT_TRUE(mkdtemp(folder));
    const std::string enter = std::string("cd ") + folder + " && ";
    Shell(enter + "touch 'take one.xml' reel.xml && " + support::ToolPath() + " help completion " + shell + " >script");
    const std::pair<const char*, const char*> rows[] = {{"x", "xml\n"},
                                                        {"xml s", "set\nstat\n"},
                                                        {"xml check --k", "--keep-going\n"},
                                                        {"xml set reel.xml --encoding utf-16", "utf-16\nutf-16-raw\n"},
                                                        {"xml format reel.xml -o re", "reel.xml\n"},
                                                        {"xml check ta", "take one.xml\n"},
                                                        {"tc show --system NTSC", "NTSC\nNTSC(DF)\nNTSC(PX)\n"},
                                                        {"rational approx --max-den ", ""},
                                                        {"nothing --max", ""}};
    for (const auto& [words, expected] : rows)
        EXPECT_EQ(Shell(enter + ask + " '" + words + "' | sort"), expected) << shell << ": " << words;
    Shell(std::string("rm -r ") + folder);
}

} // namespace

TEST(ToolReference, CompletesInBashAndFish) {
    ExpectCompletion("bash", R"(bash --norc -c '. ./script; COMP_WORDS=(tavo $0); [[ $0 == *" " ]] && COMP_WORDS+=("")
COMP_CWORD=$((${#COMP_WORDS[@]} - 1)); _tavo; ((${#COMPREPLY[@]})) && printf "%s\n" "${COMPREPLY[@]}"')");
    if (IsThere("fish"))
        ExpectCompletion("fish", "fish --no-config -c 'source script; complete -C \"tavo $argv\" | cut -f 1'");
}

TEST(ToolReference, IsReadByZshAndMan) {
    const std::string tool = support::ToolPath() + " help ";
    const std::pair<const char*, std::string> rows[] = {
        {"zsh", "completion zsh | zsh -n"},
        {"groff", "man | groff -man -Tutf8 -ww -z"},
        {"mandoc", "man | mandoc -T lint -W warning | grep -v date"}}; // the page has none
    for (const auto& [program, use] : rows) EXPECT_EQ(IsThere(program) ? Shell(tool + use) : "", "") << program;
}

// Its standard error is a terminal here.
TEST(ToolProgress, ShowsOnATerminalAndGoesAway) {
    if (!IsThere("script")) GTEST_SKIP() << "no program that gives another one a terminal";
    const std::string document = TAVO_TEST_DATA "/timeline.xml", repeats = support::RepeatsFor(1500, document);
    const std::string command = support::ToolPath() + " xml stat --repeat " + repeats + " " + document;
    const std::string text = Shell("script -qec '" + command + " >/dev/null && printf fine' /dev/null </dev/null");
    EXPECT_LT(text.find(" of " + repeats + ": " + document, text.find("timing ")), text.size()) << text;
    EXPECT_EQ(text.rfind("\r\x1b[Kfine"), text.size() - 8) << "the line was taken away: " << text;
    EXPECT_EQ(text.find('\n'), text.npos) << "and was one line all the time";
}

TEST(ToolArguments, ThatAreNoUnicode) {
    auto run = RunTool({"xml", "set", "-", "b", "\xFF", "-o", "-"}, "<a><b/></a>");
    EXPECT_TRUE(run.code == 1 && run.output.empty() && run.errors.find("cannot be kept") < run.errors.size());
    run = RunTool({"xml", "check", "no\xFFname"});
    EXPECT_TRUE(run.code == 3 && run.errors.find("its name is not Unicode") < run.errors.size());
    for (const char* bad : {"\xC0\x80", "\xE2\x82", "\xF5\x80\x80\x80", "\xF4\x90\x80\x80", "\xE0\x80\xAF", "\x80"})
        EXPECT_EQ(RunTool({"xml", "check", bad}).code, 3) << "and no other file is meant";
}
