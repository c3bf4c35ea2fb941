#pragma once
// XML: documents read into trees of elements, the trees themselves, and their output as text.
//
// An element is a handle, one pointer to a node that counts its holders. Copying a handle shares the node, so a change
// made through one handle is seen through all; clone() gives a handle a node of its own, whose children stay shared.
// There are no parent pointers, and a node may be the child of several parents.
//
// Names, values and data are pooled strings and compared by entry. The null string counts as the empty one everywhere.
// An element has one data string and no text nodes; an element with children and data can be kept but not written.
//
// Threads: nodes carry no lock. Different handles of one node may be copied and released at once; a tree that several
// threads use is for reading only.

#include <TAVO/acfbase.h>
#include <TAVO/math.h>
#include <TAVO/string.h>
#include <TAVO/timecode.h>
#include <type_traits>

namespace TAVO {
namespace XML {

/// Result of the operations that place a child: its index, or all-ones for failure.
class xmlret {
public:
    explicit xmlret(std::size_t index) noexcept : m_index(index) {}
    xmlret(const xmlret& other) noexcept = default;
    xmlret& operator=(const xmlret& other) noexcept = default;

    std::size_t sIndex() const noexcept { return m_index; }
    /// Whether the child was placed.
    explicit operator bool() const noexcept { return m_index != Buffers::NotFound; }

private:
    std::size_t m_index;
};

/// Encodings of a text. Other values make every call that takes one fail.
enum eXMLEncoding : std::uint32_t {
    XMLEncodingAutomatic = 0, ///< reading: found out from the text; writing: UTF-8
    XMLEncodingUTF8 = 1,      ///< reading: the same as automatic
    XMLEncodingUTF16 = 2,     ///< host order; reading also takes swapped files with a mark
    XMLEncodingUTF16Raw = 3   ///< reading: a mark is required; writing: units are copied and never looked at
};

/// A name for one bit of a set of flags, or for several that belong together. A list of them is read and written in its
/// order. Names without text and entries without bits name nothing.
struct tagXMLFLAGMAP {
    ulong32 flags;
    const wchar_t* name; ///< without the separator that stands between names
};

namespace detail {

// The kind of value that a type is, for the typed writers: only types that lose nothing on the way, and neither
// pointers nor enumerations.
template <class T, class = void> struct KindOfValue {};
template <> struct KindOfValue<bool> { using Type = bool; };
template <> struct KindOfValue<float> { using Type = double; };
template <> struct KindOfValue<double> { using Type = double; };
template <> struct KindOfValue<Math::CRational> { using Type = Math::CRational; };
template <> struct KindOfValue<TimeCode::timecode> { using Type = TimeCode::timecode; };
template <class T>
struct KindOfValue<T, std::enable_if_t<std::is_integral<T>::value && std::is_unsigned<T>::value && sizeof(T) == 8>> {
    using Type = unsigned long long;
};
template <class T> struct KindOfValue<T, std::enable_if_t<std::is_convertible<const T&, const _acfUID&>::value>> {
    using Type = _acfUID; // also what wraps one
};
template <class T> using ValueKind = typename KindOfValue<T>::Type;

// Numbers that no kind of value takes.
template <class T, class = void> struct IsOtherNumber {
    static constexpr bool value = std::is_arithmetic<T>::value || std::is_enum<T>::value;
};
template <class T> struct IsOtherNumber<T, std::enable_if_t<sizeof(ValueKind<T>) != 0>> {
    static constexpr bool value = false;
};
template <class T> using OtherNumber = std::enable_if_t<IsOtherNumber<T>::value, int>;

} // namespace detail

/// Handle of an element.
///
/// Live: the handle has a node. Named: the node's name is not empty. Nearly every operation needs a live, named node
/// and else fails. Default: a node without name, attributes, children and data. Named-default: one with a name only.
///
/// A name starts with a letter, '_' or ':' and goes on with letters, digits, '.', '-', '_', ':', combining characters
/// and extenders, by the tables of XML 1.0 (second edition), Appendix B; there are none above U+FFFF.
///
/// What an element holds (its content kind) rises with what is added: nothing, children, data, both. Deleting children
/// one by one does not lower it again: an element emptied so still counts as one with children, text added to it then
/// makes the kind "both", and such an element cannot be written. Empty an element with DeleteElements, DeleteContent or
/// Reset.
///
/// An element must not be put below itself, directly or not; nobody checks. Such a tree is never freed, and writing it
/// does not end.
///
/// A failed allocation leaves the element as it was and gives the operation's failure result.
class TAVO_API CPXMLObject : public Buffers::CPObjectMemory {
public:
    using CPPoolString = String::CPPoolString;

