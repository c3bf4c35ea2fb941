#pragma once
// A library that is loaded at run time: the one thing in which this host differs between systems.

class CLibrary {
public:
    CLibrary() = default;
    CLibrary(const CLibrary&) = delete;
    CLibrary& operator=(const CLibrary&) = delete;

    bool Load(const wchar_t* path);
    /// The exported function; null when there is none.
    void* Find(const char* name) const;
    /// The code is gone afterwards. Not called, it stays until the process ends.
    void Unload();

    /// What file names of libraries end in, as a pattern.
    static const wchar_t* Pattern();

private:
    void* m_library = nullptr;
};
