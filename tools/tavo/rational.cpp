// tavo rational

#include "commands.h"
#include "facts.h"
#include "position.h"
#include "streams.h"

#include <charconv>
#include <cmath>
#include <TAVO/math.h>

namespace tool {

int RationalApprox(const RationalApproxOptions& options) {
    const std::string& text = options.number;
    double number = 0;
    const char* begin = text.data() + (text.compare(0, 1, "+") == 0);
    const char* end = text.data() + text.size();
    const auto result = std::from_chars(begin, end, number);
    if (result.ec == std::errc::result_out_of_range) {
        Complain(Named(text) + " is out of the range of numbers");
        return kBadInput;
    }
    if (result.ec != std::errc() || result.ptr != end) {
        const auto good = result.ec == std::errc() ? result.ptr - text.data() : begin - text.data();
        Complain(Named(text) + " is no decimal number: it goes wrong at character " + std::to_string(good + 1));
        return kBadInput;
    }
    if (!std::isfinite(number)) {
        Complain(Named(text) + " is no finite number");
        return kBadInput;
    }
    TAVO::Math::CRational fraction;
    if (!fraction.fassign(number, static_cast<TAVO::long32>(options.maxDenominator)) || !fraction.isNormal()) {
        Complain(Named(text) + " cannot be a fraction: its magnitude goes to 1073741823");
        return kBadInput;
    }
    Facts facts;
    const std::string numerator = std::to_string(fraction.num()), denominator = std::to_string(fraction.den());
    facts.AddText("fraction", numerator + '/' + denominator);
    facts.Add("numerator", numerator);
    facts.Add("denominator", denominator);
    facts.Add("value", Decimal(fraction.fract()));
    facts.Add("off by", Decimal(fraction.fract() - number));
    Print(options.json ? facts.Json() + '\n' : facts.Lines());
    return kFine;
}

} // namespace tool
