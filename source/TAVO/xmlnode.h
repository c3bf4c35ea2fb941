#pragma once
// A node of the element tree from inside: what parser, tree and writer share.

#include "blocks.h"

#include <TAVO/string.h>

namespace TAVO::XML::detail {

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
    CPObjectMemory elements;   // array of handles of nodes, null while there are none
    CPPoolString data = CPPoolString::pempty;
};

// The types of the three kinds of blocks.
extern const Buffers::tagCPOVTABL g_attributesTable;
extern const Buffers::tagCPOVTABL g_elementsTable;

// A block for a node with the defaults, count 1; null without memory.
tagCPOMEMHEADER* NewNode() noexcept;

inline Node& NodeOf(tagCPOMEMHEADER* block) { return *reinterpret_cast<Node*>(block + 1); }

// Arrays of T (Attribute, or CPObjectMemory for children) in a block of their own. An array that is built at once takes what
// it needs; one that grows by appending takes 16 entries more at a time, and more than that when it is long, so that a
// million appended children stay linear. T is moved bitwise.
template <class T>
struct Array {
    static std::size_t Count(const CPObjectMemory& array) {
        return array.key() ? Buffers::Block::Of(array)->sUsed / sizeof(T) : 0;
    }
    static T* First(const CPObjectMemory& array) {
        return array.key() ? Buffers::Block::PayloadOf<T>(array) : nullptr;
    }
};

using Attributes = Array<Attribute>;
using Elements = Array<CPObjectMemory>;

} // namespace TAVO::XML::detail
