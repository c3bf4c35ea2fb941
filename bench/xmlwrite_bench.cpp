// Writing element trees as UTF-8 into memory, beside pugixml's writer. Both make the same text.

#include <benchmark/benchmark.h>
#include <string>
#include <TAVO/xml.h>
#if defined(TAVO_PEER_PUGIXML)
#include <pugixml.hpp>
#endif

namespace {

using TAVO::XML::CPXMLObject;

struct Sample {
    const char* name;
    int elements;
    const char* value;
    const char* data;
    bool pretty;
};

const std::string kLong(2000, 'x');

constexpr const char* kMixedValue = "a < b & c > \"d\"";
const Sample kSamples[] = {
    {"small elements", 10000, "17", "text", false},
    {"long data", 500, "17", kLong.c_str(), false},
    {"escaped values", 10000, kMixedValue, "text", false},
    {"small elements, pretty", 10000, "17", "text", true},
};

CPXMLObject MakeTree(const Sample& sample) {
    CPXMLObject root;
    root.SetName(L"root");
    for (int i = 0; i < sample.elements; ++i) {
        CPXMLObject element;
        element.SetName(L"element");
        element.AddAttribute(L"id", TAVO::String::CPPoolString(sample.value));
        element.AddAttribute(L"kind", L"clip");
        element.AddTag(L"child", TAVO::String::CPPoolString(sample.data));
        root.Add(element);
    }
    return root;
}

void WriteTavo(benchmark::State& state) {
    const Sample& sample = kSamples[state.range(0)];
    const CPXMLObject root = MakeTree(sample);
    TAVO::Buffers::CPPlainMemory out;
    for (auto _ : state) {
        if (!root.Write(out, TAVO::XML::XMLEncodingUTF8, sample.pretty)) state.SkipWithError("not written");
        benchmark::DoNotOptimize(out);
    }
    state.SetLabel(sample.name);
    state.SetBytesProcessed(static_cast<std::int64_t>(state.iterations() * (out.GetSize() - 1)));
}
BENCHMARK(WriteTavo)->DenseRange(0, 3);

#if defined(TAVO_PEER_PUGIXML)
struct Collector : pugi::xml_writer {
    std::string text;
    void write(const void* data, std::size_t size) override { text.append(static_cast<const char*>(data), size); }
};

void WritePugixml(benchmark::State& state) {
    const Sample& sample = kSamples[state.range(0)];
    pugi::xml_document document;
    pugi::xml_node root = document.append_child("root");
    for (int i = 0; i < sample.elements; ++i) {
        pugi::xml_node element = root.append_child("element");
        element.append_attribute("id") = sample.value;
        element.append_attribute("kind") = "clip";
        element.append_child("child").text() = sample.data;
    }
    std::size_t size = 0;
    for (auto _ : state) {
        Collector out;
        document.save(out, "  ", sample.pretty ? pugi::format_indent : pugi::format_raw, pugi::encoding_utf8);
        size = out.text.size();
        benchmark::DoNotOptimize(out.text.data());
    }
    state.SetLabel(sample.name);
    state.SetBytesProcessed(static_cast<std::int64_t>(state.iterations() * size));
}
BENCHMARK(WritePugixml)->DenseRange(0, 3);
#endif

} // namespace
