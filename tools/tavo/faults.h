#pragma once
// Where a text goes wrong, in words that continue "...: ".

#include <string>

namespace tool {

// Byte `at`, which ASCII alone precedes, is not what belongs there.
std::string Misplaced(const std::string& text, std::size_t at, const std::string& wanted);

// Why a text is no identifier; empty for one.
std::string IdentifierFault(const std::string& text);

} // namespace tool
