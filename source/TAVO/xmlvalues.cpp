// Typed values of elements and attributes: their texts, and the writers and readers of all types.

#include "xmlvalues.h"

#include "format.h"
#include "platform/heap.h"
#include "platform/platform.h"
#include "poolentry.h"
#include "scratch.h"
#include "wide.h"
#include "xmlnames.h"
#include "xmlnode.h"

#include <iterator>
#include <limits>
#include <TAVO/acf.h>

namespace TAVO::XML {

namespace detail {

namespace {

// The unit behind the digits that lead the text, which may be of any script, if it is the locale's decimal point.
//
// Intended (xml-decimal-point): blanks and signs do not count as leading digits, so "-1,5" is -1 in a locale with a
// comma. A textbook would take the comma everywhere or nowhere; hosts have values that were read so.
const wchar_t* FindLocalPoint(Text text) {
    const auto isDigit = [](wchar_t unit) { return unit < 0x80 ? numberscan::DigitOf(unit) < 10 : IsDigit(unit); };
    while (text.at != text.end && isDigit(*text.at)) ++text.at;
    const bool isOther = text.at != text.end && *text.at != '.';
    return isOther && *text.at == Platform::GetDecimalPoint() ? text.at : nullptr;
}

Text TextIn(const CPPoolString& text) {
    const wchar_t* at = text;
    return {at, at + String::UnitsOf(text)};
}

CPPoolString Interned(const char* text, const char* end) {
    return String::pool::InternAscii(reinterpret_cast<const unsigned char*>(text),
                                     static_cast<std::size_t>(end - text));
}

} // namespace

} // namespace detail

using namespace detail;

// --- Texts of values -----------------------------------------------------------------------------------------------

// Intended (xml-hexadecimal-writer): no integer reader takes all 64 bits back, since those of 64 bits are decimal. A
// textbook would write what they read; files have these digits.
CPPoolString CPXMLObject::TextOf(unsigned long long value) noexcept {
    char text[kValueRoom];
    return Interned(text, PutHex(text, value));
}

CPPoolString CPXMLObject::TextOf(double value) noexcept {
    char text[kValueRoom];
    return Interned(text, PutDouble(text, value));
}

CPPoolString CPXMLObject::TextOf(bool value) noexcept { return value ? CPPoolString::ptrue : CPPoolString::pfalse; }

CPPoolString CPXMLObject::TextOf(const Math::CRational& value) noexcept {
    char text[kValueRoom];
    return Interned(text, PutRational(text, value));
}

CPPoolString CPXMLObject::TextOf(const TimeCode::timecode& value) noexcept {
    return String::CStringPool::GetStringRef(TimeCode::SZUTC(value).text);
}

CPPoolString CPXMLObject::TextOf(const _acfUID& value) noexcept {
    char text[ACF::cacfuid::TextUnits];
    ACF::cacfuid(value).GetText(text);
    return Interned(text, text + ACF::cacfuid::TextUnits - 1);
}

// --- Readers -------------------------------------------------------------------------------------------------------

namespace {

// Which elements a reader takes the data of.
enum class From { DataOnly, Any };

// The text that a reader looks at; null when there is none.
const CPPoolString* DataOf(const CPXMLObject& element, From from) {
    const Node* node = NamedNode(element);
    // Intended (xml-mixed-numbers): an element with children too has no number. A textbook would read the data
    // that GetData gives.
    if (!node || (from == From::DataOnly && node->contentKind != kData)) return nullptr;
    return &node->data;
}
const CPPoolString* DataOfChild(const CPXMLObject& element, const CPPoolString& name, From from) {
    const CPXMLObject* child = element.FindNextElement(name, nullptr);
    return child ? DataOf(*child, from) : nullptr;
}
const CPPoolString* ValueOfAttribute(const CPXMLObject& element, const CPPoolString& name) {
    const Attribute* attribute = FindAttributeOf(NamedNode(element), name);
    return attribute ? &attribute->value : nullptr;
}

// The value that `read` finds in the text, else the fallback.
template <class Value, class Reader> Value Read(const CPPoolString* text, Reader read, const Value& fallback) {
    Value value;
    return text && text->isdef() && read(*text, value) ? value : fallback;
}

// --- What texts say ---

template <class Number> bool ReadDecimal(const CPPoolString& stored, Number& value) {
    Text text = TextIn(stored);
    std::uint64_t number;
    if (!ScanDecimal(text, number)) return false;
    value = static_cast<Number>(number);
    return true;
}
constexpr auto ReadInt = ReadDecimal<long32>;
constexpr auto ReadUInt = ReadDecimal<ulong32>;
constexpr auto ReadLInt = ReadDecimal<long long>;
constexpr auto ReadLUInt = ReadDecimal<unsigned long long>;
constexpr auto ReadFileTime = ReadDecimal<unsigned long long>;

bool ReadHex(const CPPoolString& stored, ulong32& value) {
    Text text = TextIn(stored);
    std::uint64_t number;
    if (!ScanHex(text, number)) return false;
    value = static_cast<ulong32>(number);
    return true;
}

bool ReadRational(const CPPoolString& stored, Math::CRational& value) { return ScanRational(TextIn(stored), value); }

bool ReadBool(const CPPoolString& stored, bool& value) {
    value = stored.iequals(CPPoolString::ptrue);
    return value || stored.iequals(CPPoolString::pfalse);
}

bool ReadEDouble(const CPPoolString& stored, double& value) { return ScanDoubleBits(TextIn(stored), value); }

// Intended (xml-double-text): the digits of a double's own text, which are those of its bits, are a decimal
// number here: 1.5 is stored as "3ff8000000000000(1.5)" and reads as 3. A textbook reader would match its writer; that
// is EDouble, and this one is for what others wrote.
bool ReadDouble(const CPPoolString& stored, double& value) {
    const Text text = TextIn(stored);
    return ScanDecimalDouble(text, FindLocalPoint(text), value);
}

bool ReadGUID(const CPPoolString& stored, _acfUID& value) {
    ACF::cacfuid read;
    if (!read.Set(static_cast<const wchar_t*>(stored))) return false;
    value = read;
    return true;
}

// Of flagged values the text keeps no more than that; other texts without a position are none.
bool ReadTimecode(const CPPoolString& stored, TimeCode::timecode& value) {
    constexpr wchar_t kFlagged[] = L"--:--:--:-- {";
    constexpr std::size_t kFlaggedUnits = std::size(kFlagged) - 1;
    TimeCode::SZUTC form;
    const Text text = TextIn(stored);
    const auto units = static_cast<std::size_t>(text.end - text.at);
    if (units >= std::size(form.text)) return false;
    String::detail::WideCopy(form.text, text.at, units + 1);
    value = form;
    return value.IsAssigned() ||
           (units >= kFlaggedUnits && String::detail::WideEqual(text.at, kFlagged, kFlaggedUnits));
}

} // namespace

#define TAVO_READERS(Suffix, Value, Argument, from)                                                                    \
    Value CPXMLObject::GetData##Suffix(Argument fallback) const noexcept {                                             \
        return Read<Value>(DataOf(*this, from), XML::Read##Suffix, fallback);                                          \
    }                                                                                                                  \
    Value CPXMLObject::FindElement##Suffix(const CPPoolString& name, Argument fallback) const noexcept {               \
        return Read<Value>(DataOfChild(*this, name, from), XML::Read##Suffix, fallback);                               \
    }                                                                                                                  \
    Value CPXMLObject::FindAttribute##Suffix(const CPPoolString& name, Argument fallback) const noexcept {             \
        return Read<Value>(ValueOfAttribute(*this, name), XML::Read##Suffix, fallback);                                \
    }
TAVO_READERS(Int, long32, long32, From::DataOnly)
TAVO_READERS(UInt, ulong32, ulong32, From::DataOnly)
TAVO_READERS(LInt, long long, long long, From::DataOnly)
TAVO_READERS(LUInt, unsigned long long, unsigned long long, From::DataOnly)
TAVO_READERS(Hex, ulong32, ulong32, From::DataOnly)
TAVO_READERS(EDouble, double, double, From::DataOnly)
TAVO_READERS(Double, double, double, From::DataOnly)
TAVO_READERS(FileTime, unsigned long long, unsigned long long, From::Any)
TAVO_READERS(Rational, Math::CRational, const Math::CRational&, From::Any)
TAVO_READERS(Bool, bool, bool, From::Any)
TAVO_READERS(GUID, _acfUID, const _acfUID&, From::Any)
TAVO_READERS(Timecode, TimeCode::timecode, const TimeCode::timecode&, From::Any)
#undef TAVO_READERS

// --- Readers that need a list --------------------------------------------------------------------------------------

std::size_t CPXMLObject::IndexOf(const CPPoolString* text, const wchar_t* list, wchar_t separator,
                                 std::size_t fallback) noexcept {
    const std::size_t index = text ? getIndex(*text, list, separator) : Buffers::NotFound;
    return index == Buffers::NotFound ? fallback : index;
}

std::size_t CPXMLObject::GetDataIndex(const wchar_t* list, wchar_t separator, std::size_t fallback) const noexcept {
    return IndexOf(DataOf(*this, From::Any), list, separator, fallback);
}
std::size_t CPXMLObject::FindElementIndex(const CPPoolString& name, const wchar_t* list, wchar_t separator,
                                          std::size_t fallback) const noexcept {
    return IndexOf(DataOfChild(*this, name, From::Any), list, separator, fallback);
}
std::size_t CPXMLObject::FindAttributeIndex(const CPPoolString& name, const wchar_t* list, wchar_t separator,
                                            std::size_t fallback) const noexcept {
    return IndexOf(ValueOfAttribute(*this, name), list, separator, fallback);
}

namespace {

// The named flags of a map.
struct FlagNames {
    const tagXMLFLAGMAP* first;
    std::size_t count;

