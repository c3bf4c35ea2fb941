// The commands of the documentation, run as they stand there.
//
// A block ```console has lines `$ tavo ...`, each followed by the standard output and, where the exit code is not 0, by
// a last line `[exit N]`. A line `...` stands for any lines, or none; ends of lines may have a carriage return. Command
// lines are a small part of the shell's: blanks, quotes, backslashes, `|`, and at the end `> FILE` or `2>&1`, which
// puts the complaints behind the output; `printf 'TEXT'` may come first. Each block has a folder with a copy of the
// samples.

#include "support/log.h"
#include "support/process.h"
#include "support/scratch.h"

#include <cstring>
#include <sstream>
#include <stdexcept>

namespace {

using Words = std::vector<std::string>;

struct Pipe {
    std::vector<Words> commands{1};
    std::string file; // takes the output
    bool tellsErrors = false;
};

Pipe Split(const std::string& line) {
    Pipe pipe;
    std::string* word = nullptr; // that is not ended yet
    bool isFile = false;
    for (std::size_t i = 0; i < line.size(); ++i) {
        const char c = line[i];
        if (c == ' ' || c == '|' || c == '>') {
            word = nullptr;
            isFile |= c == '>';
            if (c == '|') pipe.commands.emplace_back();
        } else if (!word && line.compare(i, 4, "2>&1") == 0) {
            pipe.tellsErrors = true;
            i += 3;
        } else if (std::strchr("$`*?[&;()<~#", c)) {
            throw std::invalid_argument(std::string("a shell would not take this as it is: ") + c);
        } else {
            if (!word) word = isFile ? &pipe.file : &pipe.commands.back().emplace_back();
            if (c != '\'' && c != '"') {
                *word += c == '\\' ? line.at(++i) : c;
                continue;
            }
            while (line.at(++i) != c) {
                if (c == '"' && line[i] == '\\' && std::strchr("\"\\$`", line.at(i + 1))) ++i;
                *word += line[i];
            }
        }
    }
    return pipe;
}

// What printf makes of a format without conversions, whose escapes are \n and three octal digits.
std::string Printf(const std::string& format) {
    std::string text;
    for (std::size_t i = 0; i < format.size(); ++i) {
        if (format[i] == '%') throw std::invalid_argument("printf: a conversion");
        if (format[i] != '\\') {
            text += format[i];
        } else if (format.at(++i) == 'n') {
            text += '\n';
        } else {
            text += static_cast<char>(std::stoi(format.substr(i, 3), nullptr, 8));
            i += 2;
        }
    }
    return text;
}

support::Finished Run(const Pipe& pipe) {
    support::Finished run;
    for (const Words& words : pipe.commands) {
        const bool isFirst = &words == pipe.commands.data();
        if (isFirst && words.size() == 2 && words[0] == "printf") {
            run = {0, Printf(words[1]), {}};
            continue;
        }
        if (words.empty() || words[0] != "tavo") throw std::invalid_argument("not a command of tavo");
        const std::string errors = run.errors;
        run = support::RunTool({words.begin() + 1, words.end()}, run.output);
        run.errors.insert(0, errors);
    }
    if (!pipe.file.empty()) support::Put(support::Widen(pipe.file), std::exchange(run.output, {}));
    if (pipe.tellsErrors) run.output += run.errors;
    return run;
}

Words Lines(const std::string& text) {
    Words lines;
    std::istringstream stream(text);
    for (std::string line; std::getline(stream, line); lines.push_back(line))
        if (!line.empty() && line.back() == '\r') line.pop_back();
    return lines;
}

using Line = Words::const_iterator;
bool Matches(Line expected, Line expectedEnd, Line line, Line end) {
    for (; expected != expectedEnd; ++expected, ++line) {
        if (*expected == "...") {
            while (!Matches(expected + 1, expectedEnd, line, end))
                if (line++ == end) return false;
            return true;
        }
        if (line == end || *line != *expected) return false;
    }
    return line == end;
}

struct Block {
    std::string place;
    Words lines;
};

std::vector<Block> Blocks() {
    const std::string root = TAVO_TEST_DATA "/../../";
    Words pages{"README.md"};
    for (const support::WideText& name : support::List(support::Widen(root + "docs"), L"*.md"))
        pages.push_back("docs/" + support::Ascii(name));
    std::vector<Block> blocks;
    for (const std::string& page : pages) {
        std::string text = support::Get(support::Widen(root + page));
        std::erase(text, '\r');
        const std::string begin = "\n```console\n", end = "\n```\n";
        for (std::size_t at = 0; (at = text.find(begin, at)) != text.npos;) {
            const auto line = 2 + std::count(text.begin(), text.begin() + static_cast<std::ptrdiff_t>(at), '\n');
            const auto inside = at + begin.size();
            at = text.find(end, inside);
            blocks.push_back({page + ':' + std::to_string(line), Lines(text.substr(inside, at - inside))});
        }
    }
    return blocks;
}

bool IsCommand(const std::string& line) { return line.compare(0, 2, "$ ") == 0; }

// With the folder as the current one.
void ExpectBlock(const Block& block) {
    ASSERT_TRUE(!block.lines.empty() && IsCommand(block.lines[0])) << block.place;
    for (auto line = block.lines.begin(); line != block.lines.end();) {
        const std::string command = line->substr(2);
        const auto begin = ++line;
        line = std::find_if(begin, block.lines.end(), IsCommand);
        try {
            support::Finished run = Run(Split(command));
            if (run.code != 0) run.output += "[exit " + std::to_string(run.code) + "]\n";
            const Words shown = Lines(run.output);
            EXPECT_TRUE(Matches(begin, line, shown.begin(), shown.end())) << block.place << ": " << command << '\n'
                                                                          << run.output << "and on standard error\n"
                                                                          << run.errors;
        } catch (const std::exception& error) {
            ADD_FAILURE() << block.place << ": no command line of this page's kind: " << command << '\n'
                          << error.what();
        }
    }
}

} // namespace

TEST(DocsCommands, DoWhatTheDocumentationShows) {
    const std::string data = TAVO_TEST_DATA "/";
    for (const Block& block : Blocks()) {
        const support::ScratchFolder folder;
        for (const support::WideText& name : support::List(support::Widen(data), nullptr, false))
            support::Put(folder / name, support::Get(support::Widen(data) + name));
        const auto before = std::filesystem::current_path();
        std::filesystem::current_path(std::u16string(&folder.Path()[0], &folder.Path()[0] + folder.Path().Length()));
        ExpectBlock(block);
        std::filesystem::current_path(before);
    }
}

// And every example of the man page, so that it was run.
TEST(DocsCommands, ShowEveryCommandOfTheTool) {
    std::string all;
    for (const Block& block : Blocks())
        for (const std::string& line : block.lines)
            if (IsCommand(line)) all += line + ' ';
    std::string page = support::RunTool({"help", "man"}).output;
    std::erase(page, '\\');
    std::size_t commands = 0, examples = 0;
    const Words lines = Lines(page);
    for (std::size_t i = 1; i < lines.size(); ++i) {
        if (lines[i].compare(0, 9, ".SS tavo ") == 0) { // its words, and then arguments
            const std::string command =
                lines[i].substr(4, lines[i].find_first_not_of("-abcdefghijklmnopqrstuvwxyz ", 4) - 4);
            EXPECT_NE(all.find(command), all.npos) << command;
            ++commands;
        } else if (lines[i - 1] == ".RS") {
            EXPECT_NE(all.find("$ " + lines[i] + ' '), all.npos) << lines[i];
            ++examples;
        }
    }
    EXPECT_TRUE(commands > 10 && examples > 2);
}
