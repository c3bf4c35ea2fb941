// tavo xml stat

#include "commands.h"
#include "console.h"
#include "document.h"
#include "progress.h"
#include "streams.h"

#include <algorithm>
#include <TAVO/develop.h>
#include <TAVO/string.h>
#include <unordered_set>

namespace tool {

namespace {

using TAVO::String::CPPoolString;
using TAVO::String::CStringPool;

// Enough elements in memory that the pages the process takes tell something.
constexpr std::size_t kElementsToWeigh = 200000;
constexpr std::size_t kBytesToWeigh = std::size_t{64} << 20; // of text, read again for that

struct Counts {
    std::size_t elements = 0, attributes = 0, texts = 0, deepest = 0, strings = 0;
};

Counts Count(const CPXMLObject& root) {
    Counts counts;
    std::unordered_set<const wchar_t*> strings; // equal strings are one
    const auto enter = [&](const CPXMLObject& element, std::size_t depth) {
        ++counts.elements;
        counts.deepest = std::max(counts.deepest, depth + 1);
        strings.insert(element.GetName());
        CPPoolString name, value;
        for (std::size_t i = 0; element.GetAttribute(i, name, value); ++i, ++counts.attributes) {
            strings.insert(name);
            strings.insert(value);
        }
        if (const CPPoolString data = element.GetData(); data.isdef()) {
            ++counts.texts;
            strings.insert(data);
        }
    };
    Walk(root, enter, [](const CPXMLObject&, std::size_t) {});
    counts.strings = strings.size();
    return counts;
}

struct Item {
    Document document;
    Counts counts;
    double best = 0, sum = 0; // milliseconds
};

void Row(const char* what, const std::string& value) {
    std::string label = std::string("  ") + what;
    label.resize(24, ' ');
    Print(label + value + '\n');
}

std::string Decimal(double value, const char* unit) {
    char text[64];
    std::snprintf(text, sizeof(text), "%.*f", value < 10 ? 3 : 1, value);
    return text + std::string(unit);
}

std::string Speed(std::size_t bytes, double milliseconds) {
    return milliseconds > 0 ? Decimal(static_cast<double>(bytes) / 1e3 / milliseconds, " MB/s") : "too fast to measure";
}

// Milliseconds of one reading from memory to tree; the release of the tree is not counted.
double Time(const Document& document) {
    const auto begin = TAVO::Develop::_now_nano();
    const CPXMLObject tree = document.Parse();
    return static_cast<double>(TAVO::Develop::_now_nano() - begin) / 1e6;
}

void Measure(Item& item, unsigned repeat, Progress& progress) {
    for (unsigned i = 0; i < repeat; ++i) {
        progress.Step(item.document.Name());
        const double time = Time(item.document);
        item.best = i == 0 ? time : std::min(item.best, time);
        item.sum += time;
    }
}

// How much the process grows by while it holds these documents' trees again and again. Their strings are in the pool
// already, so only nodes, attributes and children count.
double WeighElement(const std::vector<Item>& items, std::size_t elements, std::size_t bytes) {
    const std::size_t copies = std::max<std::size_t>(
        1, std::min(kElementsToWeigh / elements, kBytesToWeigh / std::max<std::size_t>(1, bytes)));
    std::vector<CPXMLObject> trees;
    trees.reserve(copies * items.size());
    Progress progress("weighing", copies * items.size());
    const std::size_t before = console::ProcessMemory();
    for (std::size_t i = 0; i < copies; ++i)
        for (const Item& item : items) {
            progress.Step(item.document.Name());
            trees.push_back(item.document.Parse());
        }
    const std::size_t after = console::ProcessMemory();
    return after > before ? static_cast<double>(after - before) / static_cast<double>(copies * elements) : 0;
}

void PrintItem(const Item& item, unsigned repeat) {
    const Counts& counts = item.counts;
    Print(item.document.Name() + '\n');
    Row("size", Grouped(item.document.Size()) + " bytes, " + (item.document.IsUtf16() ? "UTF-16" : "UTF-8"));
    Row("elements", Grouped(counts.elements) + ", " + Grouped(counts.deepest) +
                        (counts.deepest == 1 ? " level" : " levels") + " deep");
    Row("attributes", Grouped(counts.attributes));
    Row("texts", Grouped(counts.texts));
    Row("distinct strings", Grouped(counts.strings));
    Row("reading",
        Decimal(item.best, " ms at best, ") + Decimal(item.sum / repeat, " ms on average of ") + Grouped(repeat));
    Row("speed", Speed(item.document.Size(), item.best));
}

} // namespace

int Stat(const StatOptions& options) {
    int worst = kFine;
    std::vector<Item> items;
    Counts total;
    std::size_t bytes = 0;
    const auto poolBefore = CStringPool::GetSize();
    const auto stringsBefore = CStringPool::GetNItems();
    {
        Progress progress("reading", options.files.size());
        for (const std::string& file : options.files) {
            progress.Step(file);
            Item item;
            const int code = item.document.Need(file);
            worst = std::max(worst, code);
            if (code != kFine) continue;
            item.counts = Count(item.document.Root());
            total.elements += item.counts.elements;
            bytes += item.document.Size();
            items.push_back(std::move(item));
        }
    }
    if (items.empty()) return worst;
    const auto pool = CStringPool::GetSize() - poolBefore;
    const auto strings = CStringPool::GetNItems() - stringsBefore;

    double time = 0;
    {
        Progress progress("timing", items.size() * options.repeat);
        for (Item& item : items) {
            Measure(item, options.repeat, progress);
            time += item.best;
        }
    }
    const double weight = WeighElement(items, total.elements, bytes); // last: it leaves a large heap behind
    for (const Item& item : items) PrintItem(item, options.repeat);
    Print(items.size() == 1 ? "memory\n" : Grouped(items.size()) + " documents\n");
    if (items.size() > 1) {
        Row("size", Grouped(bytes) + " bytes");
        Row("elements", Grouped(total.elements));
        Row("speed", Speed(bytes, time));
    }
    Row("per element", weight > 0 ? Decimal(weight, " bytes: growth of the process, attributes included, strings not")
                                  : "the process did not grow: nothing to tell");
    Row("pool", Grouped(pool) + " bytes in " + Grouped(strings) + " strings that were new");
    return worst;
}

} // namespace tool
