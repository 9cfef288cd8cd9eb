#include "db/raise_error.h"

namespace kelo::platform {
namespace {

constexpr char kErrorType[] = "kelo-error";

struct Error {
    int code;
    const char *message;
};

// For any caller but RaiseError the function gives NULL, because SQL cannot create such a pointer.
void Raise(sqlite3_context *context, int, sqlite3_value **arguments) {
    const auto *error = static_cast<const Error *>(sqlite3_value_pointer(arguments[0], kErrorType));
    if (error == nullptr)
        return;
    sqlite3_result_error(context, error->message, -1);
    sqlite3_result_error_code(context, error->code);
}

} // namespace

// SQLite has no function that sets its error, but a statement that fails sets it. Without memory for that
// statement, the error is that there is no memory.
void RaiseError(sqlite3 *db, int code, const char *message) {
    Error error{code, message};
    sqlite3_stmt *statement = nullptr;
    if (sqlite3_create_function_v2(db, "kelo_raise", 1, SQLITE_UTF8 | SQLITE_DIRECTONLY, nullptr, Raise,
                                   nullptr, nullptr, nullptr) != SQLITE_OK ||
        sqlite3_prepare_v2(db, "SELECT kelo_raise(?1)", -1, &statement, nullptr) != SQLITE_OK)
        return;
    if (sqlite3_bind_pointer(statement, 1, &error, kErrorType, nullptr) == SQLITE_OK)
        sqlite3_step(statement);
    sqlite3_finalize(statement); // repeats the error of the step
}

} // namespace kelo::platform
