#pragma once
// Where an element tree is written to: sinks that encode text into a buffer and flush it to a file or to memory.

#include "transcoding.h"

#include <TAVO/files.h>
#include <TAVO/xml.h>

namespace TAVO::XML {

// A sink. The first operation that answers false ends the writing.
class _IXMLOut {
public:
    virtual bool Write(const wchar_t* text, std::size_t count) = 0; // all of `count` units
    virtual void Indent() = 0;                                      // one level more
    virtual std::size_t Outdent() = 0;                              // one level less, if there is one; the new level
    virtual bool EndLine() = 0;                                     // CR, LF if lines are wanted; always true
    virtual void SetFailed() = 0;                                   // what was written so far is void
    virtual ~_IXMLOut() = default;
    virtual bool Flush() = 0; // hands the buffered bytes to the target
};

// How much of the work is done.
class _IProgress {
public:
    virtual double GetDone() const = 0; // 0 to 1

protected:
    ~_IProgress() = default;
};

// The encoding half of a sink; the target is that of the derived class.
// Flushing is the only virtual call on the writer's way: per buffer, not per text.
class _CXMLOut : public _IXMLOut {
public:
    static constexpr std::size_t kBufferSize = 16384;

    _CXMLOut() noexcept;
    _CXMLOut(const _CXMLOut&) = delete;
    _CXMLOut& operator=(const _CXMLOut&) = delete;
    ~_CXMLOut() override;

    // Starts over and writes the xml declaration. The encoding must be 1, 2 or 3.
    bool Begin(eXMLEncoding encoding, bool pretty);

    bool Write(const wchar_t* text, std::size_t count) final;
    void Indent() final { ++m_level; }
    std::size_t Outdent() final { return m_level ? --m_level : 0; }
    bool EndLine() final;
    void SetFailed() final { m_failed = true; }

    // Who knows how much of the whole text was written; null: nobody.
    void SetProgress(const _IProgress* progress) { m_progress = progress; }

    bool HasFailed() const { return m_failed; }

    // Write without the virtual call.
    bool Put(const wchar_t* text, std::size_t count) { return Put("", text, count, ""); }
    // The same for markup of the writer's own, which is ASCII.
    template <std::size_t size> bool Put(const char (&markup)[size]) { return Put(markup, nullptr, 0, ""); }
    // A text between markup, in one go where it is plain ASCII.
    template <std::size_t before, std::size_t behind>
    bool Put(const char (&prefix)[before], const wchar_t* text, std::size_t count, const char (&suffix)[behind]);
    // The same for text that may need escaping: false when it does, or when that is not known; nothing is written then.
    template <std::size_t behind> bool PutIfPlain(const wchar_t* text, std::size_t count, const char (&suffix)[behind]);

protected:
    const unsigned char* Buffered() const { return m_buffer; }
    std::size_t BufferedSize() const { return m_buffer ? kBufferSize - m_free : 0; }
    void EmptyBuffer() { m_free = kBufferSize; }
    double GetDone() const { return m_progress ? m_progress->GetDone() : 1; }

private:
    template <bool escapes, std::size_t before, std::size_t behind>
    bool Compose(const char (&prefix)[before], const wchar_t* text, std::size_t count, const char (&suffix)[behind]);
    bool EncodeMarkup(const char* markup, std::size_t count);
    unsigned char* Target() { return m_buffer + (kBufferSize - m_free); }
    bool PutIndentation();
    bool Encode(const wchar_t* text, std::size_t count);
    bool EncodeUtf8(const wchar_t* text, const wchar_t* end);
    bool EncodeUtf16(const wchar_t* text, const wchar_t* end);
    bool CopyUnits(const wchar_t* text, const wchar_t* end);
    bool PutCharacter(ulong32 character);

    const _IProgress* m_progress = nullptr;
    std::size_t m_level = 0;
    bool m_pretty = false;
    bool m_atLineStart = false; // only ever set when m_pretty is
    bool m_failed = false;
    unsigned char* m_buffer; // null: no memory
    std::size_t m_free = 0;  // bytes of the buffer
    std::uint32_t m_encoding = 0;
};

// Writes a file; one that is still open at the end is deleted.
class _CFileOut final : public _CXMLOut {
public:
    // Opens the file, created or replaced. `path` must outlive the sink.
    explicit _CFileOut(const wchar_t* path) noexcept;
    ~_CFileOut() override;

    bool IsOpen() const { return m_isOpen; }
    bool Flush() override;
    // Flushes and closes. False, with the file deleted, when this or anything before failed.
    bool Finish();

private:
    void Discard();

    Files::OS::CFile m_file;
    const wchar_t* m_path;
    bool m_isOpen;
};

// Collects the bytes in memory.
class _CMemOut final : public _CXMLOut {
public:
    bool Flush() override;
    // Appends the zero character and hands over what was collected; empty on failure.
    bool Finish(Buffers::CPPlainMemory& out);

private:
    bool Grow(std::size_t capacity);

    Buffers::CPObjectMemory m_collected; // plain memory, used as far as it is filled
};

// Writes the element and all below it. False at the first failure of the sink, or for what cannot be written.
bool WriteElement(const CPXMLObject& element, _CXMLOut& out) noexcept;

} // namespace TAVO::XML
