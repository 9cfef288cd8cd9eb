#pragma once

// Small text and file utilities.
//
// Threads: they keep no state and may be called from any thread; a stream is read by one at a time.

#include <cstdint>
#include <cstdio>
#include <list>
#include <string>

#include "kelosyslog/export.h"

// Splits `text` at every character of `delimiters` and keeps empty pieces: n delimiters give n + 1 pieces. An
// empty text gives none. (LogParser::Tokenize has other rules.)
KELOSYSLOG_API std::list<std::string> Tokenize(const std::string &text, const std::string &delimiters);

// Plain decimal digits of `number`, whatever the global locale.
KELOSYSLOG_API std::string ullNumberToString(unsigned long long number);

// Copies the C string `source` to `destination` with a backslash before every double quote and backslash, and
// nothing else changed (control bytes are copied). `size` is the size of `destination` in bytes.
//
// Returns 0, or -1: a null pointer, both pointers equal (nothing is written), or too small a destination
// (what fitted stays in it, without a terminator).
KELOSYSLOG_API int32_t EncodeJson(const char *source, char *destination, int32_t size);

// Reads the lines of a stream from the last to the first, up to `max` lines.
//
// Allocates an array of `max` pointers, stores it in `*lines`, and stores the lines as C strings from index
// `count` (0 or more) upward, counting `count` up. The caller frees every string and the array with free(),
// also after a failure if the array was allocated. A line ends before its first NUL byte. A file that ends
// with a line feed gives an empty first entry, and an empty file gives one empty line.
//
// Returns 0; or -1 with a message in the system log when the stream cannot seek or memory runs out before the
// first line, and silently when the stream cannot be read or memory runs out for a line. The lines that
// `count` counts are valid in any case. The stream's position afterwards is unspecified.
KELOSYSLOG_API int32_t readfileinreverse(FILE *stream, char ***lines, int32_t &count, int32_t max);
