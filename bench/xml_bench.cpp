// Reading and writing XML beside pugixml, tinyxml2, libxml2 (DOM) and expat (bare events, nothing kept).

#include "documents.h"

#include <benchmark/benchmark.h>
#include <map>
#include <sstream>
#include <TAVO/xml.h>
#include <vector>
#if defined(TAVO_PEER_PUGIXML)
#include <pugixml.hpp>
#endif
#if defined(TAVO_PEER_TINYXML2)
#include <tinyxml2.h>
#endif
#if defined(TAVO_PEER_LIBXML_2_0)
#include <libxml/parser.h>
#endif
#if defined(TAVO_PEER_EXPAT)
#include <expat.h>
#endif

namespace {

using documents::Kind;

const std::string& Document(const benchmark::State& state) {
    static std::map<std::pair<int, int>, std::string> made;
    std::string& text = made[{static_cast<int>(state.range(0)), static_cast<int>(state.range(1))}];
    if (text.empty()) text = documents::Make(static_cast<Kind>(state.range(0)), state.range(1) * 100000);
    return text;
}

// Strings of one run must not make the next one cheaper.
void Sweep() {
    TAVO::String::CStringPool::Collect(60000);
    TAVO::String::CStringPool::Collect(60000);
}

// Times `parse(text)`; what it returns is dropped untimed.
template <class Parse> void Run(benchmark::State& state, Parse parse) {
    const std::string& text = Document(state);
    for (auto _ : state) {
        auto tree = parse(text);
        benchmark::DoNotOptimize(tree);
        state.PauseTiming();
        { const auto gone = std::move(tree); }
        Sweep();
        state.ResumeTiming();
    }
    state.SetBytesProcessed(static_cast<std::int64_t>(state.iterations() * text.size()));
    state.SetLabel(documents::Name(static_cast<Kind>(state.range(0))));
}

void ParseTavo(benchmark::State& state) {
    Run(state, [](const std::string& text) {
        auto document = std::make_unique<TAVO::XML::CXMLDoc>();
        if (!document->OpenDocText(const_cast<char*>(text.data()), text.size())) std::abort();
        return document;
    });
}

void ParseTavoUtf16(benchmark::State& state) {
    static std::map<std::size_t, std::u16string> made;
    const std::string& source = Document(state);
    std::u16string& wide = made[source.size()];
    if (wide.empty()) {
        wide = u"\xFEFF";
        wide.append(source.begin() + static_cast<std::ptrdiff_t>(source.find("\n<project")), source.end());
    }
    Run(state, [&](const std::string&) {
        auto document = std::make_unique<TAVO::XML::CXMLDoc>();
        if (!document->OpenDocText(wide.data(), wide.size() * 2)) std::abort();
        return document;
    });
}

// The two ends of a tree's life that parsing alone does not show.
void ReleaseTavo(benchmark::State& state) {
    const std::string& text = Document(state);
    for (auto _ : state) {
        state.PauseTiming();
        TAVO::XML::CXMLDoc document;
        document.OpenDocText(const_cast<char*>(text.data()), text.size());
        state.ResumeTiming();
        document.Close();
        state.PauseTiming();
        Sweep();
        state.ResumeTiming();
    }
    state.SetBytesProcessed(static_cast<std::int64_t>(state.iterations() * text.size()));
}

#if defined(TAVO_PEER_PUGIXML)
void ParsePugixml(benchmark::State& state) {
    Run(state, [](const std::string& text) {
        auto document = std::make_unique<pugi::xml_document>();
        if (!document->load_buffer(text.data(), text.size())) std::abort();
        return document;
    });
}
#endif
#if defined(TAVO_PEER_TINYXML2)
void ParseTinyxml2(benchmark::State& state) {
    Run(state, [](const std::string& text) {
        auto document = std::make_unique<tinyxml2::XMLDocument>();
        if (document->Parse(text.data(), text.size()) != tinyxml2::XML_SUCCESS) std::abort();
        return document;
    });
}
#endif
#if defined(TAVO_PEER_LIBXML_2_0)
struct FreeDocument {
    void operator()(xmlDoc* document) const { xmlFreeDoc(document); }
};
void ParseLibxml2(benchmark::State& state) {
    Run(state, [](const std::string& text) {
        return std::unique_ptr<xmlDoc, FreeDocument>(
            xmlReadMemory(text.data(), static_cast<int>(text.size()), nullptr, nullptr, XML_PARSE_HUGE));
    });
}
#endif
#if defined(TAVO_PEER_EXPAT)
void ParseExpatSax(benchmark::State& state) {
    Run(state, [](const std::string& text) {
        XML_Parser parser = XML_ParserCreate(nullptr);
        XML_SetElementHandler(
            parser, [](void*, const XML_Char*, const XML_Char**) {}, [](void*, const XML_Char*) {});
        XML_SetCharacterDataHandler(parser, [](void*, const XML_Char*, int) {});
        if (XML_Parse(parser, text.data(), static_cast<int>(text.size()), 1) != XML_STATUS_OK) std::abort();
        XML_ParserFree(parser);
        return std::make_unique<int>(0);
    });
}
#endif

void WriteTavo(benchmark::State& state) {
    const std::string& text = Document(state);
    TAVO::XML::CXMLDoc document;
    document.OpenDocText(const_cast<char*>(text.data()), text.size());
    std::size_t size = 0;
    for (auto _ : state) {
        TAVO::Buffers::CPPlainMemory out;
        if (!document.GetRootElement().Write(out, TAVO::XML::XMLEncodingUTF8, false)) std::abort();
        size = out.GetSize();
    }
    state.SetBytesProcessed(static_cast<std::int64_t>(state.iterations() * size));
}

#if defined(TAVO_PEER_PUGIXML)
// Collects what is written, as our memory target does.
struct Collector : pugi::xml_writer {
    std::string text;
    void write(const void* data, std::size_t size) override { text.append(static_cast<const char*>(data), size); }
};
void WritePugixml(benchmark::State& state) {
    const std::string& text = Document(state);
    pugi::xml_document document;
    document.load_buffer(text.data(), text.size());
    std::size_t size = 0;
    for (auto _ : state) {
        Collector out;
        document.save(out, "", pugi::format_raw, pugi::encoding_utf8);
        size = out.text.size();
    }
    state.SetBytesProcessed(static_cast<std::int64_t>(state.iterations() * size));
}
#endif

void Sizes(benchmark::internal::Benchmark* benchmark) {
    for (int tenths : {10, 20, 50, 100, 500}) benchmark->Args({static_cast<int>(Kind::Small), tenths});
    for (Kind kind : {Kind::LongText, Kind::Repeated, Kind::Distinct, Kind::Scripts})
        for (int tenths : {50, 100}) benchmark->Args({static_cast<int>(kind), tenths});
    benchmark->Unit(benchmark::kMillisecond);
}

// libxml2 and tinyxml2 refuse or recurse.
void Depths(benchmark::internal::Benchmark* benchmark) {
    for (int tenths : {50, 100}) benchmark->Args({static_cast<int>(Kind::Deep), tenths});
    benchmark->Unit(benchmark::kMillisecond);
}

void Small(benchmark::internal::Benchmark* benchmark) {
    for (int tenths : {10, 50, 100}) benchmark->Args({static_cast<int>(Kind::Small), tenths});
    benchmark->Unit(benchmark::kMillisecond);
}

void Texts(benchmark::internal::Benchmark* benchmark) {
    for (Kind kind : {Kind::LongText, Kind::Scripts}) benchmark->Args({static_cast<int>(kind), 50});
    benchmark->Unit(benchmark::kMillisecond);
}

// With the other sizes: how time grows when the input doubles.
void Doublings(benchmark::internal::Benchmark* benchmark) {
    for (int tenths : {200, 400}) benchmark->Args({static_cast<int>(Kind::Small), tenths});
    benchmark->Unit(benchmark::kMillisecond);
}

BENCHMARK(ParseTavo)->Apply(Sizes)->Apply(Depths)->Apply(Doublings);
BENCHMARK(ParseTavoUtf16)->Apply(Small);
BENCHMARK(ReleaseTavo)->Apply(Small);
#if defined(TAVO_PEER_PUGIXML)
BENCHMARK(ParsePugixml)->Apply(Sizes)->Apply(Depths);
#endif
#if defined(TAVO_PEER_TINYXML2)
BENCHMARK(ParseTinyxml2)->Apply(Sizes)->Apply(Doublings);
#endif
#if defined(TAVO_PEER_LIBXML_2_0)
BENCHMARK(ParseLibxml2)->Apply(Sizes);
#endif
#if defined(TAVO_PEER_EXPAT)
BENCHMARK(ParseExpatSax)->Apply(Sizes)->Apply(Depths);
#endif
BENCHMARK(WriteTavo)->Apply(Small)->Apply(Texts)->Apply(Doublings);
#if defined(TAVO_PEER_PUGIXML)
BENCHMARK(WritePugixml)->Apply(Small)->Apply(Texts)->Apply(Doublings);
#endif

} // namespace
