#pragma once
// What the pages of this folder share. Each shows the rules of one area of docs/contract.md, and the ways round them.

namespace contract {

// A rule, in a sentence, and whether it holds.
void Is(const char* rule, bool holds);
// The way round it, and whether that does what a textbook would.
void Instead(const char* way, bool works);

void Core();
void Memory();
void Text();
void PooledStrings();
void BytesAsText();
void Xml();
void Fractions();
void Timecode();
void Files();
void Urls();
void Threads();
void Maintenance();
void Components();

} // namespace contract