    template <class Visit> void ForEach(Visit visit) const {
        for (std::size_t i = 0; first && i < count; ++i)
            if (first[i].flags && first[i].name && *first[i].name) visit(first[i]);
    }
    // The flags of a name; 0 for one that is not in the map.
    ulong32 Find(Text name) const {
        ulong32 flags = 0;
        const auto units = static_cast<std::size_t>(name.end - name.at);
        ForEach([&](const tagXMLFLAGMAP& entry) {
            if (flags == 0 && String::detail::WideLengthN(entry.name, units + 1) == units &&
                String::detail::WideEqual(entry.name, name.at, units))
                flags = entry.flags;
        });
        return flags;
    }
};

// "0x" and one to eight digits.
bool ReadFlagNumber(Text token, ulong32& flags) {
    constexpr std::ptrdiff_t kPrefix = 2, kMostDigits = 8;
    const std::ptrdiff_t digits = token.end - token.at - kPrefix;
    if (digits < 1 || digits > kMostDigits || token.at[0] != '0' || token.at[1] != 'x') return false;
    flags = 0;
    for (token.at += kPrefix; token.at != token.end; ++token.at) {
        const unsigned digit = numberscan::DigitOf(*token.at);
        if (digit == numberscan::kNoDigit) return false;
        flags = flags << 4 | digit;
    }
    return true;
}

auto FlagsReader(FlagNames names, wchar_t separator) {
    return [names, separator](const CPPoolString& stored, ulong32& value) {
        value = 0;
        for (Text rest = TextIn(stored);; ++rest.at) {
            Text token{rest.at, rest.at};
            while (token.end != rest.end && *token.end != separator) ++token.end;
            ulong32 flags = names.Find(token);
            if (flags == 0 && !ReadFlagNumber(token, flags)) return false;
            value |= flags;
            rest.at = token.end;
            if (rest.at == rest.end) return true;
        }
    };
}

} // namespace

ulong32 CPXMLObject::GetDataFlags(const tagXMLFLAGMAP* map, std::size_t count, wchar_t separator,
                                  ulong32 fallback) const noexcept {
    return Read<ulong32>(DataOf(*this, From::Any), FlagsReader({map, count}, separator), fallback);
}
ulong32 CPXMLObject::FindElementFlags(const CPPoolString& name, const tagXMLFLAGMAP* map, std::size_t count,
                                      wchar_t separator, ulong32 fallback) const noexcept {
    return Read<ulong32>(DataOfChild(*this, name, From::Any), FlagsReader({map, count}, separator), fallback);
}
ulong32 CPXMLObject::FindAttributeFlags(const CPPoolString& name, const tagXMLFLAGMAP* map, std::size_t count,
                                        wchar_t separator, ulong32 fallback) const noexcept {
    return Read<ulong32>(ValueOfAttribute(*this, name), FlagsReader({map, count}, separator), fallback);
}

CPPoolString CPXMLObject::FindElementString(const CPPoolString& name, const CPPoolString& fallback) const noexcept {
    const CPPoolString* text = DataOfChild(*this, name, From::Any);
    return text && text->isdef() ? *text : fallback;
}
CPPoolString CPXMLObject::FindAttributeString(const CPPoolString& name, const CPPoolString& fallback) const noexcept {
    const CPPoolString* text = ValueOfAttribute(*this, name);
    return text && text->isdef() ? *text : fallback;
}

// --- Flags: writing ------------------------------------------------------------------------------------------------

CPPoolString CPXMLObject::TextOf(ulong32 flags, const tagXMLFLAGMAP* map, std::size_t count,
                                 wchar_t separator) noexcept {
    Scratch<wchar_t> text;
    bool fits = true;
    const auto put = [&](const wchar_t* token) {
        if (!text.Empty()) fits = fits && text.Push(separator);
        while (fits && *token) fits = text.Push(*token++);
    };
    ulong32 unnamed = flags;
    FlagNames{map, count}.ForEach([&](const tagXMLFLAGMAP& entry) {
        if ((unnamed & entry.flags) != entry.flags) return;
        unnamed &= ~entry.flags;
        put(entry.name);
    });
    if (unnamed || flags == 0) {
        wchar_t number[11];
        FormatWide(number, std::size(number), L"0x%08x", unnamed);
        put(number);
    }
    return fits ? String::CStringPool::GetStringRefn(text.First(), text.Count()) : CPPoolString();
}

// --- Bytes ---------------------------------------------------------------------------------------------------------

namespace {

// Sixteen bytes as 32 digits.
//
// Intended (xml-low-half-first): the low half of a byte stands first. A textbook writes the high one first; stored
// files have it this way.
void PutBytes(char* out, const unsigned char* bytes) {
    using namespace Simd;
    const auto halves = [](Block units) {
        return Or(And(units, All16(0x0F)), ShiftLeft16<4>(And(units, All16(0xF0))));
    };
    const Block block = Load(bytes);
    Store(out, HexCharacters(halves(WidenLow(block)), 'A'));
    Store(out + kBlock, HexCharacters(halves(WidenHigh(block)), 'A'));
}

// Eight bytes of 16 digits.
void TakeBytes(unsigned char* out, const wchar_t* digits) {
    using namespace Simd;
    const Block numbers = HexDigitsOf(NarrowText(digits)).numbers;
    const Block bytes = And(Or(numbers, ShiftRight16<4>(numbers)), All16(0xFF));
    StoreHalf(out, Narrow(bytes, bytes));
}

// The bytes that a text stands for; 0 for one that stands for none.
std::size_t CountBytes(Text text) {
    const auto units = static_cast<std::size_t>(text.end - text.at);
    if (units % 2) return 0;
    constexpr std::uint32_t kAll = 0xFFFF;
    for (; text.end - text.at >= 16; text.at += 16)
        if (HexDigitsOf(Simd::NarrowText(text.at)).areDigits != kAll) return 0;
    for (; text.at != text.end; ++text.at)
        if (numberscan::DigitOf(*text.at) == numberscan::kNoDigit) return 0;
    return units / 2;
}

} // namespace

CPPoolString CPXMLObject::TextOf(const unsigned char* bytes, unsigned long long size) noexcept {
    if (!bytes || size > std::numeric_limits<std::size_t>::max() / 2) return {};
    if (size == 0) return CPPoolString::pempty;
    auto* text = static_cast<char*>(Platform::Allocate(2 * size));
    if (!text) return {};
    char* at = text;
    for (; size >= Simd::kBlock; size -= Simd::kBlock, bytes += Simd::kBlock, at += 2 * Simd::kBlock)
        PutBytes(at, bytes);
    for (; size; --size, ++bytes) {
        *at++ = "0123456789ABCDEF"[*bytes & 15];
        *at++ = "0123456789ABCDEF"[*bytes >> 4];
    }
    CPPoolString stored = Interned(text, at);
    Platform::Release(text);
    return stored;
}

unsigned long long CPXMLObject::GetDataBinarySize() const noexcept {
    const CPPoolString* stored = DataOf(*this, From::Any);
    return stored ? CountBytes(TextIn(*stored)) : 0;
}

bool CPXMLObject::GetDataBinary(unsigned char* buffer, unsigned long long capacity) const noexcept {
    const unsigned long long size = GetDataBinarySize();
    if (size == 0 || size > capacity || !buffer) return false;
    Text text = TextIn(NodeOf(*this).data);
    for (; text.end - text.at >= 16; text.at += 16, buffer += 8) TakeBytes(buffer, text.at);
    for (; text.at != text.end; text.at += 2)
        *buffer++ = static_cast<unsigned char>(numberscan::DigitOf(text.at[0]) | numberscan::DigitOf(text.at[1]) << 4);
    return true;
}

} // namespace TAVO::XML
