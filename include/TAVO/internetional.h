#pragma once
// URLs: percent-escaping of byte strings, and "file://" URLs of local paths.
//
// Texts are zero-terminated bytes, UTF-8 where they are characters; the escaping itself looks at bytes only.
//
// Unreserved bytes are A to Z, a to z, 0 to 9 and - _ . ~ : they are never escaped. An extra set is a zero-terminated
// string of further bytes that are kept as they are; null is the empty set. A set that holds '%' leaves escapes as they
// are, and text encoded with it cannot be decoded back.
//
// Threads: the functions keep no state and may be called from any thread.

#include <cstddef>
#include <TAVO/config.h>
#include <TAVO/string.h>

namespace TAVO {
namespace Internetional {

/// Decodes @p src into @p dst: '%' and two hexadecimal digits in any case become the byte they denote, everything else
/// is copied, an incomplete escape included. Nothing behind the decoded text and its terminator is written; that is
/// never more than the source takes, and @p dst may be @p src. "%00" gives a byte 0, so that the text seems to end
/// there: whoever opens what came out must look.
/// @return false, with nothing written, only when either pointer is null.
TAVO_API bool URL_decodebuffer(unsigned char* dst, const unsigned char* src) noexcept;

/// Whether @p text is escaped already: every byte is unreserved, in @p extra, or part of '%' and two hexadecimal
/// digits. The empty text is, null is not.
TAVO_API bool URL_checkescape(const unsigned char* text, const unsigned char* extra) noexcept;

/// The bytes that URL_encodebuffer writes, its terminator not counted: 1 for each byte that is kept, 3 for each other.
/// 0 for empty and null.
TAVO_API std::size_t URL_encoderequired(const unsigned char* text, const unsigned char* extra) noexcept;

/// Encodes @p src into @p dst: bytes that are neither unreserved nor in @p extra become '%' and two hexadecimal digits
/// in upper case. Requires: URL_encoderequired + 1 bytes at @p dst, which do not overlap @p src.
/// @return false, with nothing written, when either pointer is null or both are the same.
TAVO_API bool URL_encodebuffer(unsigned char* dst, const unsigned char* src, const unsigned char* extra) noexcept;

/// The URL of a path: "file:///" and the whole path, escaped, with '/' kept. So "C:\a" gives "file:///C%3A%5Ca" and
/// "/a" gives "file:////a". Every absolute path of characters up to U+FFFF decodes to exactly itself; a relative path
/// comes back with a leading '/', and a surrogate pair as one control character.
/// @return an absent text for a null or empty path, for one that the library does not convert to UTF-8 as a whole (a
///         single surrogate, a pair that it takes for a zero), and without memory.
TAVO_API String::CUTF8Char file_EncodeURL(const wchar_t* path) noexcept;

/// The path of a URL that starts with "file://", in any case. "localhost" before the path is dropped; another host
/// begins a network path, "file://server/share" is "//server/share". A drive ("file:///C:/a") gives a path that starts
/// with it, any other path starts with a separator. Escaped separators are separators.
/// @return an absent text for everything else: null, another scheme, no path, decoded text that is no UTF-8 or holds a
///         zero character, and without memory.
TAVO_API String::CACFWChar file_DecodeURL(const unsigned char* url) noexcept;
/// The same for wide text, which is converted to UTF-8 first: absent also when that does not take it as a whole.
TAVO_API String::CACFWChar file_DecodeURL(const wchar_t* url) noexcept;

} // namespace Internetional
} // namespace TAVO
