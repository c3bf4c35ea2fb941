// tavo text

#include "commands.h"
#include "encodings.h"
#include "facts.h"
#include "position.h"
#include "streams.h"
#include "text.h"

#include <algorithm>
#include <TAVO/string.h>
#include <utility>

namespace tool {

namespace {

// A file's bytes as text of a format.
class Source {
public:
    // Gives an exit code, after complaining.
    int Read(const std::string& file, const std::string& format) {
        m_name = file == "-" ? "(standard input)" : file;
        std::string trouble;
        if (!ReadAll(file, m_bytes, trouble)) {
            Complain(m_name + ": " + trouble);
            return kFileTrouble;
        }
        m_format = format.empty() ? &GuessTextFormat(m_bytes) : &FindTextFormat(format);
        return kFine;
    }
    const std::string& Name() const { return m_name; }
    const std::string& Bytes() const { return m_bytes; }
    const TextFormat& Format() const { return *m_format; }

private:
    std::string m_name, m_bytes;
    const TextFormat* m_format = nullptr;
};

// A reading of a text: how far it goes, and what stops it.
struct Scan {
    TextPlace place; // of the fault, or the end
    std::size_t at = 0;
    std::size_t characters = 0;
    std::size_t utf8 = 0, utf16 = 0; // bytes and units that they take
    std::string fault;               // empty at the end of the text

    void Pass(const Character& character) {
        place.Pass(character.value);
        ++characters;
        utf8 += TAVO::String::UTF8Size(character.value);
        utf16 += TAVO::String::UTF16Size(character.value);
    }
};

std::string RestFault(const EncodedText& text) {
    return text.Rest() == 0 ? std::string() : "the text is truncated: it ends inside a unit";
}

// Reads as the standard has it, up to the first fault.
Scan ScanStandard(const EncodedText& text) {
    Scan scan;
    scan.at = text.Begin();
    while (scan.at < text.End()) {
        const Character character = text.Standard(scan.at);
        if (!character.fault.empty()) {
            scan.fault = character.fault;
            return scan;
        }
        scan.Pass(character);
        scan.at += character.units;
    }
    scan.fault = RestFault(text);
    return scan;
}

// Where a character begins, in a text.
struct Spot {
    const EncodedText& text;
    TextPlace place;
    std::size_t at;

    std::string Shown() const {
        return place.Shown() + (text.HasOffsets() ? " (byte offset " + std::to_string(text.Offset(at)) + ')' : "");
    }
};

// Characters that become others.
struct Changes {
    std::size_t count = 0;
    std::string first;

