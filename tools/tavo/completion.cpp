#include "definitions.h"
#include "reference.h"

namespace tool {

namespace {

// What may follow, as all shells need it. A command's place is its path behind slashes: "/xml/check".
struct Offer {
    std::string word, help;
};
struct Place {
    std::string path;
    std::vector<Offer> commands, options;
    bool takesFiles = false;
    Words choices; // of the arguments that have no name
};
struct Taker { // an option that wants a value
    std::string path, option;
    const Argument* argument;
    bool TakesFile() const { return argument->value == "FILE"; }
};

struct Table {
    std::vector<Place> places;
    std::vector<Taker> takers;
};

std::string PathOf(const Command& command) {
    return command.path.empty() ? std::string() : '/' + Joined(command.path, "/");
}

Table TableOf(const Command& all) {
    Table table;
    ForEach(all, [&](const Command& command) {
        Place place;
        place.path = PathOf(command);
        for (const Command& each : command.below) place.commands.push_back({each.path.back(), each.help});
        for (const Argument& argument : command.arguments) {
            if (argument.names.empty()) {
                place.takesFiles |= argument.value == "FILE";
                place.choices.insert(place.choices.end(), argument.choices.begin(), argument.choices.end());
            }
            for (const std::string& name : argument.names) {
                place.options.push_back({name, argument.help});
                if (!argument.value.empty() && !argument.hasOptionalValue)
                    table.takers.push_back({place.path, name, &argument});
            }
        }
        table.places.push_back(place);
    });
    return table;
}

// In single quotes; `quote` is how a shell writes one between them.
std::string Quoted(const std::string& text, const char* quote) { return '\'' + Replaced(text, "'", quote) + '\''; }

Words PathsOf(const Table& table) {
    Words paths;
    for (const Place& place : table.places)
        if (!place.path.empty()) paths.push_back(place.path);
    return paths;
}

Words WordsOf(const std::vector<Offer>& offers) {
    Words words;
    for (const Offer& offer : offers) words.push_back(offer.word);
    return words;
}

std::string ForBash(const Table& table) {
    std::string script = R"(_tavo() {
    local word=${COMP_WORDS[COMP_CWORD]} before=${COMP_WORDS[COMP_CWORD - 1]} place= i files= words= options= IFS=$' \n'
    for ((i = 1; i < COMP_CWORD; ++i)); do
        case $place/${COMP_WORDS[i]} in
            )" + Joined(PathsOf(table), " | ") +
                         R"() place+=/${COMP_WORDS[i]} ;;
        esac
    done
    case "$place $before" in
)";
    const auto offers = [](const Words& words, bool files) {
        return "words='" + Joined(words, " ") + "'" + (files ? " files=1" : "") + " ;;\n";
    };
    for (const Taker& taker : table.takers)
        script +=
            "        '" + taker.path + ' ' + taker.option + "') " + offers(taker.argument->choices, taker.TakesFile());
    script += "        *) case $place in\n";
    for (const Place& place : table.places) {
        Words words = WordsOf(place.commands);
        words.insert(words.end(), place.choices.begin(), place.choices.end());
        script += "            '" + place.path + "') options='" + Joined(WordsOf(place.options), " ") + "' " +
                  offers(words, place.takesFiles);
    }
    return script + R"(        esac ;;
    esac
    if [[ $word == -* ]] || [[ -z $words$files ]]; then words=$options files=; fi
    COMPREPLY=()
    for i in $words; do [[ $i == "$word"* ]] && COMPREPLY+=("$i"); done
    if [[ $files ]]; then while IFS= read -r i; do COMPREPLY+=("$i"); done < <(compgen -f -- "$word"); fi
    # The shell then quotes what has to be; outside of a completion there is nothing to set.
    if [[ $files || $words == *'('* ]]; then compopt -o filenames 2>/dev/null; fi
}
complete -F _tavo tavo
)";
}

