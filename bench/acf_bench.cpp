// Identifier text beside libuuid, component pointers beside boost::intrusive_ptr.

#include "component.h"

#include <benchmark/benchmark.h>
#include <boost/smart_ptr/intrusive_ptr.hpp>
#include <TAVO/acf.h>
#if defined(TAVO_PEER_UUID)
#include <uuid.h>
#endif

namespace {

using namespace TAVO::ACF;

// Many identifiers, so that no branch learns their digits.
constexpr std::size_t kTexts = 1024;
struct Texts {
    char text[kTexts][cacfuid::TextUnits];
    cacfuid id[kTexts];
    Texts() {
        for (std::size_t i = 0; i < kTexts; ++i) {
            id[i] = cacfuid::New();
            id[i].GetText(text[i]);
        }
    }
};
const Texts& Samples() {
    static const Texts texts;
    return texts;
}

void WriteIdentifierTavo(benchmark::State& state) {
    const Texts& texts = Samples();
    char out[cacfuid::TextUnits];
    for (std::size_t i = 0; auto _ : state) {
        texts.id[i++ % kTexts].GetText(out);
        benchmark::DoNotOptimize(out);
        benchmark::ClobberMemory();
    }
}
BENCHMARK(WriteIdentifierTavo);

void ReadIdentifierTavo(benchmark::State& state) {
    const Texts& texts = Samples();
    cacfuid id;
    for (std::size_t i = 0; auto _ : state) {
        benchmark::DoNotOptimize(id.Set(texts.text[i++ % kTexts]));
        benchmark::ClobberMemory();
    }
}
BENCHMARK(ReadIdentifierTavo);

#if defined(TAVO_PEER_UUID)
void WriteIdentifierLibuuid(benchmark::State& state) {
    const Texts& texts = Samples();
    char out[UUID_STR_LEN];
    for (std::size_t i = 0; auto _ : state) {
        uuid_unparse_upper(reinterpret_cast<const unsigned char*>(&texts.id[i++ % kTexts].rec()), out);
        benchmark::DoNotOptimize(out);
        benchmark::ClobberMemory();
    }
}
BENCHMARK(WriteIdentifierLibuuid);

void ReadIdentifierLibuuid(benchmark::State& state) {
    const Texts& texts = Samples();
    uuid_t id;
    for (std::size_t i = 0; auto _ : state) {
        benchmark::DoNotOptimize(uuid_parse(texts.text[i++ % kTexts], id));
        benchmark::ClobberMemory();
    }
}
BENCHMARK(ReadIdentifierLibuuid);
#endif

// --- pointers --------------------------------------------------------------------------------------------------------

} // namespace

void intrusive_ptr_add_ref(IBenchmarked* object) { object->AddRef(); }
void intrusive_ptr_release(IBenchmarked* object) { object->Release(); }

namespace {

template <class Wrapper> void CopyPointerTavo(benchmark::State& state) {
    const Wrapper held(MakeBenchmarked());
    for (auto _ : state) {
        Wrapper copy(held);
        benchmark::DoNotOptimize(copy);
    }
}
BENCHMARK_TEMPLATE(CopyPointerTavo, CPACI<IBenchmarked>);
BENCHMARK_TEMPLATE(CopyPointerTavo, CPIACFUnknown);

void CopyPointerBoost(benchmark::State& state) {
    const CPACI<IBenchmarked> made = MakeBenchmarked();
    const boost::intrusive_ptr<IBenchmarked> held(made.Get());
    for (auto _ : state) {
        boost::intrusive_ptr<IBenchmarked> copy(held);
        benchmark::DoNotOptimize(copy);
    }
}
BENCHMARK(CopyPointerBoost);

} // namespace
