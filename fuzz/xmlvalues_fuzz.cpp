// Typed values: what the readers make of any text, against readers written from their rules, and what comes back of
// values. Input: a text, byte by byte; its first bytes are values as well. Bytes from 80 up become units from all over.

#include <algorithm>
#include <array>
#include <bit>
#include <cstdint>
#include <cstdlib>
#include <cstring>
#include <optional>
#include <string>
#include <TAVO/acf.h>
#include <TAVO/xml.h>
#include <type_traits>
#include <vector>

namespace {

using namespace TAVO;
using namespace TAVO::XML;
using Math::CRational;
using String::CPPoolString;
using String::CStringPool;

void Require(bool condition) {
    if (!condition) std::abort();
}

// --- readers by the rules, on texts whose other characters are 80 ----------------------------------------------------

class Reference {
public:
    explicit Reference(const std::string& text) : m_text(text) {}

    std::optional<std::uint64_t> Number(unsigned base) {
        Blanks();
        const bool negative = Sign();
        if (base == 16 && Is('0') && m_at + 1 < m_text.size() && (m_text[m_at + 1] | 0x20) == 'x') m_at += 2;
        std::uint64_t number = 0;
        const std::size_t first = m_at;
        for (; m_at < m_text.size() && Digit() < base; ++m_at) number = number * base + Digit();
        if (m_at == first) return {};
        return negative ? 0 - number : number;
    }

    std::optional<CRational> Rational() {
        const auto numerator = Number(10);
        if (!numerator) return {};
        Blanks();
        if (!Is('/')) return {};
        ++m_at;
        const auto denominator = Number(10);
        if (!denominator) return {};
        return CRational(static_cast<long32>(*numerator), static_cast<long32>(*denominator));
    }

    std::optional<double> Decimal() {
        Blanks();
        const std::size_t first = m_at;
        Sign();
        const std::size_t digits = m_at;
        std::size_t found = Digits();
        if (Is('.')) {
            ++m_at;
            found += Digits();
        }
        if (found == 0) return {};
        const bool isSmall = m_text.substr(digits, m_at - digits).find_first_not_of("0.") == std::string::npos;
        if (isSmall) return m_text[first] == '-' ? -0.0 : 0.0;
        return std::strtod(WithoutHex(first).c_str(), nullptr);
    }

private:
    bool Is(char c) const { return m_at < m_text.size() && m_text[m_at] == c; }
    unsigned Digit() const {
        const char c = m_text[m_at];
        if (c >= '0' && c <= '9') return static_cast<unsigned>(c - '0');
        const char letter = static_cast<char>(c | 0x20);
        return letter >= 'a' && letter <= 'f' ? static_cast<unsigned>(letter - 'a' + 10) : 99;
    }
    void Blanks() {
        while (m_at < m_text.size() && (m_text[m_at] == ' ' || (m_text[m_at] >= 9 && m_text[m_at] <= 13))) ++m_at;
    }
    bool Sign() {
        const bool negative = Is('-');
        m_at += negative || Is('+');
        return negative;
    }
    std::size_t Digits() {
        const std::size_t first = m_at;
        while (m_at < m_text.size() && Digit() < 10) ++m_at;
        return m_at - first;
    }
    // From there on, the mantissa being read already, only what belongs to an exponent.
    std::string WithoutHex(std::size_t first) const {
        const std::size_t end = m_text.find_first_not_of("eE+-0123456789", m_at);
        return m_text.substr(first, end == std::string::npos ? end : end - first);
    }