    /// The type of nodes; its address is their identity.
    static const Buffers::tagCPOVTABL _vtbl;
    static std::size_t GetTypeID() noexcept { return reinterpret_cast<std::size_t>(&_vtbl); }

    /// An empty handle.
    CPXMLObject() noexcept = default;
    CPXMLObject(const CPXMLObject& other) noexcept = default;
    CPXMLObject(CPXMLObject&& other) noexcept = default;
    /// Shares @p other when it holds an element's node, else stays empty.
    explicit CPXMLObject(const Buffers::CPObjectMemory& other) noexcept;
    CPXMLObject& operator=(const CPXMLObject& other) noexcept = default;
    CPXMLObject& operator=(CPXMLObject&& other) noexcept = default;
    ~CPXMLObject() = default;

    /// Drops attributes, children and data; the name stays. Nothing on an empty handle.
    void Reset() noexcept;
    /// False for an empty handle and a default node.
    explicit operator bool() const noexcept { return !IsDefault(); }
    bool IsDefault() const noexcept;
    bool IsNamedDefault() const noexcept;

    // --- Name ---

    /// Gives this handle a new node with that name and nothing else; other holders of the old node keep it unchanged.
    /// @return false for a bad name, which changes nothing, and without memory, when the handle is empty afterwards.
    bool SetName(const CPPoolString& name) noexcept;
    /// Changes the name in place, for every holder. False for an empty handle or a bad name.
    bool Rename(const CPPoolString& name) noexcept;
    /// The name; empty for an empty handle.
    CPPoolString GetName() const noexcept;
    /// False for an empty handle.
    bool IsName(const CPPoolString& name) const noexcept;
    bool IsData(const CPPoolString& data) const noexcept;
    bool IsNameData(const CPPoolString& name, const CPPoolString& data) const noexcept;
    /// Position of the element's name among the tokens of @p list: "b" in "a;b;c" is 1. All-ones when it is none of
    /// them, and for a null list.
    std::size_t GetNameIndex(const wchar_t* list, wchar_t separator) const noexcept;

    // --- Attributes: in the order they were added, names unique, values never empty when added one by one ---

    /// Adds an attribute. False for a bad name, an empty value, or when there is one of that name. Looks through all
    /// attributes of the element.
    bool AddAttribute(const CPPoolString& name, const CPPoolString& value) noexcept;
    /// False also for text that cannot be interned.
    bool AddAttribute(const CPPoolString& name, const wchar_t* value) noexcept;
    /// Removes the attribute, then adds it anew at the end. An empty value therefore removes it and gives false.
    bool SetAttribute(const CPPoolString& name, const CPPoolString& value) noexcept;
    bool SetAttribute(const CPPoolString& name, const wchar_t* value) noexcept;
    /// Adds or sets formatted text; formats are those of _logWrite (develop.h), without its limit. False also when
    /// memory is out.
    bool printfAttribute(const CPPoolString& name, const wchar_t* format, ...) noexcept;
    bool SprintfAttribute(const CPPoolString& name, const wchar_t* format, ...) noexcept;
    /// Removes an attribute. False for a bad name only: true also when there is nothing to remove.
    bool DeleteAttribute(const CPPoolString& name) noexcept;
    bool HasAttribute(const CPPoolString& name) const noexcept;
    /// Whether the element has this name and such an attribute. False for an empty name.
    bool IsNameAttrib(const CPPoolString& name, const CPPoolString& attName) const noexcept;
    bool IsNameAttribVal(const CPPoolString& name, const CPPoolString& attName,
                         const CPPoolString& attValue) const noexcept;
    std::size_t GetNAttributes() const noexcept;
    /// The attribute at @p index; both strings are empty when there is none.
    bool GetAttribute(std::size_t index, CPPoolString& name, CPPoolString& value) const noexcept;
    /// Takes over the attributes of @p other; those that this element has too change only with @p overwrite.
    /// @return true also when there is nothing to take over. False on a node that is not live and named, and without
    ///         memory: the attributes taken over so far stay.
    bool MergeAttributes(const CPXMLObject& other, bool overwrite) noexcept;
    /// The value of the attribute; empty when there is none.
    CPPoolString FindAttribute(const CPPoolString& name) const noexcept;
    /// Whether the attribute is there and has exactly this value.
    bool FindAttributeValue(const CPPoolString& name, const CPPoolString& value) const noexcept;