    // `becomes` is put before the code point: "read as U+0001".
    void Add(const Spot& spot, const Character& standard, const char* becomes, const std::string& value) {
        if (count++ > 0) return;
        first = "at " + spot.Shown() + ", " +
                (standard.fault.empty() ? CodePointName(standard.value) + " is " : standard.fault + "; it is ") +
                becomes + value;
    }
    std::string Told() const {
        return count == 1 ? "1 character is changed: " + first
                          : Grouped(count) + " characters are changed; the first " + first;
    }
};

// Reads by the library's steps, up to the first that fails.
Scan ScanLibrary(const EncodedText& text, Changes& changes) {
    Scan scan;
    Character character;
    for (scan.at = text.Begin(); scan.at < text.End(); scan.at += character.units) {
        if (!text.Library(scan.at, character)) {
            scan.fault = "it stops";
            return scan;
        }
        Character standard = text.Standard(scan.at);
        if (!standard.fault.empty() || standard.value != character.value) {
            if (!standard.fault.empty()) standard.fault = "a fault"; // told elsewhere
            changes.Add({text, scan.place, scan.at}, standard, "read as ", CodePointName(character.value));
        }
        scan.Pass(character);
    }
    return scan;
}

std::string LibraryVerdict(const EncodedText& text) {
    Changes changes;
    const Scan scan = ScanLibrary(text, changes);
    return (scan.fault.empty() ? "reads all of it" : "stops at " + Spot{text, scan.place, scan.at}.Shown()) +
           (changes.count > 0 ? "; " + changes.Told() : "");
}

// Adds one character in another encoding, as the library writes it. False when it does not.
bool Recode(const Spot& spot, const Character& read, const Character& standard, const TextFormat& to,
            std::string& bytes, Changes& changes) {
    const std::size_t size = bytes.size();
    if (!AddEncoded(bytes, read.value, to)) return false;
    if (!standard.fault.empty() || read.value != standard.value) {
        changes.Add(spot, standard, "read as ", CodePointName(read.value));
        return true;
    }
    if (read.value < 0x80) return true;
    TextFormat bare = to;
    bare.marked = false;
    const EncodedText written(std::string_view(bytes).substr(size), bare);
    const Character back = written.End() > 0 ? written.Standard(0) : Character{0, 0, "nothing"};
    const bool whole = back.fault.empty() && back.units == written.End();
    if (!whole || back.value != read.value)
        changes.Add(spot, standard, "written as ", whole ? CodePointName(back.value) : "no character");
    return true;
}

// Complains with the place.
int Refuse(const Source& source, const Spot& spot, const std::string& fault) {
    Complain(source.Name() + ':' + spot.Shown() + ": " + fault);
    return kBadInput;
}

// Looks at one text after the other, and prints the JSON rows that `look(source, text, rows)` collected. The highest
// code counts.
template <class Look> int ForEachText(const TextOptions& options, Look look) {
    int worst = kFine;
    std::vector<std::string> rows;
    for (const std::string& file : options.files) {
        Source source;
        int code = source.Read(file, options.from);
        if (code == kFine) code = look(source, EncodedText(source.Bytes(), source.Format()), rows);
        worst = std::max(worst, code);
    }
    if (options.json) Print(JsonArray(rows));
    return worst;
}

} // namespace

int TextRecode(const TextRecodeOptions& options) {
    Source source;
    if (const int code = source.Read(options.file, options.from); code != kFine) return code;
    const EncodedText text(source.Bytes(), source.Format());
    const TextFormat& to = FindTextFormat(options.to);

    std::string bytes;
    if (to.marked && to.unit > 1) AddEncoded(bytes, 0xFEFF, to);
    Spot spot{text, {}, text.Begin()};
    Changes changes;
    Character read;
    for (; spot.at < text.End(); spot.at += read.units) {
        const bool known = text.Library(spot.at, read);
        const Character standard = text.Standard(spot.at);
        if (!known || !Recode(spot, read, standard, to, bytes, changes))
            return Refuse(source, spot, standard.fault + "; nothing is written");
        spot.place.Pass(read.value);
    }
    if (const std::string fault = RestFault(text); !fault.empty())
        return Refuse(source, spot, fault + "; nothing is written");
    if (changes.count > 0) {
        Complain(source.Name() + (options.strict ? ": not written: " : ": note: ") + changes.Told());
        if (options.strict) return kBadInput;
    }
    std::string trouble;
    if (WriteAll(options.output, bytes, trouble)) return kFine;
    Complain(options.output + ": " + trouble);
    return kFileTrouble;
}

int TextCount(const TextOptions& options) {
    bool isFirst = true;
    return ForEachText(options, [&](const Source& source, const EncodedText& text, std::vector<std::string>& rows) {
        Changes changes;
        const Scan standard = ScanStandard(text), library = ScanLibrary(text, changes);
        const bool valid = standard.fault.empty();
        if (!valid)
            Refuse(source, {text, standard.place, standard.at}, standard.fault + "; the standard's counts end there");
        Facts facts;
        facts.AddText("file", Cleaned(source.Name()));
        facts.AddText("encoding", source.Format().name);
        const auto add = [&](const char* label, std::size_t count) { facts.Add(label, std::to_string(count)); };
        add("bytes", source.Bytes().size());
        add("units", source.Bytes().size() / source.Format().unit);
        add("characters", standard.characters);
        add("utf8 bytes", standard.utf8);
        add("utf16 units", standard.utf16);
        add("lib characters", library.characters);
        add("lib utf8 bytes", library.utf8);
        add("lib utf16 units", library.utf16);
        if (options.json) {
            rows.push_back(facts.Json());
        } else {
            if (!std::exchange(isFirst, false)) Print("\n");
            Print(facts.Lines());
        }
        return valid ? kFine : kBadInput;
    });
}

int TextValidate(const TextOptions& options) {
    return ForEachText(options, [&](const Source& source, const EncodedText& text, std::vector<std::string>& rows) {
        const Scan scan = ScanStandard(text);
        const bool valid = scan.fault.empty();
        const std::string library = LibraryVerdict(text), encoding = source.Format().name;
        if (options.json) {
            Facts facts;
            facts.AddText("file", Cleaned(source.Name()));
            facts.AddText("encoding", encoding);
            facts.Add("valid", valid);
            if (valid) {
                facts.Add("characters", std::to_string(scan.characters));
            } else {
                facts.Add("line", std::to_string(scan.place.line));
                facts.Add("column", std::to_string(scan.place.column));
                facts.Add("offset", text.HasOffsets() ? std::to_string(text.Offset(scan.at)) : "null");
                facts.AddText("reason", scan.fault);
            }
            facts.AddText("library", library);
            rows.push_back(facts.Json());
        } else if (valid) {
            Print(source.Name() + ": valid " + encoding + ", " + Grouped(scan.characters) +
                  (scan.characters == 1 ? " character" : " characters") + "; the library " + library + '\n');
        } else {
            Print(source.Name() + ':' + scan.place.Shown() + ": invalid " + encoding +
                  (text.HasOffsets() ? " at byte offset " + std::to_string(text.Offset(scan.at)) : "") + ": " +
                  scan.fault + "; the library " + library + '\n');
        }
        return valid ? kFine : kBadInput;
    });
}

} // namespace tool
