#pragma once

// The appliance's core library: files, section files, and maps and lists of strings.
//
// Threads: functions may be called from any thread; a map or a list is used by one at a time.
//
// Nothing here throws. A failed call says so by its result and sets errno. Only a file or value that is
// refused for its content is also named in the system log (priority LOG_WARNING, with path and line),
// because errno cannot say which line it was.
//
// A section file is text of sections, each a header "[NAME]" and lines KEY="VALUE" under it; a key/value file
// has lines without headers. docs/section-files.md is the normative description.

#include <cstddef>

#include "keloplatform/export.h"

// A map from string to string. It keeps the order in which its keys were first set.
struct TORVSZHASH;

// A list of strings. Its functions own the strings and the array.
struct TORVSZLIST {
    int count;    // number of strings
    int capacity; // room in `items`
    char **items; // `count` C strings
};

extern "C" {

// Runs a program, given by its path, with up to four arguments, the first null one ending them, and waits for
// it. The command gets default signal handling, no open file of the caller's but standard error, and
// /dev/null as standard input and output. It is not affected by other children of the process, nor by waits
// and signal handlers for them. A lock that the caller holds by flock(2) is held until the command has ended,
// also if the caller is killed before that.
//
// Returns 0 when the command ran and ended with exit status 0, else -1.
KELOPLATFORM_API int TORVCExec(const char *program, const char *arg1, const char *arg2, const char *arg3,
                               const char *arg4);

// Whether something exists at `path`, symbolic links followed. False for null.
KELOPLATFORM_API bool TORVCFileExist(const char *path);

// Appends the names of all sections of the file to `*list`, in file order and each name once. A header that
// names no section ("[abc", "[]") is skipped and reported.
//
// Returns 0 (also for a file without sections), or -1: a null argument, or the file cannot be read. The list
// may then have got a part of the names.
KELOPLATFORM_API int TORVCFileEnumSection(const char *path, TORVSZLIST **list);

// Sets every key of the named section in `*hash`; other keys of the hash stay. Of two sections of one name,
// and of two lines with one key, the first counts.
//
// Returns 0, or -1 with the hash unchanged: a null argument, the file cannot be read (errno says why), no
// such section (ENOENT), or a line of the section is neither blank, comment nor KEY=VALUE (EBADMSG). When
// memory runs out the hash may have got a part.
KELOPLATFORM_API int TORVCFileGetSection(const char *path, const char *section, TORVSZHASH **hash);

// Replaces the entries of the section by those of `hash`, one line each, and gives it the name `newName`. A
// section that does not exist is appended; a missing file is created. With a null `newName` the section is
// removed, with its comments up to its last entry, and `hash` and `lineFormat` are ignored.
//
// `lineFormat` is one line that contains "%s" twice (key, then value), no other '%', and ends in its only
// line feed. An entry that would not be read back unchanged (for example with a line feed in it) is refused.
//
// All other bytes of the file stay. The file is replaced by a temporary file in the same folder that is
// synced and renamed, under a lock on the folder: a crash leaves the old or the new content, and no writer
// loses another's section. Mode and owner stay; of a symbolic link the target is replaced.
//
// Returns 0 when the change is on the disk, or -1: a bad argument or entry (EINVAL), `newName` is taken by
// another section (EEXIST), the section to remove does not exist (ENOENT), the lock was not free for 30
// seconds (ETIMEDOUT), or a system call failed. The file is then unchanged, unless it was the sync of the
// folder after the rename that failed.
KELOPLATFORM_API int TORVCFileSetSection(const char *path, const char *section, const char *newName,
                                         TORVSZHASH *hash, const char *lineFormat);

// Copies the value of the first line with this key, in any section, to `buffer`, cut to
// `size - 1` bytes and always terminated. The last argument is not used; call it with 0.
//
// Returns the length of the whole value in bytes (so a result of `size` or more means that it was cut), or -1
// with an empty text in the buffer: a bad argument, the file cannot be read, or no such key (ENOENT).
KELOPLATFORM_API int TORVCFileGetKeyValue(const char *path, const char *key, char *buffer, size_t size, int);

// Allocates an empty map with room for about `size` keys (it grows as needed), to be freed with
// TORVCSzHashFree. Null when out of memory.
KELOPLATFORM_API TORVSZHASH *TORVCSzHashAlloc(size_t size);

// Copies key and value into `*hash` in place of an earlier value. Returns 0, or -1 with the map unchanged: a
// null argument, or out of memory.
KELOPLATFORM_API int TORVCSzHashSetValue(TORVSZHASH **hash, const char *key, const char *value);

// The value of `key`, or null when there is none or an argument is null. It belongs to the map and is valid
// until the key is set again or the map freed.
KELOPLATFORM_API const char *TORVCSzHashGetValue(const TORVSZHASH *hash, const char *key);

// Calls `handle` with every key and value, in the order in which the keys were first set, until it returns
// non-zero. It may not change the map. Returns the last result of `handle`; 0 for a map that is empty or
// null. An addition of this platform.
KELOPLATFORM_API int TORVCSzHashWalk(const TORVSZHASH *hash,
                                     int (*handle)(const char *key, const char *value, void *context),
                                     void *context);

// Frees a map; null is accepted.
KELOPLATFORM_API void TORVCSzHashFree(TORVSZHASH *hash);

// Allocates an empty list with room for `size` strings, to be freed with TORVCSzListFree. Null when out of
// memory.
KELOPLATFORM_API TORVSZLIST *TORVCSzListAlloc(size_t size);

// Frees a list and its strings; null is accepted.
KELOPLATFORM_API void TORVCSzListFree(TORVSZLIST *list);

// Formats as printf does into a new string, to be freed with TORVCStrPut. Null when out of memory or for a
// null format.
KELOPLATFORM_API char *TORVCStrGet(const char *format, ...) __attribute__((format(printf, 1, 2)));

// Frees a string that TORVCStrGet gave; null is accepted.
KELOPLATFORM_API void TORVCStrPut(char *text);

} // extern "C"
