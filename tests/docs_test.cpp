// The commands of the documentation, run as they stand there.
//
// A block ```console has lines `$ tavo ...`, each followed by the standard output and, where the exit code is not 0, by
// a last line `[exit N]`. A line `...` stands for any lines, or none; ends of lines may have a carriage return. Command
// lines are a small part of the shell's: blanks, quotes, backslashes, `|`, and at the end `> FILE` or `2>&1`, which
// puts the complaints behind the output; `printf 'TEXT'` may come first. Each block has a folder with a copy of the
// samples.

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
    std::string word;
    bool isWord = false, isFile = false;
    const auto endWord = [&] {
        if (isWord && isFile) pipe.file = word;
        if (isWord && !isFile) pipe.commands.back().push_back(word);
        word.clear();
        isWord = false;
    };
    for (std::size_t i = 0; i < line.size(); ++i) {
        const char c = line[i];
        if (c == ' ') {
            endWord();
        } else if (c == '|') {
            endWord();
            pipe.commands.emplace_back();
        } else if (line.compare(i, 4, "2>&1") == 0 && !isWord) {
            pipe.tellsErrors = true;
            i += 3;
        } else if (c == '>') {
            endWord();
            isFile = true;
        } else if (std::strchr("$`*?[&;()<~#", c)) {
            throw std::invalid_argument(std::string("a shell would not take this as it is: ") + c);
        } else {
            isWord = true;
            if (c == '\'') {
                while (line.at(++i) != '\'') word += line[i];
            } else if (c == '"') {
                while (line.at(++i) != '"') {
                    if (line[i] == '\\' && std::strchr("\"\\$`", line.at(i + 1))) ++i;
                    word += line[i];
                }
            } else {
                word += c == '\\' ? line.at(++i) : c;
            }
        }
    }
    endWord();
    return pipe;
}

// What printf makes of a format without conversions.
std::string Printf(const std::string& format) {
    static constexpr char kNames[] = "ntr\\", kCharacters[] = "\n\t\r\\";
    std::string text;
    for (std::size_t i = 0; i < format.size(); ++i) {
        if (format[i] == '%' && format.at(++i) != '%') throw std::invalid_argument("printf: a conversion");
        if (format[i] != '\\') {
            text += format[i];
        } else if (const char* name = std::strchr(kNames, format.at(++i))) {
            text += kCharacters[name - kNames];
        } else { // three octal digits
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
    for (const support::WideText& name : support::List(support::Widen(root + "docs"), L"*.md")) {
        pages.push_back("docs/");
        for (const wchar_t* unit = name; *unit; ++unit) pages.back() += static_cast<char>(*unit);
    }
    std::vector<Block> blocks;
    for (const std::string& page : pages) {
        bool isInside = false;
        std::size_t number = 0;
        for (const std::string& line : Lines(support::Get(support::Widen(root + page)))) {
            ++number;
            if (isInside && line != "```") blocks.back().lines.push_back(line);
            isInside = isInside ? line != "```" : line == "```console";
            if (isInside && line == "```console") blocks.push_back({page + ':' + std::to_string(number), {}});
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
            const support::Finished run = Run(Split(command));
            Words shown = Lines(run.output);
            if (run.code != 0) shown.push_back("[exit " + std::to_string(run.code) + "]");
            std::string all;
            for (const std::string& each : shown) all += each + '\n';
            EXPECT_TRUE(Matches(begin, line, shown.begin(), shown.end()))
                << block.place << ": " << command << '\n'
                << all << (run.errors.empty() ? "" : "and on standard error\n" + run.errors);
        } catch (const std::exception& error) {
            ADD_FAILURE() << block.place << ": " << command
                          << "\nnot a command line of this page's kind: " << error.what();
        }
    }
}

// The commands below one, from what its help lists; one that lists none is one itself.
Words Leaves(const Words& command) {
    Words help = command, leaves;
    help.push_back("--help");
    const Words lines = Lines(support::RunTool(help).output);
    auto line = std::find(lines.begin(), lines.end(), "Subcommands:");
    if (line == lines.end()) {
        std::string name = "tavo";
        for (const std::string& word : command) name += ' ' + word;
        return {name};
    }
    while (++line != lines.end() && line->compare(0, 2, "  ") == 0) {
        Words below = command;
        below.push_back(line->substr(2, line->find(' ', 2) - 2));
        if (below.back().empty()) continue; // the description of the one before
        const Words found = Leaves(below);
        leaves.insert(leaves.end(), found.begin(), found.end());
    }
    return leaves;
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

TEST(DocsCommands, ShowEveryCommandOfTheTool) {
    const Words commands = Leaves({});
    EXPECT_GT(commands.size(), 10u);
    std::string all;
    for (const Block& block : Blocks())
        for (const std::string& line : block.lines)
            if (IsCommand(line)) all += line + ' ';
    for (const std::string& command : commands) EXPECT_NE(all.find(command + ' '), all.npos) << command;

    // The examples of the man page are shown too, so that they were run.
    std::string page = support::RunTool({"help", "man"}).output;
    std::erase(page, '\\');
    std::size_t examples = 0;
    const Words lines = Lines(page);
    for (std::size_t i = 1; i < lines.size(); ++i) {
        if (lines[i - 1] != ".RS") continue;
        ++examples;
        EXPECT_NE(all.find("$ " + lines[i] + ' '), all.npos) << lines[i];
    }
    EXPECT_GT(examples, 2u);
}