    // --- Children ---

    /// Appends a child. Fails for an empty handle or a default child.
    xmlret Add(const CPXMLObject& child) noexcept;
    /// Appends the child if it carries attributes, children or data; true also when it does not. False only when this
    /// node is not live and named; that memory was out is not told.
    bool CAdd(const CPXMLObject& child) noexcept;
    /// Appends a new child with that name.
    xmlret AddTag(const CPPoolString& name) noexcept;
    /// Appends a new child with that name and data.
    xmlret AddTag(const CPPoolString& name, const CPPoolString& value) noexcept;
    xmlret AddTag(const CPPoolString& name, const wchar_t* value) noexcept;
    xmlret printfTag(const CPPoolString& name, const wchar_t* format, ...) noexcept;
    /// Replaces the whole content with one new child of that name and data. A bad name changes nothing.
    xmlret SetTag(const CPPoolString& name, const CPPoolString& value) noexcept;
    xmlret SetTag(const CPPoolString& name, const wchar_t* value) noexcept;
    xmlret SprintfTag(const CPPoolString& name, const wchar_t* format, ...) noexcept;
    /// Inserts before the child at @p index, or appends when that is beyond the end. The child may be default, or an
    /// empty handle. Refused, unlike Add, when this element has data.
    /// @return @p index as it was given, even when the child was appended at a smaller one. So an index of all-ones
    ///         reads as failure although the child was appended.
    xmlret Insert(const CPXMLObject& child, std::size_t index) noexcept;
    /// Puts the child in place of the one at @p index. False for a default child.
    template <class Index, std::enable_if_t<std::is_integral<Index>::value, int> = 0>
    bool Replace(const CPXMLObject& child, Index index) noexcept {
        return ReplaceAt(child, static_cast<std::size_t>(index));
    }
    /// Puts the child, which may be default, in the slot at @p position; a position outside this element's children is
    /// read, and the first slot that holds the same node is replaced.
    /// @return the slot's index, all-ones when there is none; 0, with nothing replaced, on a node that is not live and
    ///         named.
    xmlret Replace(const CPXMLObject& child, const CPXMLObject* position) noexcept;
    /// Puts the child in place of the first slot that holds the same node as @p old.
    xmlret Replace(const CPXMLObject& child, const CPXMLObject& old) noexcept;
    /// Removes the child at @p index.
    template <class Index, std::enable_if_t<std::is_integral<Index>::value, int> = 0>
    bool Delete(Index index) noexcept {
        return DeleteAt(static_cast<std::size_t>(index));
    }
    /// Removes the slot at @p position; a position outside this element's children is read, and the first slot that
    /// holds the same node is removed. Null removes nothing.
    bool Delete(const CPXMLObject* position) noexcept;
    /// Removes the first slot that holds the same node.
    bool Delete(const CPXMLObject& child) noexcept;
    /// Removes all children. False only on a node that is not live and named, as for the next two.
    bool DeleteElements() noexcept;
    bool DeleteData() noexcept;
    /// Removes data and children; attributes stay.
    bool DeleteContent() noexcept;
    /// The children, null when there are none; valid until the children change.
    CPXMLObject* GetElements(std::size_t& count) noexcept;
    const CPXMLObject* GetElements(std::size_t& count) const noexcept;
    /// The number of children with that name; 0 for an empty name.
    std::size_t GetNElements(const CPPoolString& name) const noexcept;
    /// The child at @p index; an empty handle when there is none.
    CPXMLObject item(std::size_t index) const noexcept;
    CPXMLObject item(const xmlret& result) const noexcept { return item(result.sIndex()); }

    // --- Data ---

    CPPoolString GetData() const noexcept;
    /// Sets the data. False when there is some: data is never appended to. Empty text is true and changes nothing.
    bool Add(const CPPoolString& text) noexcept;
    /// False also for text that cannot be interned.
    bool Add(const wchar_t* text) noexcept;
    bool printf(const wchar_t* format, ...) noexcept;
    /// Replaces children and data by this child or text. False, with the content gone, when adding fails.
    bool Set(const CPXMLObject& child) noexcept;
    bool Set(const CPPoolString& text) noexcept;
    /// Text that cannot be interned gives false and changes nothing, as does a failure to format.
    bool Set(const wchar_t* text) noexcept;
    bool Sprintf(const wchar_t* format, ...) noexcept;
    /// Always the empty string.
    CPPoolString GetContent() const noexcept;
    /// The data of the first child with that name; empty when there is none.
    CPPoolString FindElementData(const CPPoolString& name) const noexcept;

