// The wide formatter: a parser of conversions, a source of arguments, and one routine per kind of value.

#include "format.h"

#include "platform/heap.h"

#include <charconv>
#include <climits>
#include <cmath>
#include <cstring>
#include <TAVO/config.h>

namespace TAVO {

namespace {

// --- output --------------------------------------------------------------------------------------------------------

// Keeps what fits, counts all.
class Output {
public:
    Output(wchar_t* out, std::size_t capacity) : m_out(out), m_room(capacity ? capacity - 1 : 0) {
        if (capacity) m_end = out;
    }

    void Put(wchar_t unit) {
        if (m_count < m_room) *m_end++ = unit;
        ++m_count;
    }

    void Fill(wchar_t unit, std::size_t count) {
        for (std::size_t kept = Kept(count); kept; --kept) *m_end++ = unit;
        m_count += count;
    }

    template <class Unit> void Put(const Unit* text, std::size_t count) {
        for (std::size_t kept = Kept(count); kept; --kept) *m_end++ = static_cast<wchar_t>(*text++);
        m_count += count;
    }

    // Widens narrow text of `bytes` bytes, which takes `units` units.
    void PutNarrow(const char* text, std::size_t bytes, std::size_t units) {
        const std::size_t kept = Kept(units);
        m_count += units;
        if (kept == 0) return;
        if (kept == units) {
            Platform::AnsiToWide(text, static_cast<int>(bytes), m_end, static_cast<int>(kept));
            m_end += kept;
            return;
        }
        // The code page converts whole texts only: convert aside and keep the start.
        auto* all = static_cast<wchar_t*>(Platform::Allocate(units * sizeof(wchar_t)));
        if (!all) return;
        Platform::AnsiToWide(text, static_cast<int>(bytes), all, static_cast<int>(units));
        std::memcpy(m_end, all, kept * sizeof(wchar_t));
        m_end += kept;
        Platform::Release(all);
    }

    std::size_t Finish() {
        if (m_end) *m_end = 0;
        return m_count;
    }

private:
    std::size_t Kept(std::size_t count) const {
        const std::size_t left = m_end ? m_room - static_cast<std::size_t>(m_end - m_out) : 0;
        return count < left ? count : left;
    }

    wchar_t* m_out;
    wchar_t* m_end = nullptr; // null when there is no room even for the terminator
    std::size_t m_room;
    std::size_t m_count = 0;
};

// --- conversions ---------------------------------------------------------------------------------------------------

enum class Kind : std::uint8_t { None, Int, Int64, Double, Pointer };
enum class Length : std::uint8_t { None, Char, Short, Long, Wide64 };

constexpr int kNext = 0; // position of an argument that is taken in order
constexpr int kMaxPositions = 32;

struct Conversion {
    bool left = false, plus = false, blank = false, alternate = false, zero = false;
    bool widthArgument = false, precisionArgument = false;
    int position = kNext, widthPosition = kNext, precisionPosition = kNext;
    int width = 0;
    int precision = -1; // none
    Length length = Length::None;
    char type = 0;

    bool IsPositional() const { return position != kNext; }
};

// What a type letter takes; None for letters that are no conversion.
Kind KindOf(const Conversion& conversion) {
    switch (conversion.type) {
    case 'd':
    case 'i':
    case 'u':
    case 'x':
    case 'X':
    case 'o':
        return conversion.length == Length::Wide64 ? Kind::Int64 : Kind::Int;
    case 'c':
    case 'C':
        return Kind::Int;
    case 's':
    case 'S':
    case 'p':
        return Kind::Pointer;
    case 'e':
    case 'E':
    case 'f':
    case 'F':
    case 'g':
    case 'G':
        return Kind::Double;
    default:
        return Kind::None;
    }
}

class Parser {
public:
    explicit Parser(const wchar_t* at) : m_at(at) {}

    const wchar_t* At() const { return m_at; }

    // Reads a conversion from behind its '%'; false when it breaks the rules.
    bool Read(Conversion& conversion) {
        conversion.position = ReadPosition();
        ReadFlags(conversion);
        if (!ReadNumber(conversion.width, conversion.widthArgument, conversion.widthPosition)) return false;
        if (Skip(L'.')) {
            conversion.precision = 0;
            if (!ReadNumber(conversion.precision, conversion.precisionArgument, conversion.precisionPosition))
                return false;
        }
        conversion.length = ReadLength();
        conversion.type = *m_at < 0x80 ? static_cast<char>(*m_at) : '\0';
        if (KindOf(conversion) == Kind::None) return false;
        ++m_at;
        const bool positional = conversion.IsPositional();
        return (!conversion.widthArgument || positional == (conversion.widthPosition != kNext)) &&
               (!conversion.precisionArgument || positional == (conversion.precisionPosition != kNext));
    }

private:
    static bool IsDigit(wchar_t unit) { return unit >= L'0' && unit <= L'9'; }