    const std::string& m_text;
    std::size_t m_at = 0;
};

// Whether a reader answers `expected`, or each default where nothing is expected.
template <class Value, class Read>
void Check(Read read, const std::optional<Value>& expected, std::type_identity_t<Value> one,
           std::type_identity_t<Value> other) {
    const Value first = read(one), second = read(other);
    Require(std::memcmp(&first, expected ? &*expected : &one, sizeof first) == 0);
    Require(std::memcmp(&second, expected ? &*expected : &other, sizeof second) == 0);
}
template <class Value> std::optional<Value> As(const std::optional<std::uint64_t>& number) {
    return number ? std::optional(static_cast<Value>(*number)) : std::nullopt;
}

constexpr tagXMLFLAGMAP kMap[] = {{1, L"a"}, {6, L"bb"}, {0x80000000, L"c"}, {2, L"d"}};

void CheckText(const CPPoolString& text, const std::string& plain) {
    CPXMLObject e;
    Require(e.SetName(L"e") && e.Add(text) && e.AddAttribute(L"a", text) == text.isdef());
    const auto decimal = Reference(plain).Number(10), hex = Reference(plain).Number(16);
    Check([&](long32 d) { return e.GetDataInt(d); }, As<long32>(decimal), 1, 2);
    Check([&](ulong32 d) { return e.FindAttributeUInt(L"a", d); }, As<ulong32>(decimal), 1u, 2u);
    Check([&](long long d) { return e.GetDataLInt(d); }, As<long long>(decimal), 1ll, 2ll);
    Check([&](unsigned long long d) { return e.GetDataLUInt(d); }, As<unsigned long long>(decimal), 1ull, 2ull);
    Check([&](unsigned long long d) { return e.GetDataFileTime(d); }, As<unsigned long long>(decimal), 1ull, 2ull);
    Check([&](ulong32 d) { return e.GetDataHex(d); }, As<ulong32>(hex), 1u, 2u);
    const auto bits = hex ? std::optional(std::bit_cast<double>(*hex)) : std::nullopt;
    Check([&](double d) { return e.GetDataEDouble(d); }, bits, 1.0, 2.0);
    Check([&](double d) { return e.FindAttributeDouble(L"a", d); }, Reference(plain).Decimal(), 1.0, 2.0);
    Check([&](const CRational& d) { return e.GetDataRational(d); }, Reference(plain).Rational(), CRational(1),
          CRational(2));

    Require(e.GetDataBool(true) == !text.iequals(CPPoolString::pfalse));
    Require(e.GetDataBool(false) == text.iequals(CPPoolString::ptrue));
    ACF::cacfuid id;
    const bool hasId = text.isdef() && id.Set(static_cast<const wchar_t*>(text));
    Check([&](const _acfUID& d) { return e.GetDataGUID(d); }, hasId ? std::optional(id.rec()) : std::nullopt,
          _acfUID{1, 0, 0, {}}, _acfUID{2, 0, 0, {}});
    e.GetDataTimecode();
    const std::string tokens = ";a;bb;c;";
    const std::size_t token = plain.empty() ? tokens.npos : tokens.find(';' + plain + ';');
    const std::size_t before = token == tokens.npos ? 0 : std::count(tokens.begin(), tokens.begin() + token, ';');
    Require(e.GetDataIndex(L"a;bb;c", L';') == (token == tokens.npos ? Buffers::NotFound : before));

    // What reads as flags or bytes comes back through the writer.
    const ulong32 flags = e.GetDataFlags(kMap, std::size(kMap), L';', 1);
    if (flags == e.GetDataFlags(kMap, std::size(kMap), L';', 2)) {
        Require(e.Set(flags, kMap, std::size(kMap), L';') &&
                e.GetDataFlags(kMap, std::size(kMap), L';', ~flags) == flags);
        Require(e.Set(text));
    }
    std::vector<unsigned char> bytes(e.GetDataBinarySize());
    const bool areDigits = plain.find_first_not_of("0123456789abcdefABCDEF") == std::string::npos;
    Require(bytes.size() == (areDigits && plain.size() % 2 == 0 ? plain.size() / 2 : 0));
    if (bytes.empty()) return;
    Require(e.GetDataBinary(bytes.data(), bytes.size()) && !e.GetDataBinary(bytes.data(), bytes.size() - 1));
    Require(e.Set(bytes.data(), bytes.size()));
    std::string upper;
    for (char c : plain) upper += c >= 'a' ? static_cast<char>(c - 32) : c;
    Require(e.GetData() == CPPoolString(upper.c_str()));
}

// Values of any bits are the same when they were stored and read.
void CheckValues(std::uint64_t bits) {
    CPXMLObject e;
    const auto value = std::bit_cast<double>(bits);
    const CRational fraction(static_cast<long32>(bits), static_cast<long32>(bits >> 32));
    const auto id = std::bit_cast<_acfUID>(std::array{bits, bits * 3});
    const TimeCode::timecode time(static_cast<long long>(bits % 86400000 / 48 * 48), TimeCode::eSystemPAL);
    Require(e.SetName(L"e") && e.Set(bits) && std::bit_cast<std::uint64_t>(e.GetDataEDouble()) == bits);
    Require(e.GetDataHex() == static_cast<ulong32>(bits));
    Require(e.Set(value) && std::bit_cast<std::uint64_t>(e.GetDataEDouble()) == bits);
    Require(e.Set(fraction) && e.GetDataRational(CRational(7)) == fraction);
    Require(e.Set(id) && acfIsSame(e.GetDataGUID(), id));
    Require(e.Set(time) && e.GetDataTimecode() == time);
    const auto flags = static_cast<ulong32>(bits);
    Require(e.Set(flags, kMap, std::size(kMap), L';') && e.GetDataFlags(kMap, std::size(kMap), L';', ~flags) == flags);
}

} // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    std::string plain;
    std::vector<wchar_t> units;
    for (std::size_t i = 0; i < size && data[i]; ++i) {
        const bool isAscii = data[i] < 0x80;
        // The low byte may be that of a digit.
        units.push_back(isAscii ? data[i] : static_cast<wchar_t>((data[i] & 0x57) << 8 | (data[i] & 0x3F) | 0x100));
        plain += isAscii ? static_cast<char>(data[i]) : '\x80';
    }
    CheckText(CStringPool::GetStringRefn(units.data(), units.size()), plain);
    std::uint64_t bits = 0;
    if (size) std::memcpy(&bits, data, size < 8 ? size : 8);
    CheckValues(bits);
    static unsigned runs = 0;
    if (++runs % 1024 == 0) CStringPool::Collect(60000); // or the pool would grow for ever
    return 0;
}
