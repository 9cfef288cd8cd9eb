#pragma once

// The kind of an error of SQLite or of the system, and how a record of a failure is filled. All of it is in
// this header, so that programs and platforms of one's own can report their own failures in the same way. It
// needs the header of SQLite.
//
// Threads: nothing here keeps state; a record belongs to one thread.

#include <sqlite3.h>

#include <algorithm>
#include <cerrno>
#include <cstring>
#include <string_view>

#include "keloplatform/failure.h"

// The kind of an errno; an unknown one, and 0, is KELO_FAILURE_OTHER.
inline KELOFAILUREKIND KELOFailureKindOfErrno(int error) {
    switch (error) {
    case EAGAIN:
    case EBUSY:
    case ETIMEDOUT:
        return KELO_FAILURE_BUSY;
    case ENOENT:
    case ENOTDIR:
        return KELO_FAILURE_MISSING;
    case EACCES:
    case EPERM:
    case EROFS:
        return KELO_FAILURE_PERMISSION;
    case ENOSPC:
    case EDQUOT:
        return KELO_FAILURE_FULL;
    case EINVAL:
    case EEXIST:
    case EISDIR:
    case ENAMETOOLONG:
    case ELOOP:
        return KELO_FAILURE_ARGUMENT;
    case ENOMEM:
        return KELO_FAILURE_MEMORY;
    case EIO:
        return KELO_FAILURE_IO;
    case EBADMSG:
    case EFBIG:
        return KELO_FAILURE_FORMAT;
    default:
        return KELO_FAILURE_OTHER;
    }
}

// The kind of an error of SQLite, given by its code (extended or not), its text and the errno that
// sqlite3_system_errno() gives (0 if there is none).
inline KELOFAILUREKIND KELOFailureKindOfSqlite(int code, const char *text, int systemError) {
    const auto begins = [text](const char *start) {
        return text != nullptr && std::strncmp(text, start, std::strlen(start)) == 0;
    };
    switch (code & 0xFF) {
    case SQLITE_BUSY:
    case SQLITE_LOCKED:
    case SQLITE_PROTOCOL:
        return KELO_FAILURE_BUSY;
    case SQLITE_PERM:
    case SQLITE_READONLY:
    case SQLITE_AUTH:
        return KELO_FAILURE_PERMISSION;
    case SQLITE_CORRUPT:
    case SQLITE_NOTADB:
        return KELO_FAILURE_DAMAGED;
    case SQLITE_FULL:
        return KELO_FAILURE_FULL;
    case SQLITE_NOMEM:
        return KELO_FAILURE_MEMORY;
    case SQLITE_IOERR:
        return code == SQLITE_IOERR_NOMEM                                 ? KELO_FAILURE_MEMORY
               : KELOFailureKindOfErrno(systemError) == KELO_FAILURE_FULL ? KELO_FAILURE_FULL
                                                                          : KELO_FAILURE_IO;
    case SQLITE_CANTOPEN:
        return KELOFailureKindOfErrno(systemError);
    case SQLITE_MISUSE:
    case SQLITE_TOOBIG:
    case SQLITE_RANGE:
        return KELO_FAILURE_ARGUMENT;
    case SQLITE_ERROR:
        return begins("no such table")         ? KELO_FAILURE_TABLE
               : begins("no such column")      ? KELO_FAILURE_COLUMN
               : begins("regular expression ") ? KELO_FAILURE_REGEX
                                               : KELO_FAILURE_STATEMENT;
    case SQLITE_CONSTRAINT:
    case SQLITE_MISMATCH:
    case SQLITE_SCHEMA:
        return KELO_FAILURE_STATEMENT;
    default:
        return KELO_FAILURE_OTHER;
    }
}

// Fills a field of a record: cut to its size and to the first NUL byte, and terminated.
template <size_t size>
void KELOFailureFieldSet(char (&field)[size], std::string_view text) {
    const size_t length = std::min(text.substr(0, size - 1).find('\0'), std::min(text.size(), size - 1));
    std::memcpy(field, text.data(), length);
    field[length] = '\0';
}

// Makes `failure` the next failure of a thread.
inline void KELOFailureSet(KELOFAILURE &failure, KELOFAILUREKIND kind, std::string_view path,
                           std::string_view tried, std::string_view text) {
    failure.kind = kind;
    failure.sqliteCode = 0;
    failure.systemCode = 0;
    ++failure.count;
    KELOFailureFieldSet(failure.path, path);
    KELOFailureFieldSet(failure.tried, tried);
    KELOFailureFieldSet(failure.text, text);
}

// The same for an errno, with the system's text.
inline void KELOFailureSetErrno(KELOFAILURE &failure, int error, std::string_view path,
                                std::string_view tried) {
    const char *text = strerrordesc_np(error); // allocates nothing
    KELOFailureSet(failure, KELOFailureKindOfErrno(error), path, tried,
                   error != 0 && text != nullptr ? text : "failed without a reason");
    failure.systemCode = error;
}

// The same for the last error of a connection of SQLite.
inline void KELOFailureSetSqlite(KELOFAILURE &failure, sqlite3 *db, std::string_view path,
                                 std::string_view tried) {
    const int code = sqlite3_extended_errcode(db);
    const int error = code == SQLITE_OK ? 0 : sqlite3_system_errno(db);
    const char *text = code == SQLITE_OK ? "failed without a reason" : sqlite3_errmsg(db);
    KELOFailureSet(failure, KELOFailureKindOfSqlite(code, text, error), path, tried, text);
    failure.sqliteCode = code;
    failure.systemCode = error;
}
