#include "store/record_table.h"

#include <sqlite3.h>

#include <algorithm>
#include <array>
#include <iterator>
#include <new>
#include <string>
#include <string_view>

namespace kelo {
namespace {

constexpr char kDeclaration[] = "CREATE TABLE kelo_records(host, ip, fac, prio, llevel, tag, utcsec, "
                                "tzoffset, ldate, ltime, prog, msg)";
enum Column { kHost, kIp, kFac, kPrio, kLlevel, kTag, kUtcsec, kTzoffset, kLdate, kLtime, kProg, kMsg };

// The severities' words, measured once and not for every row.
std::string_view WordOf(_SYSLOG_DB_PRIORITY_tag severity) {
    static const auto words = [] {
        std::array<std::string_view, std::size(g_MappingSyslogPrior)> all;
        std::copy(std::begin(g_MappingSyslogPrior), std::end(g_MappingSyslogPrior), all.begin());
        return all;
    }();
    return words[static_cast<size_t>(severity)];
}

struct Table : sqlite3_vtab {
    const std::vector<const _SYSLOG_LOG_DATA_tag *> *logs;
};

struct Cursor : sqlite3_vtab_cursor {
    const std::vector<const _SYSLOG_LOG_DATA_tag *> *logs;
    size_t row;
};

// SQLite's copy of the text would be a copy for nothing: the record stays until the statement has ended.
void Return(sqlite3_context *result, std::string_view text) {
    sqlite3_result_text64(result, text.data(), text.size(), SQLITE_STATIC, SQLITE_UTF8);
}

const std::string *TextOf(const _SYSLOG_LOG_DATA_tag &log, int column) {
    switch (column) {
    case kHost:
        return &log.host;
    case kIp:
        return &log.ip;
    case kFac:
        return &log.fac;
    case kTag:
        return &log.tag;
    case kTzoffset:
        return &log.tzoffset;
    case kLdate:
        return &log.ldate;
    case kLtime:
        return &log.ltime;
    case kProg:
        return &log.prog;
    default:
        return &log.msg;
    }
}

} // namespace

// What SQLite calls. None of it throws.
struct RecordTable::Functions {
    static int Connect(sqlite3 *db, void *table, int, const char *const *, sqlite3_vtab **result, char **) {
        if (const int status = sqlite3_declare_vtab(db, kDeclaration); status != SQLITE_OK)
            return status;
        auto *created = new (std::nothrow) Table{};
        if (created == nullptr)
            return SQLITE_NOMEM;
        created->logs = &static_cast<const RecordTable *>(table)->logs_;
        *result = created;
        return SQLITE_OK;
    }
    static int Disconnect(sqlite3_vtab *table) {
        delete static_cast<Table *>(table);
        return SQLITE_OK;
    }
    static int Plan(sqlite3_vtab *, sqlite3_index_info *) { return SQLITE_OK; } // there is one: all rows
    static int Open(sqlite3_vtab *table, sqlite3_vtab_cursor **result) {
        auto *cursor = new (std::nothrow) Cursor{};
        if (cursor == nullptr)
            return SQLITE_NOMEM;
        cursor->logs = static_cast<Table *>(table)->logs;
        *result = cursor;
        return SQLITE_OK;
    }
    static int Close(sqlite3_vtab_cursor *cursor) {
        delete static_cast<Cursor *>(cursor);
        return SQLITE_OK;
    }
    static int Rewind(sqlite3_vtab_cursor *cursor, int, const char *, int, sqlite3_value **) {
        static_cast<Cursor *>(cursor)->row = 0;
        return SQLITE_OK;
    }
    static int Next(sqlite3_vtab_cursor *cursor) {
        ++static_cast<Cursor *>(cursor)->row;
        return SQLITE_OK;
    }
    static int IsAtEnd(sqlite3_vtab_cursor *cursor) {
        const auto *position = static_cast<const Cursor *>(cursor);
        return position->row >= position->logs->size() ? 1 : 0;
    }
    // Both severity columns have the word.
    static int Value(sqlite3_vtab_cursor *cursor, sqlite3_context *result, int column) {
        const auto *position = static_cast<const Cursor *>(cursor);
        const _SYSLOG_LOG_DATA_tag &log = *(*position->logs)[position->row];
        if (column == kPrio || column == kLlevel)
            Return(result, WordOf(log.prio));
        else if (column == kUtcsec)
            sqlite3_result_int64(result, log.utcsec);
        else
            Return(result, *TextOf(log, column));
        return SQLITE_OK;
    }
    static int RowId(sqlite3_vtab_cursor *cursor, sqlite3_int64 *id) {
        *id = static_cast<sqlite3_int64>(static_cast<const Cursor *>(cursor)->row);
        return SQLITE_OK;
    }
    static sqlite3_module Module() {
        sqlite3_module module{};
        module.xConnect = Connect;
        module.xBestIndex = Plan;
        module.xDisconnect = Disconnect;
        module.xOpen = Open;
        module.xClose = Close;
        module.xFilter = Rewind;
        module.xNext = Next;
        module.xEof = IsAtEnd;
        module.xColumn = Value;
        module.xRowid = RowId;
        return module;
    }
};

// Without xCreate the table exists in every connection that has the module, and in no file.
int RecordTable::Register(sqlite3 *db) {
    static const sqlite3_module module = Functions::Module();
    return sqlite3_create_module(db, "kelo_records", &module, this);
}

} // namespace kelo