    // --- Typed values: writing ---
    //
    // Every writer makes a text of the value and then does what the writer of that text does. There is one for
    // - unsigned 64-bit numbers: lower-case hexadecimal without prefix, 255 is "ff" (Hex reads the low 32 bits back);
    // - float, double: the 64 bits of the double as such a number, then for people: "3ff8000000000000(1.5)";
    // - bool: "true" or "false";
    // - Math::CRational: numerator and denominator, "30000/1001"; "1/0" is the undefined value;
    // - TimeCode::timecode: its exchange form, "10:00:00:00 {25/1}Hz";
    // - _acfUID, ACF::cacfuid: upper case in groups, "15603CD4-AB81-4D6F-B05F-C6BEA760A789";
    // - bytes and their number: two upper-case digits a byte, the low half FIRST, 12 AB is "21BA";
    // - flags and a map: the names of the bits between separators, "0x%08x" for bits without a name.
    // No locale takes part. What cannot be made a text (a null pointer to bytes; memory is out) fails and changes
    // nothing.
    //
    // Other numbers do not compile: an int could mean "10" or "a", and an unsigned long would mean either by the
    // system. Cast to unsigned long long for the form above, or pass CPPoolString(10) for decimal digits.

    /// Sets the data.
    template <class T, class Kind = detail::ValueKind<T>> bool Add(const T& value) noexcept {
        return AddText(TextOf(static_cast<const Kind&>(value)));
    }
    /// Replaces the content by the data.
    template <class T, class Kind = detail::ValueKind<T>> bool Set(const T& value) noexcept {
        return SetText(TextOf(static_cast<const Kind&>(value)));
    }
    template <class T, class Kind = detail::ValueKind<T>>
    bool AddAttribute(const CPPoolString& name, const T& value) noexcept {
        return AddAttributeText(name, TextOf(static_cast<const Kind&>(value)));
    }
    template <class T, class Kind = detail::ValueKind<T>>
    bool SetAttribute(const CPPoolString& name, const T& value) noexcept {
        return SetAttributeText(name, TextOf(static_cast<const Kind&>(value)));
    }
    /// Appends a new child with that data.
    template <class T, class Kind = detail::ValueKind<T>>
    xmlret AddTag(const CPPoolString& name, const T& value) noexcept {
        return AddTagText(name, TextOf(static_cast<const Kind&>(value)));
    }
    /// Replaces the content by one new child with that data.
    template <class T, class Kind = detail::ValueKind<T>>
    xmlret SetTag(const CPPoolString& name, const T& value) noexcept {
        return SetTagText(name, TextOf(static_cast<const Kind&>(value)));
    }

    template <class T, detail::OtherNumber<T> = 0> bool Add(T) = delete;
    template <class T, detail::OtherNumber<T> = 0> bool Set(T) = delete;
    template <class T, detail::OtherNumber<T> = 0> bool AddAttribute(const CPPoolString&, T) = delete;
    template <class T, detail::OtherNumber<T> = 0> bool SetAttribute(const CPPoolString&, T) = delete;
    template <class T, detail::OtherNumber<T> = 0> xmlret AddTag(const CPPoolString&, T) = delete;
    template <class T, detail::OtherNumber<T> = 0> xmlret SetTag(const CPPoolString&, T) = delete;

    /// Bytes. No bytes are no text, so Add and Set are true and AddAttribute and SetAttribute false for them.
    bool Add(const unsigned char* bytes, unsigned long long size) noexcept { return AddText(TextOf(bytes, size)); }
    bool Set(const unsigned char* bytes, unsigned long long size) noexcept { return SetText(TextOf(bytes, size)); }
    bool AddAttribute(const CPPoolString& name, const unsigned char* bytes, unsigned long long size) noexcept {
        return AddAttributeText(name, TextOf(bytes, size));
    }
    bool SetAttribute(const CPPoolString& name, const unsigned char* bytes, unsigned long long size) noexcept {
        return SetAttributeText(name, TextOf(bytes, size));
    }
    xmlret AddTag(const CPPoolString& name, const unsigned char* bytes, unsigned long long size) noexcept {
        return AddTagText(name, TextOf(bytes, size));
    }
    xmlret SetTag(const CPPoolString& name, const unsigned char* bytes, unsigned long long size) noexcept {
        return SetTagText(name, TextOf(bytes, size));
    }

