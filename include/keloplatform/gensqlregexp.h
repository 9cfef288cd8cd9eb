#pragma once

// The keyword language of log searches, turned into SQL.
//
//   keyword                 finds the texts that hold
//   ----------------------  ----------------------------------------------------------------------------
//   disk full               both "disk" and "full", anywhere, in any order
//   "disk full"             exactly this phrase; nothing in it is special but \" and \\ (see below)
//   error OR warning        one of them, or both; OR is in capitals
//   sda fail OR error       "sda" and one of the other two: OR binds tighter than the blank
//   -debug                  no "debug"; the same before a phrase or a regex: -"read only"  -/dbg[0-9]/
//   conn*closed             "conn", later "closed"; * stands for any text, also none
//   sd?1                    "sd", any one character, "1"
//   /fail(ed|ure)$/         what the regular expression finds (RE2 syntax)
//   *                       any text: a keyword that filters nothing
//
// Letter case. A term without capital letters ignores case: error finds "Error". A term with one is exact:
// Error does not find "error". Every term decides for itself. Only the ASCII letters A-Z count and are
// folded; other letters are always exact. In a regex the letters of escapes (\S, \pL) and flags do not count,
// RE2 folds all letters, and (?i) or (?-i) in front decides by hand.
//
// What is special only where it stands:
//
//   OR        joins when it stands between two terms. Else it is a word; "OR" in quotes always is.
//   -         excludes in front of a term. Within a word, or alone, it is text: read-only
//   "         opens a phrase in front of a term. Within a word it is text: user="root"
//   /         opens a regex when the next / ends the term. So /var/log is text, and /var/ is a regex: write
//             "/var/" for the text. Within a regex, \/ is a slash.
//   \         takes the next one literally: before * ? " \ - / in a word, and before " and \ in a phrase.
//             Before anything else it is text: c:\windows
//
// Every text is a keyword. A phrase that is not closed ends with the keyword. A NUL byte counts as a blank.
// Bytes that are not UTF-8 are read as Latin-1.

#include <string>

#include "keloplatform/export.h"

// Returns an SQL boolean expression that is true for the rows whose text column `column` (an identifier, used
// as it stands) matches the keyword `pattern`.
//
//   GenSQLRegexp("*", "msg")                   msg GLOB '**'
//   GenSQLRegexp("error", "msg")               msg LIKE '%error%'
//   GenSQLRegexp("Error 100%", "msg")          (msg GLOB '*Error*' AND msg GLOB '*100%*')
//   GenSQLRegexp("sda OR sdb -debug", "msg")   ((msg LIKE '%sda%' OR msg LIKE '%sdb%') AND
//                                              ifnull(NOT msg LIKE '%debug%', 1))
//   GenSQLRegexp("/fail(ed|ure)/", "msg")      regexpi('fail(ed|ure)', msg)
//
// A keyword that filters nothing (only * and blanks, or nothing at all) gives exactly the first text, which
// the statement builders know. Any other text may change from release to release; what holds is that
//
// - SQLite prepares and runs it, whatever the keyword: it is UTF-8 without NUL bytes, and within SQLite's
//   default limits on depth, pattern length and arguments for keywords of some megabytes;
// - it may stand in parentheses or as an operand of AND, OR and NOT;
// - a row whose column is NULL is never matched by an inclusion and always kept by an exclusion;
// - regular expressions call regexp() and regexpi(), which every connection of KELODBConnect has and the
//   sqlite3 shell has too; everything else is plain SQL.
//
// A regex that RE2 refuses is reported to the system log (LOG_ERR, once per regex, with RE2's reason), and
// the term that holds it matches no row, even where it excludes: a slip never makes a deletion larger.
//
// Rows: a text ends at its first NUL byte. Bytes of a row that are not UTF-8 are Latin-1 to a regex;
// elsewhere only * and ? stand for them.
//
// Thread-safe. Throws nothing but std::bad_alloc and std::length_error.
KELOPLATFORM_API std::string GenSQLRegexp(std::string pattern, std::string column);
