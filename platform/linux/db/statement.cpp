#include "db/statement.h"

#include <strings.h>

#include <cstring>

#include "db/raise_error.h"

namespace kelo::platform {
namespace {

// The first byte of `text` that is neither blank nor part of a comment nor a semicolon.
const char *SkipBlanks(const char *text) {
    for (;;) {
        text += std::strspn(text, " \t\n\f\r;");
        if (text[0] == '-' && text[1] == '-') {
            text += std::strcspn(text, "\n");
        } else if (text[0] == '/' && text[1] == '*') {
            const char *end = std::strstr(text + 2, "*/");
            text = end != nullptr ? end + 2 : text + std::strlen(text);
        } else {
            return text;
        }
    }
}

// A pragma may act while it is prepared, so the text after it is checked first.
bool IsPragmaWithCompany(const char *statement) {
    constexpr std::string_view kPragma = "PRAGMA";
    if (strncasecmp(statement, kPragma.data(), kPragma.size()) != 0)
        return false;
    return *SkipBlanks(statement + std::strcspn(statement, ";")) != '\0';
}

bool RefuseCompany(sqlite3 *db) {
    RaiseError(db, SQLITE_ERROR, "one statement per call");
    return false;
}

} // namespace

bool PrepareSingle(sqlite3 *db, const char *sql, SingleStatement &single) {
    const char *start = SkipBlanks(sql);
    if (*start == '\0')
        return true;
    if (IsPragmaWithCompany(start))
        return RefuseCompany(db);
    sqlite3_stmt *prepared = nullptr;
    const char *tail = start;
    if (sqlite3_prepare_v2(db, start, -1, &prepared, &tail) != SQLITE_OK)
        return false;
    single.prepared.reset(prepared);
    if (*SkipBlanks(tail) != '\0') {
        single.prepared.reset();
        return RefuseCompany(db);
    }
    single.text = std::string_view(start, static_cast<size_t>(tail - start));
    if (single.text.ends_with(';'))
        single.text.remove_suffix(1);
    return true;
}

} // namespace kelo::platform