    /// Flags: the names of all entries of the map whose bits are set and not yet named, then the other bits as a
    /// number, also when no bit is set: "read;0x00000100". The separator must not be a hexadecimal digit or 'x'.
    bool Add(ulong32 flags, const tagXMLFLAGMAP* map, std::size_t count, wchar_t separator) noexcept {
        return AddText(TextOf(flags, map, count, separator));
    }
    bool Set(ulong32 flags, const tagXMLFLAGMAP* map, std::size_t count, wchar_t separator) noexcept {
        return SetText(TextOf(flags, map, count, separator));
    }
    bool AddAttribute(const CPPoolString& name, ulong32 flags, const tagXMLFLAGMAP* map, std::size_t count,
                      wchar_t separator) noexcept {
        return AddAttributeText(name, TextOf(flags, map, count, separator));
    }
    bool SetAttribute(const CPPoolString& name, ulong32 flags, const tagXMLFLAGMAP* map, std::size_t count,
                      wchar_t separator) noexcept {
        return SetAttributeText(name, TextOf(flags, map, count, separator));
    }
    xmlret AddTag(const CPPoolString& name, ulong32 flags, const tagXMLFLAGMAP* map, std::size_t count,
                  wchar_t separator) noexcept {
        return AddTagText(name, TextOf(flags, map, count, separator));
    }
    xmlret SetTag(const CPPoolString& name, ulong32 flags, const tagXMLFLAGMAP* map, std::size_t count,
                  wchar_t separator) noexcept {
        return SetTagText(name, TextOf(flags, map, count, separator));
    }

    // --- Typed values: reading ---
    //
    // GetData reads the element's own data, FindElement the data of the first child of that name, FindAttribute the
    // value of an attribute. The default is the answer when there is no such text and when it does not begin with a
    // value of that type. What stands behind a value is not looked at, but where said.
    //
    // Numbers are read as C does it: blanks and one sign may lead, for Hex "0x" too; of too many digits the low bits of
    // the result remain, and "-1" read as an unsigned number is the largest one. No locale takes part, but for the
    // decimal point of Double.
    //
    // Int, UInt, LInt, LUInt, Hex, EDouble and Double give the default for an element that counts as one with children
    // too, the others read its data.

    /// Decimal, 32 bits signed and unsigned, 64 bits signed and unsigned; hexadecimal, 32 bits.
    long32 GetDataInt(long32 fallback = 0) const noexcept;
    ulong32 GetDataUInt(ulong32 fallback = 0) const noexcept;
    long long GetDataLInt(long long fallback = 0) const noexcept;
    unsigned long long GetDataLUInt(unsigned long long fallback = 0) const noexcept;
    ulong32 GetDataHex(ulong32 fallback = 0) const noexcept;
    /// Decimal, 64 bits unsigned: a count of 100 ns since 1601. (The writer of such numbers is hexadecimal; store a
    /// file time with printf(L"%I64u").)
    unsigned long long GetDataFileTime(unsigned long long fallback = 0) const noexcept;
    /// Two decimal numbers around '/', blanks before each and before the '/', in lowest terms. "5/0" is the undefined
    /// value 1/0 and not the default.
    Math::CRational GetDataRational(const Math::CRational& fallback = Math::CRational()) const noexcept;
    /// "true" or "false" in any case, and nothing else.
    bool GetDataBool(bool fallback = false) const noexcept;
    /// The double whose bits the writer stored; the readable part is not looked at.
    double GetDataEDouble(double fallback = 0.0) const noexcept;
    /// A decimal number of another writer: "-1.5e3", but neither "inf" nor "nan". Behind leading digits the decimal
    /// point of the process's locale counts as '.', too (not behind blanks or a sign). Too large a number is infinity.
    /// Of this library's own doubles it reads the digits of their bits as a decimal number: use EDouble.
    double GetDataDouble(double fallback = 0.0) const noexcept;
    /// An identifier by the rules of cacfuid::Set: text without exactly four '-' is the null identifier.
    _acfUID GetDataGUID(const _acfUID& fallback = _acfUID()) const noexcept;
    /// A timecode in its exchange form; flagged values read back as unassigned, and their default is for other texts.
    TimeCode::timecode GetDataTimecode(const TimeCode::timecode& fallback = TimeCode::timecode()) const noexcept;
    /// The position of the whole data among the tokens of the list, the first one being 0.
    std::size_t GetDataIndex(const wchar_t* list, wchar_t separator,
                             std::size_t fallback = Buffers::NotFound) const noexcept;
    /// Flags as their writer wrote them: names and "0x" numbers of up to eight digits, blanks not skipped. The default
    /// for any other token.
    ulong32 GetDataFlags(const tagXMLFLAGMAP* map, std::size_t count, wchar_t separator,
                         ulong32 fallback = 0) const noexcept;
    /// The number of bytes that the data stands for: 0 unless it is an even number of hexadecimal digits of either
    /// case, all read.
    unsigned long long GetDataBinarySize() const noexcept;
    /// The bytes, the low half of each first. False, and the buffer untouched, when there are none or more than
    /// @p capacity.
    bool GetDataBinary(unsigned char* buffer, unsigned long long capacity) const noexcept;

