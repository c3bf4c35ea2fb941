#pragma once
// Whole files, and the standard streams under the name "-".

#include <cstdio>
#include <functional>
#include <string>
#include <string_view>

namespace tool {

// Exit codes of the tool.
enum Exit : int { kFine = 0, kBadInput = 1, kUsage = 2, kFileTrouble = 3 };

// Reads all of a file, or of standard input. False with the reason in `trouble`.
bool ReadAll(const std::string& name, std::string& bytes, std::string& trouble);

// The same piece by piece, for files of any size.
bool ReadPieces(const std::string& name, std::string& trouble, const std::function<void(std::string_view)>& take);

// Writes a file, in the place of one that exists, or to standard output. False with the reason in `trouble`.
bool WriteAll(const std::string& name, std::string_view bytes, std::string& trouble);

// Adds to standard output. What cannot be written shows in Finish.
void Print(std::string_view text);
// Adds a line to standard error, after what was printed: "tavo: " and the text.
void Complain(std::string_view text);
// Ends the output: kFileTrouble when some of it was lost, else the given code.
int Finish(int code);

} // namespace tool