std::string ForZsh(const Table& table) {
    const auto described = [](const std::vector<Offer>& offers) {
        std::string list;
        for (const Offer& offer : offers)
            list += ' ' + Quoted(Replaced(offer.word, ":", "\\:") + ':' + offer.help, "'\\''");
        return list;
    };
    const auto plain = [](const Words& words) {
        std::string list;
        for (const std::string& word : words) list += ' ' + Quoted(word, "'\\''");
        return list;
    };
    std::string script =
        "#compdef tavo\n_tavo() {\n    local place= word files=\n    local -a commands options choices\n"
        "    for word in ${words[2,CURRENT-1]}; do\n        case $place/$word in\n            " +
        Joined(PathsOf(table), "|") +
        ") place+=/$word ;;\n        esac\n    done\n    case \"$place ${words[CURRENT-1]}\" in\n";
    for (const Taker& taker : table.takers) {
        const Words& choices = taker.argument->choices;
        script += "        '" + taker.path + ' ' + taker.option + "') " +
                  (taker.TakesFile() ? "_files"
                   : choices.empty() ? "_message " + Quoted(taker.argument->help, "'\\''")
                                     : "compadd --" + plain(choices)) +
                  "; return ;;\n";
    }
    script += "    esac\n    case $place in\n";
    for (const Place& place : table.places)
        script += "        '" + place.path + "') commands=(" + described(place.commands) + ") options=(" +
                  described(place.options) + ") choices=(" + plain(place.choices) + ")" +
                  (place.takesFiles ? " files=1" : "") + " ;;\n";
    return script + R"(    esac
    if [[ $PREFIX != -* ]]; then
        (( $#commands )) && _describe command commands && return
        (( $#choices )) && compadd -a choices && return
        [[ -n $files ]] && _files && return
    fi
    _describe option options
}
if [ "$funcstack[1]" = _tavo ]; then _tavo "$@"; else compdef _tavo tavo; fi
)";
}

std::string ForFish(const Table& table) {
    std::string script = "function __tavo_at\n    set -l place\n    for word in (commandline -opc)[2..-1]\n"
                         "        contains -- \"$place/$word\" " +
                         Joined(PathsOf(table), " ") +
                         "\n        and set place \"$place/$word\"\n    end\n    test \"$place\" = \"$argv[1]\"\nend\n"
                         "complete -c tavo -f\n";
    const auto quoted = [](const std::string& text) { return Quoted(Replaced(text, "\\", "\\\\"), "\\'"); };
    // An argument list is expanded once more, as a command line is.
    const auto list = [&](const Words& words) {
        return quoted(Replaced(Replaced(Joined(words, " "), "(", "\\("), ")", "\\)"));
    };
    for (const Place& place : table.places) {
        const std::string begin = "complete -c tavo -n '__tavo_at \"" + place.path + "\"'";
        for (const Offer& offer : place.commands)
            script += begin + " -a " + offer.word + " -d " + quoted(offer.help) + '\n';
        if (!place.choices.empty()) script += begin + " -a " + list(place.choices) + '\n';
        if (place.takesFiles) script += begin + " -F\n";
        for (const Offer& offer : place.options) {
            const bool isLong = offer.word.rfind("--", 0) == 0;
            script += begin + (isLong ? " -l " : " -s ") + offer.word.substr(isLong ? 2 : 1);
            for (const Taker& taker : table.takers)
                if (taker.path == place.path && taker.option == offer.word)
                    script += taker.TakesFile() ? " -r -F" : " -x -a " + list(taker.argument->choices);
            script += " -d " + quoted(offer.help) + '\n';
        }
    }
    return script;
}

std::string ForPowerShell(const Table& table) {
    const auto list = [](const Words& words) {
        std::string text;
        for (const std::string& word : words) text += (text.empty() ? "" : ", ") + Quoted(word, "''");
        return "@(" + text + ")\n";
    };
    std::string script = "Register-ArgumentCompleter -Native -CommandName tavo -ScriptBlock {\n"
                         "    param($word, $line, $cursor)\n    $places = @{\n";
    for (const Place& place : table.places) {
        Words words = WordsOf(place.commands);
        words.insert(words.end(), place.choices.begin(), place.choices.end());
        for (const Offer& offer : place.options) words.push_back(offer.word);
        script += "        '" + place.path + "' = " + list(words);
    }
    script += "    }\n    $takers = @{\n";
    for (const Taker& taker : table.takers)
        script += "        '" + taker.path + ' ' + taker.option + "' = " + list(taker.argument->choices);
    return script + R"(    }
    $place = ''
    $before = ''
    foreach ($element in $line.CommandElements | Select-Object -Skip 1) {
        if ($element.Extent.EndOffset -ge $cursor -and $word -ne '') { break }
        $before = $element.Extent.Text
        if ($places.ContainsKey("$place/$before")) { $place = "$place/$before" }
    }
    # Where nothing is offered the shell offers files.
    $offers = if ($takers.ContainsKey("$place $before")) { $takers["$place $before"] } else { $places[$place] }
    $offers | Where-Object { $_.StartsWith($word) } | ForEach-Object {
        $text = if ($_ -match '[()]') { "'$_'" } else { $_ }
        [System.Management.Automation.CompletionResult]::new($text, $_, 'ParameterValue', $_)
    }
}
)";
}

constexpr struct {
    const char* name;
    std::string (*write)(const Table&);
} kShells[] = {{"bash", ForBash}, {"zsh", ForZsh}, {"fish", ForFish}, {"powershell", ForPowerShell}};

} // namespace

Words ShellNames() {
    Words names;
    for (const auto& shell : kShells) names.push_back(shell.name);
    return names;
}

std::string Completion(const CLI::App& app, const std::string& shell) {
    const Command all = CommandOf(app, {});
    const Table table = TableOf(all);
    for (const auto& each : kShells) {
        if (shell != each.name) continue;
        const std::string script = each.write(table);
        const bool isMarked = script[0] == '#'; // a first line that the shell looks for
        const std::string comment = "# Completion of tavo, made by: tavo help completion " + shell + '\n';
        return isMarked ? script.substr(0, script.find('\n') + 1) + comment + script.substr(script.find('\n') + 1)
                        : comment + script;
    }
    return {};
}

} // namespace tool