    long32 FindElementInt(const CPPoolString& name, long32 fallback = 0) const noexcept;
    ulong32 FindElementUInt(const CPPoolString& name, ulong32 fallback = 0) const noexcept;
    long long FindElementLInt(const CPPoolString& name, long long fallback = 0) const noexcept;
    unsigned long long FindElementLUInt(const CPPoolString& name, unsigned long long fallback = 0) const noexcept;
    ulong32 FindElementHex(const CPPoolString& name, ulong32 fallback = 0) const noexcept;
    unsigned long long FindElementFileTime(const CPPoolString& name, unsigned long long fallback = 0) const noexcept;
    Math::CRational FindElementRational(const CPPoolString& name,
                                        const Math::CRational& fallback = Math::CRational()) const noexcept;
    bool FindElementBool(const CPPoolString& name, bool fallback = false) const noexcept;
    double FindElementEDouble(const CPPoolString& name, double fallback = 0.0) const noexcept;
    double FindElementDouble(const CPPoolString& name, double fallback = 0.0) const noexcept;
    _acfUID FindElementGUID(const CPPoolString& name, const _acfUID& fallback = _acfUID()) const noexcept;
    TimeCode::timecode FindElementTimecode(const CPPoolString& name,
                                           const TimeCode::timecode& fallback = TimeCode::timecode()) const noexcept;
    std::size_t FindElementIndex(const CPPoolString& name, const wchar_t* list, wchar_t separator,
                                 std::size_t fallback = Buffers::NotFound) const noexcept;
    ulong32 FindElementFlags(const CPPoolString& name, const tagXMLFLAGMAP* map, std::size_t count, wchar_t separator,
                             ulong32 fallback = 0) const noexcept;
    /// The data itself.
    CPPoolString FindElementString(const CPPoolString& name,
                                   const CPPoolString& fallback = CPPoolString::pempty) const noexcept;

    long32 FindAttributeInt(const CPPoolString& name, long32 fallback = 0) const noexcept;
    ulong32 FindAttributeUInt(const CPPoolString& name, ulong32 fallback = 0) const noexcept;
    long long FindAttributeLInt(const CPPoolString& name, long long fallback = 0) const noexcept;
    unsigned long long FindAttributeLUInt(const CPPoolString& name, unsigned long long fallback = 0) const noexcept;
    ulong32 FindAttributeHex(const CPPoolString& name, ulong32 fallback = 0) const noexcept;
    unsigned long long FindAttributeFileTime(const CPPoolString& name, unsigned long long fallback = 0) const noexcept;
    Math::CRational FindAttributeRational(const CPPoolString& name,
                                          const Math::CRational& fallback = Math::CRational()) const noexcept;
    bool FindAttributeBool(const CPPoolString& name, bool fallback = false) const noexcept;
    double FindAttributeEDouble(const CPPoolString& name, double fallback = 0.0) const noexcept;
    double FindAttributeDouble(const CPPoolString& name, double fallback = 0.0) const noexcept;
    _acfUID FindAttributeGUID(const CPPoolString& name, const _acfUID& fallback = _acfUID()) const noexcept;
    TimeCode::timecode FindAttributeTimecode(const CPPoolString& name,
                                             const TimeCode::timecode& fallback = TimeCode::timecode()) const noexcept;
    std::size_t FindAttributeIndex(const CPPoolString& name, const wchar_t* list, wchar_t separator,
                                   std::size_t fallback = Buffers::NotFound) const noexcept;
    ulong32 FindAttributeFlags(const CPPoolString& name, const tagXMLFLAGMAP* map, std::size_t count, wchar_t separator,
                               ulong32 fallback = 0) const noexcept;
    /// The value itself.
    CPPoolString FindAttributeString(const CPPoolString& name,
                                     const CPPoolString& fallback = CPPoolString::pempty) const noexcept;

