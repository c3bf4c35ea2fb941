// The 3F and 3FFF codecs against their definition.
// Input: bytes to encode; the same bytes as the units of a text to decode.

#include "codecs_reference.h"

#include <cstdlib>

using namespace reference;
using namespace TAVO::String;

static void Require(bool condition) {
    if (!condition) std::abort();
}

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    const Bytes bytes(data, data + size);
    const CPPoolString text3F = C3FEncoder(data, size), text3FFF = C3FFFEncoder(data, size);
    Require(UnitsOf(text3F) == Encode3F(bytes) && UnitsOf(text3FFF) == Encode3FFF(bytes));
    Require(BytesOf(C3FDecoder(text3F)) == Decode3F(UnitsOf(text3F)));
    Require(BytesOf(C3FFFDecoder(text3FFF)) == bytes);

    Units text;
    for (std::size_t i = 0; i + 1 < size && (data[i] || data[i + 1]); i += 2)
        text.push_back(static_cast<wchar_t>(data[i] | data[i + 1] << 8));
    text.push_back(0);
    text.shrink_to_fit();
    const Bytes got3F = BytesOf(C3FDecoder(text.data())), got3FFF = BytesOf(C3FFFDecoder(text.data()));
    if (text.size() > 1) text.pop_back();
    Require(got3F == Decode3F(text) && got3FFF == Decode3FFF(text));
    return 0;
}
