#pragma once
// The parser: a text in UTF-8 or UTF-16 becomes a tree of nodes, or the first error.

#include "xmlnode.h"

namespace TAVO::XML::detail {

// The numbers of the error table.
enum ErrorCode : std::uint32_t {
    kBadFile = 0,
    kEndOfFile = 1,
    kOpenComment = 2,
    kOpenString = 3,
    kOpenEnclosure = 4,
    kInvalidTag = 5,
    kBadAttribute = 6,
    kBadEscape = 7,
    kExternalReplacement = 8, // cannot occur: no text matches two predefined references at once
    kOpenCData = 9,
    kBadDataTerminator = 10,
    kBadVersion = 11,
    kUnsupportedEncoding = 12,
    kBadCharacterEncoding = 13,
    kBadTerminationTag = 14,
    kMixedContent = 15,
    kIllegalCharacter = 16,
    kRootMissing = 17,
    kDomError = 18,
    kSuccess = 128
};

struct ParseResult {
    std::uint32_t code = kSuccess;
    std::size_t offset = 0; // units from the start of the text
    CPXMLObject root;       // empty after an error, or when the text holds no element
};

// Parses exactly `units` units, none of them zero; nothing behind them is read. UTF-8 must have been validated.
// Recursion-free: nesting is limited by memory alone. Linear in the size of the text.
ParseResult Parse(const unsigned char* text, std::size_t units) noexcept;
ParseResult Parse(const wchar_t* text, std::size_t units) noexcept;

} // namespace TAVO::XML::detail