    bool Skip(wchar_t unit) {
        if (*m_at != unit) return false;
        ++m_at;
        return true;
    }

    // Stops growing short of overflow: nobody prints that wide.
    int ReadDigits() {
        int value = 0;
        for (; IsDigit(*m_at); ++m_at)
            if (value < INT_MAX / 10) value = value * 10 + (*m_at - L'0');
        return value;
    }

    // "n$", or kNext and nothing read.
    int ReadPosition() {
        const wchar_t* start = m_at;
        const int value = ReadDigits();
        if (value != 0 && Skip(L'$')) return value;
        m_at = start;
        return kNext;
    }

    void ReadFlags(Conversion& conversion) {
        for (;; ++m_at) switch (*m_at) {
            case L'-':
                conversion.left = true;
                break;
            case L'+':
                conversion.plus = true;
                break;
            case L' ':
                conversion.blank = true;
                break;
            case L'#':
                conversion.alternate = true;
                break;
            case L'0':
                conversion.zero = true;
                break;
            default:
                return;
            }
    }

    // A width or precision, if any; false when it is followed by a position's mark.
    bool ReadNumber(int& number, bool& isArgument, int& position) {
        isArgument = Skip(L'*');
        if (isArgument)
            position = ReadPosition();
        else if (IsDigit(*m_at))
            number = ReadDigits();
        return *m_at != L'$';
    }

    Length ReadLength() {
        if (Skip(L'h')) return Skip(L'h') ? Length::Char : Length::Short;
        if (Skip(L'l')) return Skip(L'l') ? Length::Wide64 : Length::Long;
        if (Skip(L'w')) return Length::Long;
        if (Skip(L'z') || Skip(L'j') || Skip(L't')) return Length::Wide64;
        if (!Skip(L'I')) return Length::None;
        if (m_at[0] == L'3' && m_at[1] == L'2') return m_at += 2, Length::Long;
        if (m_at[0] == L'6' && m_at[1] == L'4') m_at += 2;
        return Length::Wide64;
    }

    const wchar_t* m_at;
};

// --- arguments -----------------------------------------------------------------------------------------------------

struct Value {
    Kind kind = Kind::None;
    union {
        long long integer = 0;
        double real;
        const void* pointer;
    };
};

// Gives the arguments out in order, or by position: then all are fetched once beforehand, since the list only runs
// forward.
class Arguments {
public:
    explicit Arguments(std::va_list list) { va_copy(m_list, list); }
    Arguments(const Arguments&) = delete;
    Arguments& operator=(const Arguments&) = delete;
    ~Arguments() { va_end(m_list); }

    // Fetches everything that the positional conversions of the format name, as far as the format keeps the rules.
    void FetchAll(const wchar_t* format) {
        Kind kinds[kMaxPositions + 1] = {};
        int last = 0;
        const auto note = [&](int position, Kind kind) {
            if (position < 1 || position > kMaxPositions) return;
            if (kinds[position] == Kind::None) kinds[position] = kind;
            if (position > last) last = position;
        };
        for (; *format; ++format) {
            if (*format != L'%') continue;
            if (format[1] == L'%') {
                ++format;
                continue;
            }
            Conversion conversion;
            Parser parser(format + 1);
            if (!parser.Read(conversion)) break;
            note(conversion.position, KindOf(conversion));
            note(conversion.widthPosition, Kind::Int);
            note(conversion.precisionPosition, Kind::Int);
            format = parser.At() - 1;
        }
        for (int i = 1; i <= last; ++i) m_values[i] = Fetch(kinds[i] == Kind::None ? Kind::Int : kinds[i]);
    }

    // False when the position names no argument of that kind.
    bool Take(int position, Kind kind, Value& value) {
        if (position == kNext) {
            value = Fetch(kind);
            return true;
        }
        if (position > kMaxPositions || m_values[position].kind != kind) return false;
        value = m_values[position];
        return true;
    }

private:
    Value Fetch(Kind kind) {
        Value value;
        value.kind = kind;
        switch (kind) {
        case Kind::Int:
            value.integer = va_arg(m_list, int);
            break;
        case Kind::Int64:
            value.integer = va_arg(m_list, long long);
            break;
        case Kind::Double:
            value.real = va_arg(m_list, double);
            break;
        case Kind::Pointer:
            value.pointer = va_arg(m_list, const void*);
            break;
        case Kind::None:
            break;
        }
        return value;
    }

