// The parser. One pass, no recursion: open elements wait on a stack of the parser's own.

#include "xmlparser.h"

#include "scratch.h"
#include "stack.h"
#include "transcoding.h"
#include "xmlnames.h"
#include "xmlstrings.h"

namespace TAVO::XML::detail {

namespace {

using namespace String::detail; // stepping and folding of text

// The inclusive ranges of characters that a reference may name.
struct CharacterRange {
    ulong32 first, last;
};
constexpr CharacterRange kCharacters[] = {{0x09, 0x09},   {0x0A, 0x0A},     {0x0D, 0x0D},
                                          {0x20, 0xD7FF}, {0xE000, 0xFFFD}, {0x10000, 0x10FFFF}};

constexpr bool IsCharacter(ulong32 value) {
    for (const CharacterRange& range : kCharacters)
        if (value >= range.first && value <= range.last) return true;
    return false;
}

// From here on a character cannot be interned from wide text: its first unit would lie in the low surrogates.
constexpr ulong32 kFirstUninternable = 0x100000;

// Up to this many attributes names are compared one by one, above it by a table.
constexpr std::size_t kFewAttributes = 16;

template <class Unit> class Parser {
public:
    Parser(const Unit* text, std::size_t units) : m_begin(text), m_end(text + units), m_at(text) {}
    Parser(const Parser&) = delete;
    Parser& operator=(const Parser&) = delete;
    ~Parser() {
        for (std::size_t i = 0; i < m_children.Count(); ++i) Buffers::Block::Free(m_children[i]);
        for (; !m_open.Empty(); m_open.Pop()) Buffers::Block::Free(m_open.Last().node);
        DropAttributes();
    }

    ParseResult Run() {
        ParseResult result;
        if (Document() && Settle()) {
            result.root = std::move(m_root);
        } else {
            result.code = m_code;
            result.offset = static_cast<std::size_t>(m_errorAt - m_begin);
        }
        return result;
    }

private:
    static constexpr bool kUtf8 = sizeof(Unit) == 1;

    // What an element's content has shown itself to be.
    enum class Content : std::uint8_t { Open, Children, Data, DataEnded };

    // A name as the document spells it.
    struct Spelling {
        const Unit* text = nullptr;
        std::size_t units = 0;
        bool ascii = false;
    };

    struct OpenElement {
        tagCPOMEMHEADER* node;
        Spelling name;          // in the start tag
        std::size_t firstChild; // in m_children
        Content content;
    };

    enum class TagEnd { Open, Empty, Instruction };

    using Values = StringCache<Unit, 1024>;

    // Where a text belongs: to an attribute of the node, or of the instruction that is being read when there is none,
    // or to the node's data.
    struct Place {
        tagCPOMEMHEADER* node = nullptr;
        std::size_t attribute = kNoPlace;
    };
    static constexpr std::size_t kNoPlace = SIZE_MAX, kDataPlace = SIZE_MAX - 1;

    // --- errors ------------------------------------------------------------------------------------------------------

    TAVO_NOINLINE bool Fail(ErrorCode code, const Unit* at) {
        m_code = code;
        m_errorAt = at;
        return false;
    }
    bool OutOfMemory() { return Fail(kDomError, m_at); }

    // --- looking ahead ----------------------------------------------------------------------------------------------

    bool AtEnd() const { return m_at == m_end; }

    // Whether the ASCII text `what` stands at `at`; never looks behind the end.
    template <std::size_t Size> bool Stands(const Unit* at, const char (&what)[Size]) const {
        if (static_cast<std::size_t>(m_end - at) < Size - 1) return false;
        for (std::size_t i = 0; i < Size - 1; ++i)
            if (at[i] != static_cast<Unit>(what[i])) return false;
        return true;
    }

    // The first place from `at` on where `what` stands, null when it does not.
    template <std::size_t Size> const Unit* Find(const Unit* at, const char (&what)[Size]) const {
        for (; m_end - at >= static_cast<std::ptrdiff_t>(Size - 1); ++at)
            if (*at == static_cast<Unit>(what[0]) && Stands(at, what)) return at;
        return nullptr;
    }

    void SkipBlanks() {
        while (m_at != m_end && IsBlank(*m_at)) ++m_at;
    }

    // --- the document -----------------------------------------------------------------------------------------------

    bool Document() {
        if (Stands(m_at, "\xEF\xBB\xBF") && kUtf8) m_at += 3;
        if (!kUtf8 && !AtEnd() && static_cast<unsigned>(*m_at) == 0xFEFF) ++m_at;
        SkipBlanks();
        if (AtEnd()) return Fail(kEndOfFile, m_end);
        for (; SkipBlanks(), !AtEnd();)
            if (!TopLevelItem()) return false;
        return true;
    }

    bool TopLevelItem() {
        const Unit* tag = m_at;
        if (*tag != '<') return Fail(kInvalidTag, tag);
        if (tag + 1 == m_end) return Fail(kOpenEnclosure, m_end);
        switch (tag[1]) {
        case '!':
            return SkipDeclaration();
        case '?':
            return Instruction(true);
        case '/':
            return tag + 2 == m_end ? Fail(kOpenEnclosure, m_end) : Fail(kBadTerminationTag, tag);
        default:
            if (m_root.key()) return Fail(kRootMissing, tag); // the code of a second root, by contract
            return Element();
        }
    }

    // The declaration is the instruction named "xml"; it counts at top level only.
    bool Instruction(bool topLevel) {
        const Unit* start = m_at;
        m_at += 2;
        Spelling name;
        if (!Name(name)) return false;
        const bool declaration = topLevel && IsDeclarationName(name);
        TagEnd end;
        if (!AttributesOf(nullptr, TagEnd::Instruction, end) || !Settle()) return false;
        const bool good = !declaration || Declaration(start);
        DropAttributes();
        return good;
    }

    bool IsDeclarationName(const Spelling& name) {
        if (name.ascii) return name.units == 3 && Stands(name.text, "xml");
        return kUtf8 && InternName(name).cmp(L"xml") == 0; // overlong forms
    }

    bool Declaration(const Unit* start) {
        const CPPoolString *version = FindAttribute("version"), *encoding = FindAttribute("encoding");
        if (version && version->cmp(L"1.0") != 0) return Fail(kBadVersion, start);
        if (!encoding) return true;
        static constexpr const wchar_t* kUtf8Names[] = {L"UTF-8"};
        static constexpr const wchar_t* kUtf16Names[] = {L"UTF-16", L"ISO-10646-UCS-2", L"Unicode"};
        const wchar_t* const* names = kUtf8 ? kUtf8Names : kUtf16Names;
        for (std::size_t i = 0; i < (kUtf8 ? std::size(kUtf8Names) : std::size(kUtf16Names)); ++i)
            if (encoding->cmpi(names[i]) == 0) return true;
        return Fail(kUnsupportedEncoding, start);
    }

    const CPPoolString* FindAttribute(const char* name) {
        for (std::size_t i = 0; i < m_attributes.Count(); ++i) {
            const wchar_t* units = AttributeAt(i).name;
            std::size_t k = 0;
            while (name[k] && units[k] == static_cast<unsigned char>(name[k])) ++k;
            if (!name[k] && !units[k]) return &AttributeAt(i).value;
        }
        return nullptr;
    }

    // --- rules that differ from the XML recommendation, each in one place -------------------------------------------

    // Intended (xml-declaration-end): "<!" runs to the next '>' outside quotes, comments at top level included, so an
    // apostrophe in a comment opens a string and a DOCTYPE's internal subset ends at its first '>'. A textbook would
    // look for "-->" and "]>"; licence texts in comments are the usual victims, and documents that pass today are
    // accepted by this rule.
    bool SkipDeclaration() {
        const Unit* start = m_at;
        const bool comment = Stands(start, "<!--");
        for (const Unit* at = start + 2; at != m_end; ++at) {
            if (*at == '>') {
                m_at = at + 1;
                return true;
            }
            if (*at != '"' && *at != '\'') continue;
            const Unit quote = *at;
            const Unit* opened = at;
            do ++at;
            while (at != m_end && *at != quote);
            if (at == m_end) return Fail(kOpenString, opened);
        }
        return comment ? Fail(kOpenComment, start) : Fail(kEndOfFile, m_end);
    }

    // Inside an element a comment ends at "-->", which may not overlap "<!--".
    bool SkipComment() {
        const Unit* end = Find(m_at + 4, "-->");
        if (!end) return Fail(kOpenComment, m_at);
        m_at = end + 3;
        return true;
    }

    // Intended (xml-named-references): the look-up of the five predefined references stops at the first that does NOT
    // match in full and takes its character: "&lt;" gives '>', every other reference '<', and three units are skipped
    // either way. A textbook would stop at the match; stored documents were read, and their texts compared, by this
    // rule. Requires: m_at at the '&'. The character goes to `value`.
    bool PredefinedReference(ulong32& value) {
        const Unit* body = m_at + 1;
        constexpr std::ptrdiff_t kSkipped = 3; // "lt;" and "gt;"
        value = Stands(body, "lt;") ? ulong32{'>'} : ulong32{'<'};
        if (m_end - body < kSkipped) return Fail(kEndOfFile, m_end);
        // The skip counts units and may end inside a character.
        const Unit* at = body;
        while (at < body + kSkipped) {
            const std::size_t units = CharacterUnits(at);
            at += units ? units : 1;
        }
        m_at = body + kSkipped;
        return at == m_at || Fail(kIllegalCharacter, m_at);
    }

    // Intended (xml-numeric-references): the hexadecimal form begins its digits at the 'x', finds none and yields 0, so
    // it always fails; and ':' counts as a digit of value 10. A textbook would read hexadecimal digits and refuse the
    // colon. Requires: m_at at the '&' of "&#".
    bool NumericReference(ulong32& value) {
        const Unit* start = m_at;
        const Unit* at = start + 2;
        value = 0;
        constexpr ulong32 kTooLarge = 0x110000;
        for (; at != m_end && *at >= '0' && *at <= ':'; ++at)
            if ((value = value * 10 + (*at - '0')) > kTooLarge) value = kTooLarge; // saturates: never wraps into range
        if (at == m_end || *at != ';' || !IsCharacter(value)) return Fail(kBadEscape, start);
        if (value >= kFirstUninternable) return Fail(kIllegalCharacter, start);
        m_at = at + 1;
        return true;
    }

    // Intended (xml-text-or-children): a textbook reads text between children. Here content is one or the other, as the
    // tree and the writer know it; after a child nothing but markup may come.
    bool MixedContent(const Unit* at) { return Fail(kMixedContent, at); }

    // --- names ------------------------------------------------------------------------------------------------------

    // Moves behind the name at m_at.
    bool Name(Spelling& name) {
        if (AtEnd()) return Fail(kOpenEnclosure, m_end);
        if (TAVO_UNLIKELY(!IsAsciiClass(*m_at, kNameStartBit))) return AnyName(name);
        const Unit* at = m_at + 1;
        while (at != m_end && IsAsciiClass(*at, kNameBit)) ++at;
        if (TAVO_UNLIKELY(at != m_end && *at >= 0x80)) return AnyName(name);
        name = {m_at, static_cast<std::size_t>(at - m_at), true};
        m_at = at;
        return true;
    }

    // The same for names with characters above 7F; not at the end.
    TAVO_NOINLINE bool AnyName(Spelling& name) {
        const Unit* start = m_at;
        ulong32 value;
        const Unit* at = m_at;
        if (!NameCharacter(at, value) || !IsNameStart(value)) return Fail(kInvalidTag, start);
        do m_at = at;
        while (m_at != m_end && NameCharacter(at, value) && IsNameChar(value));
        name = {start, static_cast<std::size_t>(m_at - start), true};
        for (const Unit* unit = start; unit < m_at; ++unit) name.ascii &= *unit < 0x80;
        return true;
    }

    // Decodes the character at `at`, never reading behind the end; false where none stands that a name could hold.
    bool NameCharacter(const Unit*& at, ulong32& value) const {
        value = *at;
        if (TAVO_LIKELY(value < 0x80)) {
            ++at;
            return true;
        }
        if constexpr (kUtf8) return StepUtf8(value, at); // validated, so whole
        if (IsSurrogate(*at)) return false;
        ++at;
        return true;
    }

    CPPoolString InternName(const Spelling& name) {
        if (TAVO_LIKELY(name.ascii)) return m_names.Get(name.text, name.units);
        m_text.Cut(0);
        for (const Unit* at = name.text; at < name.text + name.units;) {
            ulong32 value;
            NameCharacter(at, value);
            if (!m_text.Push(static_cast<wchar_t>(value))) return {};
        }
        return String::pool::InternWide(m_text.First(), m_text.Count());
    }

    // --- tags -------------------------------------------------------------------------------------------------------

    // Reads attributes of the node up to the end of a start tag or, with TagEnd::Instruction and no node, of an
    // instruction, and moves behind it.
    bool AttributesOf(tagCPOMEMHEADER* node, TagEnd kind, TagEnd& end) {
        m_seen.Cut(0);
        for (;;) {
            SkipBlanks();
            if (AtEnd()) return Fail(kOpenEnclosure, m_end);
            const Unit c = *m_at;
            if (kind == TagEnd::Instruction) {
                if (c == '?') return Close("?>", TagEnd::Instruction, end);
                if (c == '>') return Fail(kOpenEnclosure, m_at);
            } else {
                if (c == '>') return Close(">", TagEnd::Open, end);
                if (c == '/') return Close("/>", TagEnd::Empty, end);
            }
            if (c == '<') return Fail(kOpenEnclosure, m_at);
            if (!AttributeHere(node)) return false;
        }
    }

    template <std::size_t Size> bool Close(const char (&mark)[Size], TagEnd kind, TagEnd& end) {
        if (!Stands(m_at, mark)) return Fail(kOpenEnclosure, m_at + 1);
        m_at += Size - 1;
        end = kind;
        return true;
    }

    bool AttributeHere(tagCPOMEMHEADER* node) {
        const Unit* start = m_at;
        Spelling name;
        if (!Name(name)) return Fail(kBadAttribute, start);
        SkipBlanks();
        if (AtEnd()) return Fail(kOpenEnclosure, m_end);
        if (*m_at != '=') return Fail(kBadAttribute, m_at);
        ++m_at;
        SkipBlanks();
        if (AtEnd()) return Fail(kOpenEnclosure, m_end);
        if (*m_at != '"' && *m_at != '\'') return Fail(kBadAttribute, m_at);

        Attribute attribute{InternName(name), {}};
        if (attribute.name.isnull()) return OutOfMemory();
        if (!Value({node, m_attributes.Count()}, attribute.value)) return false;
        if (IsDuplicate(attribute.name)) return Fail(kBadAttribute, start);
        // Intended (xml-empty-attribute): an empty value is dropped, where a textbook keeps it: hosts take it for
        // missing.
        if (attribute.value.isempty()) return true;
        return Keep(std::move(attribute)) || OutOfMemory();
    }

    Attribute& AttributeAt(std::size_t index) { return reinterpret_cast<Attribute&>(m_attributes[index]); }

    bool Keep(Attribute&& attribute) {
        RawAttribute* place = m_attributes.Add();
        if (!place) return false;
        ::new (static_cast<void*>(place)) Attribute(std::move(attribute));
        return m_attributes.Count() <= kFewAttributes || See(m_attributes.Count() - 1);
    }

    void DropAttributes() {
        for (std::size_t i = 0; i < m_attributes.Count(); ++i) AttributeAt(i).~Attribute();
        m_attributes.Cut(0);
    }

    bool IsDuplicate(const CPPoolString& name) {
        const std::size_t count = m_attributes.Count();
        if (count <= kFewAttributes) {
            for (std::size_t i = 0; i < count; ++i)
                if (AttributeAt(i).name == name) return true;
            return false;
        }
        for (std::size_t slot = Hash(name);; ++slot) {
            const std::uint32_t index = m_seen[slot & (m_seen.Count() - 1)];
            if (index == 0) return false;
            if (AttributeAt(index - 1).name == name) return true;
        }
    }

    static std::size_t Hash(const CPPoolString& name) {
        return (reinterpret_cast<std::size_t>(String::PoolAccess::Block(name)) >> 4) * 0x9E3779B97F4A7C15 >> 20;
    }

    // Enters attribute `index` into the table of names: open addressing, a power of two, at most half full; 0 is free.
    bool See(std::size_t index) {
        if (2 * (index + 1) > m_seen.Count()) {
            const std::size_t slots = m_seen.Count() ? m_seen.Count() * 2 : 4 * kFewAttributes;
            m_seen.Cut(0);
            if (!m_seen.Reserve(slots)) return false;
            for (std::size_t i = 0; i < slots; ++i) m_seen.Push(0);
            for (std::size_t i = 0; i < index; ++i) Enter(i);
        }
        Enter(index);
        return true;
    }

    void Enter(std::size_t index) {
        std::size_t slot = Hash(AttributeAt(index).name);
        while (m_seen[slot & (m_seen.Count() - 1)]) ++slot;
        m_seen[slot & (m_seen.Count() - 1)] = static_cast<std::uint32_t>(index + 1);
    }

    // --- elements ---------------------------------------------------------------------------------------------------

    // The element at m_at with everything below it.
    bool Element() {
        if (!StartTag()) return false;
        while (!m_open.Empty())
            if (!ContentItem()) return false;
        return true;
    }

    bool StartTag() {
        ++m_at;
        OpenElement* open = m_open.Add();
        if (!open) return OutOfMemory();
        open->node = nullptr;
        open->firstChild = m_children.Count();
        open->content = Content::Open;
        if (!Name(open->name)) return false;
        open->node = NewNode();
        if (!open->node) return OutOfMemory();
        TagEnd end;
        if (!AttributesOf(open->node, TagEnd::Open, end)) return false;
        Node& element = NodeOf(open->node);
        element.name = InternName(open->name);
        if (element.name.isnull()) return OutOfMemory();
        if (!m_attributes.Empty()) {
            if (!Attributes::Build(element.attributes, &AttributeAt(0), m_attributes.Count())) return OutOfMemory();
            m_attributes.Cut(0); // moved
        }
        return end != TagEnd::Empty || FinishElement();
    }

    // The innermost open element is complete: it gets its children and becomes a child of the next one, or the root.
    bool FinishElement() {
        const OpenElement& element = m_open.Last();
        const std::size_t children = m_children.Count() - element.firstChild;
        if (children) {
            Node& node = NodeOf(element.node);
            auto* run =
                reinterpret_cast<CPXMLObject*>(m_children.First() + element.firstChild); // a handle is one pointer
            if (!Elements::Build(node.elements, run, children)) return OutOfMemory();
            node.contentKind = kElements;
            m_children.Cut(element.firstChild); // moved
        }
        if (m_open.Count() == 1)
            m_root = NodeAccess::Adopt(element.node);
        else if (!m_children.Push(element.node))
            return OutOfMemory();
        m_open.Pop();
        return true;
    }

    // One item of the innermost open element's content.
    bool ContentItem() {
        OpenElement& element = m_open.Last();
        SkipBlanks();
        if (AtEnd()) return Fail(kEndOfFile, m_end);
        const Unit* at = m_at;
        if (*at != '<') return element.content == Content::Open ? Data() : MixedContent(at);
        if (at + 1 == m_end) return Fail(kOpenEnclosure, m_end);
        switch (at[1]) {
        case '/':
            return EndTag();
        case '?':
            return Instruction(false);
        case '!':
            if (Stands(at, "<![CDATA[")) return element.content == Content::Open ? Data() : MixedContent(at);
            return Stands(at, "<!--") ? SkipComment() : SkipDeclaration();
        default:
            if (element.content == Content::DataEnded) return MixedContent(at);
            element.content = Content::Children;
            return StartTag();
        }
    }

    bool EndTag() {
        const OpenElement& element = m_open.Last();
        const Unit* tag = m_at;
        // After data a wrong end tag is mixed content by its code.
        const ErrorCode wrong = element.content == Content::DataEnded ? kMixedContent : kBadTerminationTag;
        m_at += 2;
        if (AtEnd()) return Fail(kOpenEnclosure, m_end);
        const std::size_t units = element.name.units;
        if (static_cast<std::size_t>(m_end - m_at) > units && m_at[units] == '>' &&
            std::memcmp(m_at, element.name.text, units * sizeof(Unit)) == 0) {
            m_at += units + 1;
            return FinishElement();
        }
        Spelling name;
        bool same = Name(name);
        if (same && !IsSameName(name, element, same)) return OutOfMemory();
        if (!same) return Fail(wrong, tag);
        SkipBlanks();
        if (AtEnd()) return Fail(kOpenEnclosure, m_end);
        if (*m_at != '>') return Fail(kOpenEnclosure, m_at);
        ++m_at;
        return FinishElement();
    }

    // Names of other spelling may be the same: UTF-8 has overlong forms. False without memory.
    bool IsSameName(const Spelling& name, const OpenElement& element, bool& same) {
        same = name.units == element.name.units &&
               std::memcmp(name.text, element.name.text, name.units * sizeof(Unit)) == 0;
        if (same || !kUtf8 || (name.ascii && element.name.ascii)) return true;
        const CPPoolString interned = InternName(name);
        same = interned == NodeOf(element.node).name;
        return !interned.isnull();
    }

    // --- text -------------------------------------------------------------------------------------------------------

    // What a run may hold besides ASCII: nothing, or every character that is stored as it is decoded, which those from
    // 10000 on are not.
    enum class Script { Ascii, Any };

    // The first unit from `start` on that a text cannot simply run over: a blank that does not stand alone among other
    // units, a control, a character that is not of the script, '&', or one of the two stops; the end when there is
    // none. Requires: `start` is not at a blank.
    template <Script script> const Unit* RunEnd(const Unit* start, Unit stop1, Unit stop2) const {
        const Unit* at = start;
        if constexpr (kUtf8) {
            using namespace Simd;
            const Block space = All8(' '), reference = All8('&');
            const Block first = All8(stop1), second = All8(stop2);
            std::uint32_t spaceBefore = 0; // whether the block before ended with a space that may stand alone
            for (; m_end - at >= static_cast<std::ptrdiff_t>(kBlock); at += kBlock) {
                const Block block = Load(at);
                // Signed: bytes from 80 on are below too.
                const Block others = script == Script::Ascii
                                         ? Below8(block, All8(0x21))
                                         : Or(AtLeast8(space, block), AtLeast8(block, All8(kFirstLead4)));
                const std::uint32_t special =
                    Mask(Or(Or(others, Equal8(block, reference)), Or(Equal8(block, first), Equal8(block, second))));
                if (!(special | spaceBefore)) continue;
                // A space is no obstacle unless something special follows.
                const std::uint32_t spaces = Mask(Equal8(block, space));
                const std::uint32_t obstacles = (special & ~spaces) | (spaces & special >> 1);
                if (spaceBefore & special & 1) return at - 1;
                if (obstacles) return at + std::countr_zero(obstacles);
                spaceBefore = spaces >> 15;
            }
            at -= spaceBefore;
        }
        const auto isPlain = [=](Unit c) { return IsPlain<script>(c) && c != '&' && c != stop1 && c != stop2; };
        while (at != m_end && (isPlain(*at) || (*at == ' ' && at + 1 != m_end && isPlain(at[1])))) ++at;
        return at;
    }

    static constexpr int kFirstLead4 = 0xF0;

    template <Script script> static bool IsPlain(Unit c) {
        const auto unit = static_cast<unsigned>(c);
        if (unit < 0x80 || script == Script::Ascii) return unit - 0x21u < 0x5Fu;
        return kUtf8 ? unit < kFirstLead4 : !IsSurrogate(c);
    }

    // The value at m_at, quotes included, which goes to `place`. The null string when it will be there later.
    bool Value(const Place& place, CPPoolString& value) {
        const Unit* opened = m_at;
        const Unit quote = *opened;
        const Unit* start = opened + 1;
        const Unit* at = start != m_end && *start == ' ' ? start : RunEnd<Script::Ascii>(start, quote, quote);
        if (at == m_end) return Fail(kOpenString, opened);
        if (*at != quote) return ValueInPieces(value);
        m_at = at + 1;
        return PlainText(place, start, at, value);
    }

    bool IsBlankAt(const Unit* at) const { return at != m_end && IsBlank(*at); }

    // Interns what stands there as it is. The null string when that takes long: `place` gets it later, while what comes
    // next in the document has been read. Long texts do not repeat.
    bool PlainText(const Place& place, const Unit* start, const Unit* end, CPPoolString& text) {
        constexpr std::size_t kLong = 100;
        const auto units = static_cast<std::size_t>(end - start);
        if (units == 0) {
            text = CPPoolString::pempty;
            return true;
        }
        if (units >= kLong) {
            text = Intern(start, units);
            return !text.isnull() || OutOfMemory();
        }
        typename Values::Later later;
        text = later.Begin(m_values, start, units);
        if (!text.isnull()) return true;
        if (!Settle()) return false;
        m_later = later;
        m_laterPlace = place;
        return true;
    }

    // Puts the text that is still on its way into its place.
    bool Settle() {
        if (m_laterPlace.attribute == kNoPlace) return true;
        const Place place = std::exchange(m_laterPlace, {});
        CPPoolString text = m_later.Finish();
        if (text.isnull()) return OutOfMemory();
        TextAt(place) = std::move(text);
        return true;
    }

    CPPoolString& TextAt(const Place& place) {
        if (place.attribute == kDataPlace) return NodeOf(place.node).data;
        const bool built = place.node && NodeOf(place.node).attributes.key();
        // NOLINTNEXTLINE(clang-analyzer-core.uninitialized.UndefReturn): who gave the place has put an attribute there
        return (built ? Attributes::First(NodeOf(place.node).attributes)[place.attribute]
                      : AttributeAt(place.attribute))
            .value;
    }

    // A value with references, runs of blanks or characters above 7F.
    bool ValueInPieces(CPPoolString& value) {
        const Unit* opened = m_at++;
        BeginText();
        while (!AtEnd() && *m_at != *opened)
            if (!Characters(*opened, *opened)) return false;
        if (AtEnd()) return Fail(kOpenString, opened);
        ++m_at;
        return EndText(value);
    }

    // The data at m_at, up to and including the element's end tag or what else may follow it.
    bool Data() {
        OpenElement& element = m_open.Last();
        const Unit* start = m_at;
        const Unit* at = RunEnd<Script::Ascii>(start, '<', ']');
        while (at != m_end && *at == ']' && !Stands(at, "]]>") && !IsBlankAt(at + 1))
            at = RunEnd<Script::Ascii>(at + 1, '<', ']');
        // Nearly always the whole data stands here as it is.
        if (at == m_end || *at != '<' || at == start || !Stands(at, "</")) return DataInPieces(element);
        m_at = at;
        CPPoolString data;
        if (!PlainText({element.node, kDataPlace}, start, at, data)) return false;
        StoreData(element, std::move(data));
        return true;
    }

    bool DataInPieces(OpenElement& element) {
        BeginText();
        for (;;) {
            if (AtEnd()) return Fail(kEndOfFile, m_end);
            if (*m_at == '<') {
                if (Stands(m_at, "<![CDATA[")) {
                    if (!CDataSection()) return false;
                } else if (Stands(m_at, "<!--")) {
                    if (!SkipComment()) return false;
                } else if (Stands(m_at, "<!")) {
                    if (!SkipDeclaration()) return false;
                } else {
                    break; // an end tag, an instruction, or a child that must not be
                }
            } else if (*m_at == ']' && Stands(m_at, "]]>")) {
                return Fail(kBadDataTerminator, m_at);
            } else if (!Characters('<', ']')) {
                return false;
            }
        }
        CPPoolString data;
        if (!EndText(data)) return false;
        StoreData(element, std::move(data));
        return true;
    }

    // The null string stands for one that is put there later.
    void StoreData(OpenElement& element, CPPoolString&& data) {
        element.content = Content::DataEnded;
        if (data.isempty()) return; // empty sections are no data
        Node& node = NodeOf(element.node);
        if (!data.isnull()) node.data = std::move(data);
        node.contentKind = kData;
    }

    bool CDataSection() {
        const Unit* start = m_at;
        const Unit* end = Find(start + 9, "]]>");
        if (!end) return Fail(kOpenCData, start);
        m_at = start + 9;
        if (!Run(end)) return false;
        m_at = end + 3;
        return true;
    }

    // --- text piece by piece: references, blanks, characters above 7F ------------------------------------------------

    void BeginText() {
        m_text.Cut(0);
        m_blankPending = false;
    }

    bool EndText(CPPoolString& text) { // a pending blank is dropped
        text = String::pool::InternWide(m_text.First(), m_text.Count());
        return !text.isnull() || OutOfMemory();
    }

    // The next characters of text or value, one at least and none behind a stop: source blanks collapse, and are
    // dropped where nothing stands before or behind.
    bool Characters(Unit stop1, Unit stop2) {
        if (IsBlank(*m_at)) {
            m_blankPending = true;
            ++m_at;
            return true;
        }
        if (*m_at != '&') {
            const Unit* end = RunEnd<Script::Any>(m_at, stop1, stop2);
            return end == m_at ? OneCharacter() : Run(end);
        }
        ulong32 value;
        const bool numeric = m_end - m_at > 1 && m_at[1] == '#';
        return (numeric ? NumericReference(value) : PredefinedReference(value)) && Put(value);
    }

    // What stands before `end`, as it stands.
    bool Run(const Unit* end) {
        constexpr std::ptrdiff_t kShort = 8;
        if (end - m_at > kShort) {
            if (!PutBlank()) return false;
            const auto units = static_cast<std::size_t>(end - m_at);
            if (!m_text.Reserve(units)) return OutOfMemory(); // there are no more units than bytes
            wchar_t* const first = m_text.First() + m_text.Count();
            wchar_t* last = first;
            if (Decode(units, last) && AreWhole(first, last)) {
                m_text.Cut(m_text.Count() + static_cast<std::size_t>(last - first));
                m_at = end;
                return true;
            }
        }
        while (m_at != end)
            if (!OneCharacter()) return false;
        return true;
    }

    // Decodes so many units at m_at to `out` and moves it. False when they do not end where a character does.
    bool Decode(std::size_t units, wchar_t*& out) const {
        if constexpr (kUtf8) {
            const Extent extent = MeasureUtf8(m_at, units);
            return extent.source == units && ConvertUtf8(m_at, extent, out);
        } else {
            std::memcpy(out, m_at, units * sizeof(Unit));
            out += units;
            return true;
        }
    }

    // Whether none of the units is a zero or half of a pair.
    static bool AreWhole(const wchar_t* at, const wchar_t* end) {
        using namespace Simd;
        constexpr std::ptrdiff_t kUnits = kBlock / sizeof(*at);
        for (; end - at >= kUnits; at += kUnits) {
            const Block block = Load(at);
            const Block halves = Equal16(And(block, All16(0xF800)), All16(0xD800));
            if (Mask(Or(halves, Equal16(block, All16(0)))) != 0) return false;
        }
        while (at != end && *at != 0 && !IsSurrogate(*at)) ++at;
        return at == end;
    }

    // Units of the good character at `at`; 0 for a bad one, which only UTF-16 can have after validation.
    std::size_t CharacterUnits(const Unit* at) const {
        const auto left = static_cast<std::size_t>(m_end - at);
        if constexpr (kUtf8)
            return Utf8Sequence(at, left);
        else
            return Utf16Sequence(at, left);
    }

    // One source character as it stands.
    bool OneCharacter() {
        const std::size_t units = CharacterUnits(m_at);
        if (units == 0) return Fail(kIllegalCharacter, m_at);
        if constexpr (kUtf8) {
            ulong32 value;
            const Unit* at = m_at;
            StepUtf8(value, at);
            // A zero would end the text in the pool; encoded surrogates and what lies too high have no wide form.
            if (value == 0 || (value >= 0xD800 && value <= 0xDFFF) || value >= kFirstUninternable)
                return Fail(kIllegalCharacter, m_at);
            m_at = at;
            return Put(value);
        } else {
            // Copied unit by unit, pairs included, so that nothing is lost.
            if (!PutBlank()) return false;
            for (std::size_t i = 0; i < units; ++i)
                if (!m_text.Push(m_at[i])) return OutOfMemory();
            m_at += units;
            return true;
        }
    }

    bool PutBlank() {
        const bool put = m_blankPending && !m_text.Empty();
        m_blankPending = false;
        return !put || m_text.Push(L' ') || OutOfMemory();
    }

    bool Put(ulong32 value) {
        if (!PutBlank() || !m_text.Reserve(2)) return OutOfMemory();
        wchar_t units[2], *end = units;
        EncodeUtf16(end, value);
        for (const wchar_t* unit = units; unit < end; ++unit) m_text.Push(*unit);
        return true;
    }

    // --- state ------------------------------------------------------------------------------------------------------

    // Room for an Attribute that is moved bitwise.
    struct RawAttribute {
        alignas(Attribute) unsigned char bytes[sizeof(Attribute)];
    };

    const Unit* m_begin;
    const Unit* m_end;
    const Unit* m_at;
    ErrorCode m_code = kSuccess;
    const Unit* m_errorAt = nullptr;

    CPXMLObject m_root;
    Stack<OpenElement> m_open;
    Scratch<tagCPOMEMHEADER*> m_children; // finished elements whose parents are open, the outermost parent's first
    Scratch<RawAttribute> m_attributes;   // of the tag that is being read
    Scratch<std::uint32_t> m_seen;        // hash table over m_attributes, used above kFewAttributes
    Scratch<wchar_t> m_text;              // the text that is being put together
    bool m_blankPending = false;
    StringCache<Unit, 256> m_names;
    Values m_values;
    typename Values::Later m_later; // a text on its way into the pool, with a place
    Place m_laterPlace;
};

template <class Unit> ParseResult ParseText(const Unit* text, std::size_t units) noexcept {
    return Parser<Unit>(text, units).Run();
}

} // namespace

ParseResult Parse(const unsigned char* text, std::size_t units) noexcept { return ParseText(text, units); }
ParseResult Parse(const wchar_t* text, std::size_t units) noexcept { return ParseText(text, units); }

} // namespace TAVO::XML::detail
