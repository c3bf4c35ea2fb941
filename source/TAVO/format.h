#pragma once
// The library's one wide formatter. The C library's cannot be used: on one system it counts 32-bit units, and on both
// its numbers follow the locale.
//
// A conversion is %[n$][flags][width][.precision][length]type.
//   flags     - left, + sign, blank for a plus sign, 0 zero-padded, # alternate form
//   width     a number, * for an int argument (negative: left), or *n$
//   length    hh h char and short, l I32 32 bits, ll I64 I z j t 64 bits; before c and s: h narrow, l w wide
//   d i u x X o           integers, 32 bits without a length
//   f F e E g G           double, as the C locale prints it; inf and nan
//   s c                   wide unless h; S C narrow unless l. Narrow text is of the code page. A null string prints
//   (null).
//                         The precision counts source units, that is bytes of narrow text.
//   p                     16 upper-case digits
//   %                     itself
// "long" is 32 bits: pass int. Conversions are all positional or none is; at most 32 positions. From a conversion that
// breaks these rules on (%n is one), the rest of the format is copied as it stands and no further argument is touched.

#include <cstdarg>
#include <cstddef>

namespace TAVO {

// Writes at most `capacity` units, terminator included, always terminated unless capacity is 0; null as format is
// empty. Returns the units that the whole text takes without terminator: it was cut when that is not less than the
// capacity. Allocates only when narrow text does not fit. Never throws; any thread.
std::size_t FormatWideList(wchar_t* out, std::size_t capacity, const wchar_t* format, std::va_list arguments) noexcept;
std::size_t FormatWide(wchar_t* out, std::size_t capacity, const wchar_t* format, ...) noexcept;

} // namespace TAVO