    // --- Searching ---
    //
    // Searches give a slot among the children of an element, or null; it is valid until those children change.
    // `start` is null or the result of an earlier search of the same element, else the result is null; it is compared
    // and never read. A slot with an empty handle matches nothing. FindNext starts at the first child or behind `start`
    // and goes forward. FindPrev starts at the last child, or at the one BEHIND `start`, and goes back: it may answer
    // `start` itself, and answers null when that is the last child.

    /// Goes down from child to child by names separated by '/'; blanks around them are skipped. The path ends at the
    /// first character that fits nowhere (a leading '/', the second word of a step), and the names before it count:
    /// "a/b c" is "a", and "/a" nothing.
    /// @param parent  gets the element whose child was found, an empty handle when none was; may be null
    const CPXMLObject* FindFirstElement(const wchar_t* path, CPXMLObject* parent = nullptr) const noexcept;
    CPXMLObject* FindFirstElement(const wchar_t* path, CPXMLObject* parent = nullptr) noexcept;

    /// A child with that name.
    const CPXMLObject* FindNextElement(const CPPoolString& name, const CPXMLObject* start) const noexcept;
    CPXMLObject* FindNextElement(const CPPoolString& name, const CPXMLObject* start) noexcept;
    const CPXMLObject* FindPrevElement(const CPPoolString& name, const CPXMLObject* start) const noexcept;
    CPXMLObject* FindPrevElement(const CPPoolString& name, const CPXMLObject* start) noexcept;
    /// A child with that name and data.
    const CPXMLObject* FindNextElementData(const CPPoolString& name, const CPPoolString& data,
                                           const CPXMLObject* start) const noexcept;
    CPXMLObject* FindNextElementData(const CPPoolString& name, const CPPoolString& data,
                                     const CPXMLObject* start) noexcept;
    const CPXMLObject* FindPrevElementData(const CPPoolString& name, const CPPoolString& data,
                                           const CPXMLObject* start) const noexcept;
    CPXMLObject* FindPrevElementData(const CPPoolString& name, const CPPoolString& data,
                                     const CPXMLObject* start) noexcept;
    /// A child with that name and an attribute `attName`.
    const CPXMLObject* FindNextElementAtt(const CPPoolString& name, const CPPoolString& attName,
                                          const CPXMLObject* start) const noexcept;
    CPXMLObject* FindNextElementAtt(const CPPoolString& name, const CPPoolString& attName,
                                    const CPXMLObject* start) noexcept;
    const CPXMLObject* FindPrevElementAtt(const CPPoolString& name, const CPPoolString& attName,
                                          const CPXMLObject* start) const noexcept;
    CPXMLObject* FindPrevElementAtt(const CPPoolString& name, const CPPoolString& attName,
                                    const CPXMLObject* start) noexcept;
    /// A child with that name and the attribute `attName` of that value.
    const CPXMLObject* FindNextElementAttVal(const CPPoolString& name, const CPPoolString& attName,
                                             const CPPoolString& attValue, const CPXMLObject* start) const noexcept;
    CPXMLObject* FindNextElementAttVal(const CPPoolString& name, const CPPoolString& attName,
                                       const CPPoolString& attValue, const CPXMLObject* start) noexcept;
    const CPXMLObject* FindPrevElementAttVal(const CPPoolString& name, const CPPoolString& attName,
                                             const CPPoolString& attValue, const CPXMLObject* start) const noexcept;
    CPXMLObject* FindPrevElementAttVal(const CPPoolString& name, const CPPoolString& attName,
                                       const CPPoolString& attValue, const CPXMLObject* start) noexcept;

    // --- Output ---
    //
    // An xml declaration, then the element and all below it; no byte order mark. `pretty` adds line ends (CR LF) and
    // two blanks per level. False for an unnamed element, one with children and data, an empty handle as child, an
    // unknown encoding and, but for the raw encoding, text with characters from U+100000 up or half a pair; also
    // without memory. A character above U+FFFF is written as 01 (or 00), but for the raw encoding: it is lost.
    //
    // Not everything reads back as it was: in attributes the five references (an '&' comes back as "<;"), in data
    // blanks at its ends, runs of them and line breaks, unless one of & < > " ' makes it a CDATA section.

