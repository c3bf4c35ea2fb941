#include "component.h"

namespace {

class Benchmarked final : public TAVO::ACF::CComponent<Benchmarked, IBenchmarked> {};

} // namespace

TAVO::ACF::CPACI<IBenchmarked> MakeBenchmarked() { return Benchmarked::Make(); }
