#pragma once

// The keyword language of log searches, translated to SQL.
//
//   keyword                 finds the texts that contain
//   ----------------------  ----------------------------------------------------------------------------
//   disk full               both "disk" and "full", anywhere, in any order
//   "disk full"             exactly this phrase; only \" and \\ are special in it (see below)
//   error OR warning        one of them, or both; OR is in capitals
//   sda fail OR error       "sda" and one of the other two: OR binds tighter than the blank
//   -debug                  no "debug"; the same before a phrase or a regex: -"read only"  -/dbg[0-9]/
//   conn*closed             "conn", later "closed"; * is any text, including none
//   sd?1                    "sd", any one character, "1"
//   /fail(ed|ure)$/         a match of the regular expression (RE2 syntax)
//   *                       any text: a keyword that does not filter
//
// Letter case. A term without capital letters ignores case: error finds "Error". A term with one is exact:
// Error does not find "error". Each term is decided separately. Only the ASCII letters A-Z count and are
// folded; other letters are always exact. In a regex the letters of escapes (\S, \pL) and flags do not count,
// RE2 folds all letters, and (?i) or (?-i) at the start overrides the rule.
//
// Special only in some positions:
//
//   OR        an operator between two terms. Elsewhere it is a word, and in quotes always.
//   -         excludes at the start of a term. Within a word, or alone, it is text: read-only
//   "         opens a phrase at the start of a term. Within a word it is text: user="root"
//   /         opens a regex when the next / ends the term. So /var/log is text, and /var/ is a regex: write
//             "/var/" for the text. Within a regex, \/ is a slash.
//   \         makes the next character literal: before * ? " \ - / in a word, and before " and \ in a
//             phrase. Before anything else it is text: c:\windows
//
// Every text is a valid keyword. An unclosed phrase ends with the keyword. A NUL byte counts as a blank.
// Bytes that are not UTF-8 are read as Latin-1.
//
// Threads: the function may be called from any thread.

#include <string>

#include "keloplatform/export.h"

// Returns an SQL boolean expression that is true for the rows whose text column `column` (an identifier, used
// unchanged) matches the keyword `pattern`.
//
//   GenSQLRegexp("*", "msg")                   msg GLOB '**'
//   GenSQLRegexp("error", "msg")               msg LIKE '%error%'
//   GenSQLRegexp("Error 100%", "msg")          (msg GLOB '*Error*' AND msg GLOB '*100%*')
//   GenSQLRegexp("sda OR sdb -debug", "msg")   ((msg LIKE '%sda%' OR msg LIKE '%sdb%') AND
//                                              ifnull(NOT msg LIKE '%debug%', 1))
//   GenSQLRegexp("/fail(ed|ure)/", "msg")      regexpi('fail(ed|ure)', msg)
//
// A keyword that does not filter (only * and blanks, or nothing at all) gives exactly the first text, which
// the statement builders recognise. Any other text may change from release to release. Guaranteed is that
//
// - SQLite prepares and runs it, whatever the keyword: it is UTF-8 without NUL bytes, and within SQLite's
//   default limits on depth, pattern length and arguments for keywords of a megabyte;
// - it can be used in parentheses or as an operand of AND, OR and NOT;
// - a row whose column is NULL is never matched by an inclusion and always kept by an exclusion;
// - regular expressions call regexp() and regexpi(), which every connection of KELODBConnect has and the
//   sqlite3 shell has too; everything else is plain SQL.
//
// A regex that RE2 refuses is reported to the system log (LOG_ERR, once per regex, with RE2's reason), and
// its term matches no row, even when it excludes: a mistake never makes a deletion larger.
// KELOKeywordError (errors.h) returns that report as a value.
//
// Rows: a text ends at its first NUL byte. Bytes of a row that are not UTF-8 are Latin-1 to a regex;
// elsewhere only * and ? match them.
//
// Throws nothing but std::bad_alloc and std::length_error.
KELOPLATFORM_API std::string GenSQLRegexp(std::string pattern, std::string column);