    std::va_list m_list;
    Value m_values[kMaxPositions + 1];
};

// --- values --------------------------------------------------------------------------------------------------------

// A laid out number: sign or prefix, zeros, digits, zeros within (before `tail`), tail.
struct Number {
    char prefix[3] = {};
    const char* digits = nullptr;
    std::size_t digitCount = 0;
    std::size_t zerosBefore = 0; // between prefix and digits
    std::size_t zerosAfter = 0;  // between digits and tail
    const char* tail = "";
    std::size_t tailCount = 0;

    std::size_t Size() const { return std::strlen(prefix) + zerosBefore + digitCount + zerosAfter + tailCount; }
};

std::size_t PaddingFor(const Conversion& conversion, std::size_t size) {
    const auto width = static_cast<std::size_t>(conversion.width);
    return width > size ? width - size : 0;
}

void PutNumber(Output& output, const Conversion& conversion, Number number, bool zeroPadded) {
    std::size_t padding = PaddingFor(conversion, number.Size());
    if (zeroPadded && !conversion.left) {
        number.zerosBefore += padding;
        padding = 0;
    }
    if (!conversion.left) output.Fill(L' ', padding);
    output.Put(number.prefix, std::strlen(number.prefix));
    output.Fill(L'0', number.zerosBefore);
    output.Put(number.digits, number.digitCount);
    output.Fill(L'0', number.zerosAfter);
    output.Put(number.tail, number.tailCount);
    if (conversion.left) output.Fill(L' ', padding);
}

char SignOf(const Conversion& conversion, bool negative) {
    if (negative) return '-';
    if (conversion.plus) return '+';
    return conversion.blank ? ' ' : '\0';
}

// The argument, cut to what the length says.
unsigned long long CutSigned(Length length, long long value) {
    switch (length) {
    case Length::Char:
        return static_cast<unsigned long long>(static_cast<signed char>(value));
    case Length::Short:
        return static_cast<unsigned long long>(static_cast<short>(value));
    default:
        return static_cast<unsigned long long>(value);
    }
}

unsigned long long CutUnsigned(Length length, long long value) {
    switch (length) {
    case Length::Char:
        return static_cast<unsigned char>(value);
    case Length::Short:
        return static_cast<unsigned short>(value);
    case Length::Wide64:
        return static_cast<unsigned long long>(value);
    default:
        return static_cast<unsigned>(value);
    }
}

void PutInteger(Output& output, const Conversion& conversion, long long argument) {
    const bool isSigned = conversion.type == 'd' || conversion.type == 'i';
    const bool isHex = conversion.type == 'x' || conversion.type == 'X';
    const unsigned base = isHex ? 16 : conversion.type == 'o' ? 8 : 10;
    unsigned long long value =
        isSigned ? CutSigned(conversion.length, argument) : CutUnsigned(conversion.length, argument);

    Number number;
    if (isSigned) {
        const bool negative = static_cast<long long>(value) < 0;
        number.prefix[0] = SignOf(conversion, negative);
        if (negative) value = 0 - value;
    } else if (isHex && conversion.alternate && value) {
        number.prefix[0] = '0';
        number.prefix[1] = conversion.type;
    }
    const char* alphabet = conversion.type == 'X' ? "0123456789ABCDEF" : "0123456789abcdef";
    char buffer[22]; // of 64 bits in base 8
    char* digit = buffer + sizeof buffer;
    for (; value; value /= base) *--digit = alphabet[value % base];
    number.digits = digit;
    number.digitCount = static_cast<std::size_t>(buffer + sizeof buffer - digit);

    const auto least = static_cast<std::size_t>(conversion.precision < 0 ? 1 : conversion.precision);
    if (least > number.digitCount) number.zerosBefore = least - number.digitCount;
    if (base == 8 && conversion.alternate && number.zerosBefore == 0) number.zerosBefore = 1;
    PutNumber(output, conversion, number, conversion.zero && conversion.precision < 0);
}

void PutPointer(Output& output, const Conversion& conversion, const void* pointer) {
    Conversion address;
    address.left = conversion.left;
    address.width = conversion.width;
    address.precision = 16;
    address.length = Length::Wide64;
    address.type = 'X';
    PutInteger(output, address, static_cast<long long>(reinterpret_cast<std::uintptr_t>(pointer)));
}

// The longest exact fraction of a double, and room for its 309 digits before the point, sign, point and exponent.
constexpr int kLongestFraction = 1074;
constexpr std::size_t kRealDigits = kLongestFraction + 309 + 16;

// The parts of a printed finite real.
struct Real {
    char digits[kRealDigits];
    std::size_t count = 0;    // of digits, without exponent
    std::size_t exponent = 0; // where "e+05" starts; its end is `end`
    std::size_t end = 0;
};

// Prints a finite value >= 0. Precisions beyond the longest fraction are cut; the caller fills up with zeros.
void Print(Real& real, double value, std::chars_format form, int precision) {
    const int exact = precision < kLongestFraction ? precision : kLongestFraction;
    const char* end = std::to_chars(real.digits, real.digits + sizeof real.digits, value, form, exact).ptr;
    real.end = static_cast<std::size_t>(end - real.digits);
    const void* mark = std::memchr(real.digits, 'e', real.end);
    real.exponent = mark ? static_cast<std::size_t>(static_cast<const char*>(mark) - real.digits) : real.end;
    real.count = real.exponent;
}

int ExponentOf(const Real& real) {
    int exponent = 0;
    const char* at = real.digits + real.exponent + 1;
    const bool negative = *at++ == '-';
    for (; at != real.digits + real.end; ++at) exponent = exponent * 10 + (*at - '0');
    return negative ? -exponent : exponent;
}

// Drops the zeros that end the fraction, and a point that then ends the number.
void DropZeros(Real& real) {
    if (!std::memchr(real.digits, '.', real.count)) return;
    while (real.digits[real.count - 1] == '0') --real.count;
    if (real.digits[real.count - 1] == '.') --real.count;
}

void PutWord(Output& output, const Conversion& conversion, const char* word, char sign) {
    Number number;
    number.prefix[0] = sign;
    number.digits = word;
    number.digitCount = std::strlen(word);
    PutNumber(output, conversion, number, false);
}

void PutReal(Output& output, const Conversion& conversion, double value) {
    const bool upper = conversion.type < 'a';
    const char type = static_cast<char>(conversion.type | 0x20);
    const char sign = SignOf(conversion, std::signbit(value));
    if (std::isnan(value)) return PutWord(output, conversion, upper ? "NAN" : "nan", sign);
    if (std::isinf(value)) return PutWord(output, conversion, upper ? "INF" : "inf", sign);
    value = std::fabs(value);

    Real real;
    int fraction = conversion.precision < 0 ? 6 : conversion.precision; // digits behind the point
    bool dropsZeros = false;
    if (type == 'g') {
        const int significant = fraction ? fraction : 1;
        Print(real, value, std::chars_format::scientific, significant - 1);
        const int exponent = ExponentOf(real);
        const bool isFixed = exponent >= -4 && exponent < significant;
        fraction = significant - 1 - (isFixed ? exponent : 0);
        if (isFixed) Print(real, value, std::chars_format::fixed, fraction);
        dropsZeros = !conversion.alternate;
    } else {
        Print(real, value, type == 'e' ? std::chars_format::scientific : std::chars_format::fixed, fraction);
    }

    Number number;
    number.prefix[0] = sign;
    char exponentText[8]; // moved aside, to make room for a point
    number.tailCount = real.end - real.exponent;
    std::memcpy(exponentText, real.digits + real.exponent, number.tailCount);
    if (number.tailCount && upper) exponentText[0] = 'E';
    number.tail = exponentText;
    if (dropsZeros) {
        DropZeros(real);
    } else if (fraction > kLongestFraction) {
        number.zerosAfter = static_cast<std::size_t>(fraction - kLongestFraction);
    } else if (fraction == 0 && conversion.alternate) {
        real.digits[real.count++] = '.';
    }
    number.digits = real.digits;
    number.digitCount = real.count;
    PutNumber(output, conversion, number, conversion.zero);
}

bool IsNarrow(const Conversion& conversion) {
    const bool upper = conversion.type == 'S' || conversion.type == 'C';
    if (conversion.length == Length::Short || conversion.length == Length::Char) return true;
    if (conversion.length == Length::Long || conversion.length == Length::Wide64) return false;
    return upper;
}

// The units of a text up to its terminator or the precision, whichever comes first; nothing behind is read.
template <class Unit> std::size_t TextLength(const Unit* text, int precision) {
    const std::size_t most = precision < 0 ? SIZE_MAX : static_cast<std::size_t>(precision);
    std::size_t length = 0;
    while (length < most && text[length]) ++length;
    return length;
}

void PutWide(Output& output, const Conversion& conversion, const wchar_t* text, std::size_t length) {
    const std::size_t padding = PaddingFor(conversion, length);
    if (!conversion.left) output.Fill(L' ', padding);
    output.Put(text, length);
    if (conversion.left) output.Fill(L' ', padding);
}

void PutNarrow(Output& output, const Conversion& conversion, const char* text, std::size_t bytes) {
    if (bytes > INT_MAX) bytes = INT_MAX;
    const auto units = static_cast<std::size_t>(Platform::AnsiToWide(text, static_cast<int>(bytes), nullptr, 0));
    const std::size_t padding = PaddingFor(conversion, units);
    if (!conversion.left) output.Fill(L' ', padding);
    output.PutNarrow(text, bytes, units);
    if (conversion.left) output.Fill(L' ', padding);
}

void PutText(Output& output, const Conversion& conversion, const void* text) {
    if (text && IsNarrow(conversion)) {
        auto* narrow = static_cast<const char*>(text);
        return PutNarrow(output, conversion, narrow, TextLength(narrow, conversion.precision));
    }
    auto* wide = text ? static_cast<const wchar_t*>(text) : L"(null)";
    PutWide(output, conversion, wide, TextLength(wide, conversion.precision));
}

void PutCharacter(Output& output, const Conversion& conversion, long long argument) {
    if (IsNarrow(conversion)) {
        const char narrow = static_cast<char>(argument);
        return PutNarrow(output, conversion, &narrow, 1);
    }
    const auto wide = static_cast<wchar_t>(argument);
    PutWide(output, conversion, &wide, 1);
}

void PutValue(Output& output, const Conversion& conversion, const Value& value) {
    switch (conversion.type) {
    case 'c':
    case 'C':
        return PutCharacter(output, conversion, value.integer);
    case 's':
    case 'S':
        return PutText(output, conversion, value.pointer);
    case 'p':
        return PutPointer(output, conversion, value.pointer);
    default:
        break;
    }
    if (value.kind == Kind::Double) return PutReal(output, conversion, value.real);
    PutInteger(output, conversion, value.integer);
}

// --- the whole -----------------------------------------------------------------------------------------------------

// Replaces width and precision by their arguments; false when a position names no int.
bool TakeSizes(Conversion& conversion, Arguments& arguments) {
    Value value;
    if (conversion.widthArgument) {
        if (!arguments.Take(conversion.widthPosition, Kind::Int, value)) return false;
        if (value.integer < 0) conversion.left = true;
        const long long magnitude = value.integer < 0 ? -value.integer : value.integer;
        conversion.width = magnitude > INT_MAX ? INT_MAX : static_cast<int>(magnitude);
    }
    if (conversion.precisionArgument) {
        if (!arguments.Take(conversion.precisionPosition, Kind::Int, value)) return false;
        conversion.precision = value.integer < 0 ? -1 : static_cast<int>(value.integer);
    }
    return true;
}

enum class Order : std::uint8_t { Unknown, Sequential, Positional };

// Formats everything up to the end or the first conversion that breaks the rules, and returns where it stopped.
const wchar_t* FormatConversions(Output& output, const wchar_t* format, Arguments& arguments) {
    Order order = Order::Unknown;
    while (*format) {
        if (*format != L'%') {
            output.Put(*format++);
            continue;
        }
        if (format[1] == L'%') {
            output.Put(L'%');
            format += 2;
            continue;
        }
        Conversion conversion;
        Parser parser(format + 1);
        if (!parser.Read(conversion)) return format;
        const Order wanted = conversion.IsPositional() ? Order::Positional : Order::Sequential;
        if (order == Order::Unknown && wanted == Order::Positional) arguments.FetchAll(format);
        if (order == Order::Unknown) order = wanted;
        Value value;
        if (order != wanted || !TakeSizes(conversion, arguments) ||
            !arguments.Take(conversion.position, KindOf(conversion), value))
            return format;
        PutValue(output, conversion, value);
        format = parser.At();
    }
    return format;
}

} // namespace

std::size_t FormatWideList(wchar_t* out, std::size_t capacity, const wchar_t* format, std::va_list list) noexcept {
    Output output(out, capacity);
    if (format) {
        Arguments arguments(list);
        const wchar_t* rest = FormatConversions(output, format, arguments);
        output.Put(rest, TextLength(rest, -1));
    }
    return output.Finish();
}

std::size_t FormatWide(wchar_t* out, std::size_t capacity, const wchar_t* format, ...) noexcept {
    std::va_list list;
    va_start(list, format);
    const std::size_t length = FormatWideList(out, capacity, format, list);
    va_end(list);
    return length;
}

} // namespace TAVO
