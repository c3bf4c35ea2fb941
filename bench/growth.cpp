// How each job's time grows when its input doubles. A machine that others use changes its speed by the second, so sizes
// are compared in pairs: a job of n, one of 2n and one of n again, in a row, and the median of many such ratios counts.
// Before each, other memory is walked through: what is done over and over on the same data tells where caches end.

#include "documents.h"

#include <algorithm>
#include <chrono>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <functional>
#include <memory>
#include <string>
#include <TAVO/internetional.h>
#include <TAVO/xml.h>
#include <vector>

namespace {

using TAVO::String::CPPoolString;
using TAVO::String::CStringPool;
using TAVO::XML::CPXMLObject;
using TAVO::XML::CXMLDoc;

// Times, for twice the input. More than the first is marked; more than the second is a fault: work that grows with the
// square shows as 4.
constexpr double kLinear = 2.2, kMost = 3.3;

// --- Measuring -----------------------------------------------------------------------------------------------------

void EmptyCaches() {
    static std::vector<char> other(std::size_t{64} << 20);
    for (std::size_t i = 0; i < other.size(); i += 64) ++other[i];
}

template <class Work> double Seconds(Work work) {
    EmptyCaches();
    const auto start = std::chrono::steady_clock::now();
    work();
    return std::chrono::duration<double>(std::chrono::steady_clock::now() - start).count();
}

// Does a job once and tells the seconds of that part which counts.
using Repetition = std::function<double()>;

struct Job {
    const char* name;
    std::size_t first, last; // sizes, the last one a multiple of the first by a power of two
    const char* unit;
    std::function<Repetition(std::size_t size)> prepare;
};

// Long enough for the clock, short enough for the machine to stay as it is.
double Average(const Repetition& repetition) {
    constexpr double kEnough = 0.004;
    double all = 0;
    int count = 0;
    for (; all < kEnough && count < 1000; ++count) all += repetition();
    return all / count;
}

double Median(std::vector<double> values) {
    const auto middle = values.begin() + static_cast<std::ptrdiff_t>(values.size() / 2);
    std::nth_element(values.begin(), middle, values.end());
    return *middle;
}

// Prints a row for each doubling; false when one grows too much.
bool Measure(const Job& job, int rounds) {
    bool withinBounds = true;
    for (std::size_t size = job.first; size < job.last; size *= 2) {
        const Repetition single = job.prepare(size), twice = job.prepare(size * 2);
        Average(single);
        std::vector<double> ratios, times;
        for (int round = 0; round < rounds; ++round) {
            const double before = Average(single);
            times.push_back(Average(twice));
            ratios.push_back(times.back() * 2 / (before + Average(single)));
        }
        const double growth = Median(ratios);
        std::printf("%-44s %7zu to %7zu %-4s %5.2f  %10.3f ms%s\n", job.name, size, size * 2, job.unit, growth,
                    Median(times) * 1e3,
                    growth > kMost     ? "  too much"
                    : growth > kLinear ? "  *"
                                       : "");
        std::fflush(stdout);
        withinBounds = withinBounds && growth <= kMost;
    }
    return withinBounds;
}

// --- The jobs ------------------------------------------------------------------------------------------------------

void Require(bool done) {
    if (!done) std::abort();
}

// Nothing unreferenced is left in the pool.
void Sweep() {
    CStringPool::Collect(60000);
    CStringPool::Collect(60000);
}

const unsigned char* Bytes(const std::string& text) { return reinterpret_cast<const unsigned char*>(text.c_str()); }

using Document = std::shared_ptr<CXMLDoc>;

Document Open(const std::string& text) {
    auto document = std::make_shared<CXMLDoc>();
    Require(document->OpenDocText(const_cast<char*>(text.data()), text.size()));
    return document;
}

auto Parsing(documents::Kind kind) {
    return [kind](std::size_t kilobytes) -> Repetition {
        return [text = documents::Make(kind, kilobytes * 1000)] {
            Document document;
            const double seconds = Seconds([&] { document = Open(text); });
            document.reset();
            Sweep();
            return seconds;
        };
    };
}

Repetition ParsingUtf16(std::size_t kilobytes) {
    const std::string text = documents::Make(documents::Kind::Small, kilobytes * 1000);
    std::u16string wide = u"\xFEFF";
    wide.append(text.begin() + static_cast<std::ptrdiff_t>(text.find("\n<project")), text.end());
    return [wide] {
        CXMLDoc document;
        const double seconds = Seconds(
            [&] { Require(document.OpenDocText(const_cast<char16_t*>(wide.data()), wide.size() * sizeof(wide[0]))); });
        document.Close();
        Sweep();
        return seconds;
    };
}

auto Writing(documents::Kind kind, TAVO::XML::eXMLEncoding encoding, bool pretty) {
    return [=](std::size_t kilobytes) -> Repetition {
        return [document = Open(documents::Make(kind, kilobytes * 1000)), encoding, pretty] {
            return Seconds([&] {
                TAVO::Buffers::CPPlainMemory out;
                Require(document->GetRootElement().Write(out, encoding, pretty));
            });
        };
    };
}

Repetition Closing(std::size_t kilobytes) {
    return [text = documents::Make(documents::Kind::Small, kilobytes * 1000)] {
        const Document document = Open(text);
        const double seconds = Seconds([&] { document->Close(); });
        Sweep();
        return seconds;
    };
}

Repetition Sweeping(std::size_t kilobytes) {
    return [text = documents::Make(documents::Kind::Small, kilobytes * 1000)] {
        Open(text);
        return Seconds(Sweep);
    };
}

Repetition Appending(std::size_t count) {
    return [count] {
        CPXMLObject root;
        const CPPoolString name(L"child");
        Require(root.SetName(name));
        return Seconds([&] {
            for (std::size_t i = 0; i < count; ++i) Require(bool(root.AddTag(name)));
            root.free();
        });
    };
}

// Clip names, in no order of their numbers.
std::vector<std::string> Names(std::size_t count) {
    std::vector<std::string> names;
    for (std::size_t i = 0; i < count; ++i) names.push_back("clip-" + std::to_string(i * 7919 % 10000019));
    return names;
}

std::vector<CPPoolString> Intern(const std::vector<std::string>& names) {
    std::vector<CPPoolString> texts;
    texts.reserve(names.size());
    for (const std::string& name : names) texts.emplace_back(Bytes(name));
    return texts;
}

Repetition InterningNew(std::size_t count) {
    return [names = Names(count)] {
        std::vector<CPPoolString> texts;
        const double seconds = Seconds([&] { texts = Intern(names); });
        texts.clear();
        Sweep();
        return seconds;
    };
}

Repetition InterningPresent(std::size_t count) {
    return [names = Names(count), present = Intern(Names(count))] { return Seconds([&] { Intern(names); }); };
}

// Splits a text of short pieces and joins them again.
Repetition SplittingAndJoining(std::size_t count) {
    std::string joined;
    for (std::size_t i = 0; i < count; ++i) joined += std::to_string(i % 500) + ' ';
    joined.pop_back();
    return [text = CPPoolString(Bytes(joined))] {
        return Seconds([&] {
            TAVO::String::CPPoolStringArray array(false);
            Require(array.Inflate(text, L' ') && array.Flatten(L' ') == text);
        });
    };
}

std::string MixedText(std::size_t kilobytes) {
    std::string text;
    while (text.size() < kilobytes * 1000) text += "Съешь ещё этих мягких французских булок, and drink some tea. ";
    return text;
}

Repetition Widening(std::size_t kilobytes) {
    const std::string text = MixedText(kilobytes);
    return [text, wide = std::vector<wchar_t>(text.size() + 1)]() mutable {
        return Seconds(
            [&] { Require(TAVO::String::UTF8_To_acfWChar(Bytes(text), text.size(), wide.data(), wide.size()) != 0); });
    };
}

Repetition Narrowing(std::size_t kilobytes) {
    std::vector<unsigned char> bytes(kilobytes * 1000 + 1000);
    const std::string text = MixedText(kilobytes);
    std::vector<wchar_t> wide(text.size() + 1);
    wide.resize(TAVO::String::UTF8_To_acfWChar(Bytes(text), text.size(), wide.data(), wide.size()));
    return [wide, bytes]() mutable {
        return Seconds([&] {
            Require(TAVO::String::acfWChar_To_UTF8(wide.data(), wide.size(), bytes.data(), bytes.size()) != 0);
        });
    };
}

Repetition Escaping(std::size_t kilobytes) {
    std::string text;
    while (text.size() < kilobytes * 1000) text += "Shot 12 – take 3/picture.mxf ";
    using namespace TAVO::Internetional;
    std::vector<unsigned char> escaped(text.size() * 3 + 1), plain(text.size() * 3 + 1);
    return [text, escaped, plain]() mutable {
        return Seconds([&] {
            URL_encodebuffer(escaped.data(), Bytes(text), Bytes("/"));
            URL_decodebuffer(plain.data(), escaped.data());
            Require(std::memcmp(plain.data(), text.data(), text.size()) == 0);
        });
    };
}

Repetition CarryingBytes(std::size_t kilobytes) {
    std::string bytes(kilobytes * 1000, 0);
    std::uint32_t seed = 1;
    for (char& byte : bytes) byte = static_cast<char>((seed = seed * 1664525 + 1013904223) >> 24);
    return [bytes] {
        using namespace TAVO::String;
        const double seconds = Seconds([&] {
            const CPPoolString text = C3FFFEncoder(bytes.data(), bytes.size());
            const TAVO::Buffers::CPPlainMemory back = C3FFFDecoder(text);
            Require(back.GetSize() == bytes.size());
        });
        Sweep();
        return seconds;
    };
}

const std::vector<Job>& Jobs() {
    using documents::Kind;
    using namespace TAVO::XML;
    static const std::vector<Job> jobs = {
        {"parse small elements", 1000, 64000, "kB", Parsing(Kind::Small)},
        {"parse small elements as UTF-16", 1000, 16000, "kB", ParsingUtf16},
        {"parse deep elements", 1000, 16000, "kB", Parsing(Kind::Deep)},
        {"parse long texts", 1000, 16000, "kB", Parsing(Kind::LongText)},
        {"parse repeated values", 1000, 16000, "kB", Parsing(Kind::Repeated)},
        {"parse distinct values", 1000, 16000, "kB", Parsing(Kind::Distinct)},
        {"parse many scripts", 1000, 16000, "kB", Parsing(Kind::Scripts)},
        {"write small elements", 1000, 64000, "kB", Writing(Kind::Small, XMLEncodingUTF8, false)},
        {"write small elements, UTF-16, indented", 1000, 16000, "kB", Writing(Kind::Small, XMLEncodingUTF16, true)},
        {"write deep elements", 1000, 16000, "kB", Writing(Kind::Deep, XMLEncodingUTF8, false)},
        {"write long texts", 1000, 16000, "kB", Writing(Kind::LongText, XMLEncodingUTF8, false)},
        {"write repeated values", 1000, 16000, "kB", Writing(Kind::Repeated, XMLEncodingUTF8, false)},
        {"write distinct values", 1000, 16000, "kB", Writing(Kind::Distinct, XMLEncodingUTF8, false)},
        {"write many scripts", 1000, 16000, "kB", Writing(Kind::Scripts, XMLEncodingUTF8, false)},
        {"close a document", 1000, 16000, "kB", Closing},
        {"sweep what it held", 1000, 16000, "kB", Sweeping},
        {"append children and let them go", 62500, 1000000, "", Appending},
        {"intern new strings", 62500, 1000000, "", InterningNew},
        {"intern present strings", 62500, 1000000, "", InterningPresent},
        {"split a text and join it", 62500, 1000000, "", SplittingAndJoining},
        {"UTF-8 to wide", 60, 15360, "kB", Widening},
        {"wide to UTF-8", 60, 15360, "kB", Narrowing},
        {"escape a URL and back", 1000, 16000, "kB", Escaping},
        {"bytes to 3FFF text and back", 1000, 16000, "kB", CarryingBytes},
    };
    return jobs;
}

} // namespace

// Arguments: a part of the names of the jobs that are wanted, and the rounds; all, and 9.
int main(int count, char** arguments) {
    const char* const wanted = count > 1 ? arguments[1] : "";
    const int rounds = count > 2 ? std::max(1, std::atoi(arguments[2])) : 9;
    bool withinBounds = true;
    for (const Job& job : Jobs())
        if (std::strstr(job.name, wanted)) withinBounds = Measure(job, rounds) && withinBounds;
    return withinBounds ? 0 : 1;
}
