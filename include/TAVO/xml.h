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

#include <TAVO/string.h>

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
