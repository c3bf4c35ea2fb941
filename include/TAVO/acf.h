#pragma once
// The component framework: identifiers and their text, wrappers of interface pointers, the base of components, and the
// factory and classes of the process. The framework's own interfaces stand in acfbase.h.

#include <cstring>
#include <TAVO/acfbase.h>
#include <TAVO/config.h>
#include <TAVO/string.h>

namespace TAVO {
namespace ACF {

/// The 16-byte identifier of an interface, class, category, vendor or module; a plain value. All zero is the null
/// identifier, which names nothing.
class TAVO_API cacfuid {
public:
    /// Units of the text form, terminator included.
    static constexpr std::size_t TextUnits = 37;

    /// The null identifier.
    constexpr cacfuid() noexcept : m_uid{} {}
    constexpr cacfuid(const _acfUID& uid) noexcept : m_uid(uid) {}
    /// As Set; the null identifier where that fails.
    cacfuid(const char* text) noexcept : m_uid{} { Set(text); }
    cacfuid(const wchar_t* text) noexcept : m_uid{} { Set(text); }

    /// A new identifier: 122 random bits of the system's generator, version 4. The null identifier when the system
    /// gives none. Any thread; costs a system call.
    static cacfuid New() noexcept;

    /// Reads the text form: "15603CD4-AB81-4D6F-B05F-C6BEA760A789", digits in any case, no braces. Text behind the last
    /// digit is ignored.
    ///
    /// Text without exactly four '-' (null and empty text too) is true and the null identifier: test the value. Numbers
    /// are scanned as C scans %x: blanks, a sign and "0x" may lead, and of too many digits the last ones count.
    /// @return false for other text; the identifier is then null.
    bool Set(const char* text) noexcept;
    bool Set(const wchar_t* text) noexcept;

    /// Writes the text form, upper case, into TextUnits units.
    void GetText(char* out) const noexcept;
    void GetText(wchar_t* out) const noexcept;
    /// The text form; absent (null) without memory.
    operator String::CACFWChar() const;
    String::CANSIChar ANSI() const;

    bool operator==(const cacfuid& other) const noexcept { return Same(m_uid, other.m_uid); }
    bool operator!=(const cacfuid& other) const noexcept { return !(*this == other); }
    /// Whether any byte is not zero.
    explicit operator bool() const noexcept { return !Same(m_uid, _acfUID{}); }

    /// Becomes the null identifier.
    void reset() noexcept { m_uid = {}; }
    _acfUID& rec() noexcept { return m_uid; }
    const _acfUID& rec() const noexcept { return m_uid; }
    operator const _acfUID&() const noexcept { return m_uid; }

    /// Whether two identifiers are the same 16 bytes. Identifiers of interfaces are compared so, never by address: each
    /// module may have its own copy of them.
    static bool Same(const _acfUID& first, const _acfUID& second) noexcept {
        return std::memcmp(&first, &second, sizeof(_acfUID)) == 0;
    }

private:
    _acfUID m_uid;
};
static_assert(sizeof(cacfuid) == sizeof(_acfUID), "an identifier is its 16 bytes");

} // namespace ACF
} // namespace TAVO
