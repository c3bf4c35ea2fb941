#pragma once
// A node of the element tree from inside: what parser, tree and writer share.

#include "blocks.h"

#include <cstring>
#include <new>
#include <TAVO/xml.h>

namespace TAVO::XML {

// Handles of elements from inside.
class NodeAccess {
public:
    // Takes over a reference; null gives an empty handle.
    static CPXMLObject Adopt(Buffers::tagCPOMEMHEADER* node) { return CPXMLObject(node); }
};

namespace detail {

using Buffers::CPObjectMemory;
using Buffers::tagCPOMEMHEADER;
using String::CPPoolString;

struct Attribute {
    CPPoolString name;
    CPPoolString value;
};

enum ContentKind : std::uint32_t {
    kNothing = 0,
    kElements = 1,
    kData = 2,
    kMixed = 3,      // children and data
    kInstruction = 4 // a processing instruction; the data is its text
};

// The payload of a node's block. A name, data or attribute that is not there is the empty string.
struct Node {
    CPPoolString name = CPPoolString::pempty;
    std::uint32_t contentKind = kNothing;
    CPObjectMemory attributes; // array of Attribute, null while there are none
    CPObjectMemory elements;   // array of CPXMLObject, null while there are none
    CPPoolString data = CPPoolString::pempty;
};

// How adding a child or data moves the kind.
inline void RaiseForChild(Node& node) {
    if (node.contentKind == kNothing || node.contentKind == kData) node.contentKind |= kElements;
}
inline void RaiseForData(Node& node) {
    if (node.contentKind == kNothing || node.contentKind == kElements) node.contentKind |= kData;
}

// A block for a node with the defaults, count 1; null without memory.
tagCPOMEMHEADER* NewNode() noexcept;

inline Node& NodeOf(tagCPOMEMHEADER* block) { return *reinterpret_cast<Node*>(block + 1); }
// Requires: a live handle.
inline Node& NodeOf(const CPXMLObject& element) { return *Buffers::Block::PayloadOf<Node>(element); }
inline bool IsLive(const CPXMLObject& element) { return Buffers::Block::Of(element) != nullptr; }
// The node of a live handle, or of one that is live and named; else null.
inline Node* LiveNode(const CPXMLObject& element) { return IsLive(element) ? &NodeOf(element) : nullptr; }
inline Node* NamedNode(const CPXMLObject& element) {
    Node* node = LiveNode(element);
    return node && node->name.isdef() ? node : nullptr;
}
// Null for a null node and when there is none of that name.
const Attribute* FindAttributeOf(const Node* node, const CPPoolString& name) noexcept;

// The types of the two kinds of arrays.
extern const Buffers::tagCPOVTABL g_attributesTable;
extern const Buffers::tagCPOVTABL g_elementsTable;
template <class T> inline constexpr const Buffers::tagCPOVTABL* kArrayTable = nullptr;
template <> inline constexpr const Buffers::tagCPOVTABL* kArrayTable<Attribute> = &g_attributesTable;
template <> inline constexpr const Buffers::tagCPOVTABL* kArrayTable<CPXMLObject> = &g_elementsTable;

// A block for `count` elements, all used, none constructed; null without memory.
tagCPOMEMHEADER* NewArray(std::size_t count, std::size_t size, const Buffers::tagCPOVTABL* table) noexcept;
// Makes room for one element more. The block may move, and is allocated when null. False without memory.
bool GrowArray(tagCPOMEMHEADER*& block, std::size_t size, const Buffers::tagCPOVTABL* table) noexcept;

// Arrays of T in a block of their own, which belongs to one node and is never shared. An array that is built at once
// takes what it needs; one that grows reports 16 entries more at a time, while the memory behind it grows
// geometrically, so that a million appended children stay linear. T is moved bitwise.
template <class T> struct Array {
    static std::size_t Count(const CPObjectMemory& array) {
        const tagCPOMEMHEADER* block = Buffers::Block::Of(array);
        return block ? block->sUsed / sizeof(T) : 0;
    }
    static T* First(const CPObjectMemory& array) {
        return Buffers::Block::Of(array) ? Buffers::Block::PayloadOf<T>(array) : nullptr;
    }

    // Moves a run of elements into a new array; the run is raw memory afterwards. False, with the run untouched,
    // without memory. Requires: an array that is null. No elements leave it null.
    static bool Build(CPObjectMemory& array, T* run, std::size_t count) noexcept {
        if (count == 0) return true;
        tagCPOMEMHEADER* block = NewArray(count, sizeof(T), kArrayTable<T>);
        if (!block) return false;
        std::memcpy(static_cast<void*>(block + 1), static_cast<const void*>(run), count * sizeof(T));
        array = Buffers::Block::Adopt(block);
        return true;
    }

    // Inserts before `index`, at most the count. False, with element and array untouched, without memory.
    static bool Insert(CPObjectMemory& array, std::size_t index, T&& element) noexcept {
        tagCPOMEMHEADER*& block = Buffers::Block::RefOf(array);
        if (!block || block->sUsed == block->sAllocated) {
            if (!GrowArray(block, sizeof(T), kArrayTable<T>)) return false;
        }
        T* slot = First(array) + index;
        std::memmove(static_cast<void*>(slot + 1), static_cast<const void*>(slot), block->sUsed - index * sizeof(T));
        ::new (static_cast<void*>(slot)) T(std::move(element));
        block->sUsed += sizeof(T);
        return true;
    }
    static bool Append(CPObjectMemory& array, T&& element) noexcept {
        return Insert(array, Count(array), std::move(element));
    }

    // Takes out the element at `index`, which must be there. The block goes with the last one.
    static T Remove(CPObjectMemory& array, std::size_t index) noexcept {
        tagCPOMEMHEADER* block = Buffers::Block::Of(array);
        T* slot = First(array) + index;
        T removed(std::move(*slot));
        slot->~T();
        block->sUsed -= sizeof(T);
        std::memmove(static_cast<void*>(slot), static_cast<const void*>(slot + 1), block->sUsed - index * sizeof(T));
        if (block->sUsed == 0) array.free();
        return removed;
    }
};

using Attributes = Array<Attribute>;
using Elements = Array<CPXMLObject>;

} // namespace detail
} // namespace TAVO::XML
