// Texts that the printed reports share, as functions without state.
#ifndef ZANBASE_MEMORY_REPORT_TEXT_H
#define ZANBASE_MEMORY_REPORT_TEXT_H

#include <cstddef>
#include <cstdio>
#include <functional>
#include <string>

// A byte count as text. Up to 1024 bytes it is a plain number; a larger one has two decimals and the largest
// unit that it exceeds, of K, M and G (powers of 1024): "1024", "1.00K", "1024.00K", "1.00M".
std::string SizeText(std::size_t bytes);

// The same for a count of K, which always has a unit: "0.00K", "1024.00K", "1.00M".
std::string KiloSizeText(double kilobytes);

// `text` filled with blanks to `width`, on the left if `rightAlign`, else on the right. Nothing is ever cut.
std::string FitField(const std::string& text, unsigned int width, bool rightAlign);

// `path` from the "src/" of its first "/src/"; unchanged if there is none.
std::string ShortSourcePath(const std::string& path);

// Receives a report part by part: its heading, each row or section, its end.
using ReportWriter = std::function<void(const std::string& part)>;

// Writes `text` in one call. A failure of the stream is not reported.
void WriteText(std::FILE* stream, const std::string& text);

#endif