    /// Writes a file. One that exists is replaced at once: when writing fails, it is deleted.
    bool Write(const wchar_t* path, eXMLEncoding encoding, bool pretty) const noexcept;
    /// Writes to memory, a zero character behind the text, which counts in the size. @p out is empty on failure.
    bool Write(Buffers::CPPlainMemory& out, eXMLEncoding encoding, bool pretty) const noexcept;

private:
    friend class NodeAccess; // the library's own road to the node

    explicit CPXMLObject(Buffers::tagCPOMEMHEADER* node) noexcept : CPObjectMemory(node) {}

    void* create() noexcept;
    bool setName(const CPPoolString& name) noexcept;
    bool addAttribute(const CPPoolString& name, const CPPoolString& value) noexcept;
    bool deleteAttribute(const CPPoolString& name) noexcept;
    static std::size_t getIndex(const CPPoolString& name, const wchar_t* list, wchar_t separator) noexcept;
    static std::size_t IndexOf(const CPPoolString* text, const wchar_t* list, wchar_t separator,
                               std::size_t fallback) noexcept;

    // The texts of values; the null string where there is none, which the operations below refuse.
    static CPPoolString TextOf(unsigned long long value) noexcept;
    static CPPoolString TextOf(double value) noexcept;
    static CPPoolString TextOf(bool value) noexcept;
    static CPPoolString TextOf(const Math::CRational& value) noexcept;
    static CPPoolString TextOf(const TimeCode::timecode& value) noexcept;
    static CPPoolString TextOf(const _acfUID& value) noexcept;
    static CPPoolString TextOf(const unsigned char* bytes, unsigned long long size) noexcept;
    static CPPoolString TextOf(ulong32 flags, const tagXMLFLAGMAP* map, std::size_t count, wchar_t separator) noexcept;
    bool AddText(const CPPoolString& text) noexcept;
    bool SetText(const CPPoolString& text) noexcept;
    bool AddAttributeText(const CPPoolString& name, const CPPoolString& text) noexcept;
    bool SetAttributeText(const CPPoolString& name, const CPPoolString& text) noexcept;
    xmlret AddTagText(const CPPoolString& name, const CPPoolString& text) noexcept;
    xmlret SetTagText(const CPPoolString& name, const CPPoolString& text) noexcept;

    bool ReplaceAt(const CPXMLObject& child, std::size_t index) noexcept;
    bool DeleteAt(std::size_t index) noexcept;
};
static_assert(sizeof(CPXMLObject) == sizeof(void*), "an element is one pointer");

/// A document: a text read into a tree, or the first error in it. One thread at a time; the trees live on their own.
class TAVO_API CXMLDoc {
public:
    /// No root, error code 0.
    CXMLDoc() noexcept;
    CXMLDoc(const CXMLDoc& other) noexcept;
    CXMLDoc& operator=(const CXMLDoc& other) noexcept;
    ~CXMLDoc();

    /// Reads a file of at most 4,294,967,295 bytes. Every failure before the text is parsed gives error code 0.
    bool OpenDocFile(const wchar_t* path, eXMLEncoding encoding) noexcept;
    /// Reads @p size bytes, at least 4, whose encoding is found out; the text ends at its first zero unit or at the
    /// size. The bytes are not changed.
    bool OpenDocText(void* data, unsigned long long size) noexcept;
    /// Reads zero-terminated UTF-8.
    bool OpenDocText(const unsigned char* text) noexcept;
    /// Reads zero-terminated UTF-16.
    bool OpenDocText(const unsigned short* text) noexcept;
    bool OpenDocText(const wchar_t* text) noexcept;
    /// Drops root and error; the code becomes 128.
    void Close() noexcept;

    /// The root element, an empty handle when nothing was read. A copy of it shares the tree.
    CPXMLObject& GetRootElement() noexcept { return m_root; }
    /// The code of the last error: 128 after success or Close, else one of the table's.
    /// @param offset  gets where it lies in code units from the start of the text; may be null
    /// @param text    gets its message; may be null
    ulong32 GetErrorInfo(unsigned long long* offset, String::CACFWChar* text) const noexcept;

private:
    bool Refuse() noexcept;
    template <class Unit> bool ParseUnits(const Unit* text, std::size_t units, bool isAscii = false) noexcept;
    bool ParseUtf16(const void* data, std::size_t most, bool swap) noexcept;
    bool ParseBytes(const unsigned char* bytes, std::size_t size, std::size_t wideUnits) noexcept;

    Buffers::CPPlainMemory m_errorText; // zero-terminated wide text
    unsigned long long m_errorOffset;
    std::uint32_t m_errorCode;
    CPXMLObject m_root;
};

} // namespace XML
} // namespace TAVO
