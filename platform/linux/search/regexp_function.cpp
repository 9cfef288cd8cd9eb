#include "search/regexp_function.h"

#include <sqlite3.h>

#include <exception>
#include <string_view>

#include "common/utf8.h"

namespace kelo::platform {
namespace {

constexpr int64_t kMaxMemory = 4 << 20; // of one regex, its matching included
constexpr int kFlags = SQLITE_UTF8 | SQLITE_DETERMINISTIC | SQLITE_DIRECTONLY;

bool IsFound(const RE2 &regex, std::string_view text) {
    const auto search = [&regex](std::string_view utf8) {
        return regex.Match({utf8.data(), utf8.size()}, 0, utf8.size(), RE2::UNANCHORED, nullptr, 0);
    };
    return IsUtf8(text) ? search(text) : search(ToUtf8(text));
}

void FailForRegex(sqlite3_context *context, const std::string &regex, const std::string &reason) {
    const std::string message = "regular expression /" + regex + "/: " + reason;
    sqlite3_result_error(context, message.c_str(), -1);
}

void Match(sqlite3_context *context, sqlite3_value *regexValue, sqlite3_value *textValue, bool ignoreCase) {
    const auto *regexText = reinterpret_cast<const char *>(sqlite3_value_text(regexValue));
    const auto *text = reinterpret_cast<const char *>(sqlite3_value_text(textValue));
    if (regexText == nullptr || text == nullptr)
        return sqlite3_result_error_nomem(context);

    if (const auto *cached = static_cast<RE2 *>(sqlite3_get_auxdata(context, 0)))
        return sqlite3_result_int(context, IsFound(*cached, text));

    std::unique_ptr<RE2> compiled = CompileRegex(regexText, ignoreCase);
    if (!compiled->ok())
        return FailForRegex(context, regexText, compiled->error());
    sqlite3_result_int(context, IsFound(*compiled, text));
    // SQLite may destroy the object immediately.
    sqlite3_set_auxdata(context, 0, compiled.release(),
                        [](void *regex) { delete static_cast<RE2 *>(regex); });
}

template <bool IgnoreCase>
void MatchFunction(sqlite3_context *context, int, sqlite3_value **arguments) noexcept {
    if (sqlite3_value_type(arguments[0]) == SQLITE_NULL || sqlite3_value_type(arguments[1]) == SQLITE_NULL)
        return sqlite3_result_null(context);
    try {
        Match(context, arguments[0], arguments[1], IgnoreCase);
    } catch (const std::exception &) {
        sqlite3_result_error_nomem(context);
    }
}

bool Register(sqlite3 *db, const char *name, void (*function)(sqlite3_context *, int, sqlite3_value **)) {
    return sqlite3_create_function_v2(db, name, 2, kFlags, nullptr, function, nullptr, nullptr, nullptr) ==
           SQLITE_OK;
}

} // namespace

re2::RE2::Options RegexOptions(bool ignoreCase) {
    RE2::Options options;
    options.set_case_sensitive(!ignoreCase);
    options.set_log_errors(false);
    options.set_max_mem(kMaxMemory);
    return options;
}

std::unique_ptr<re2::RE2> CompileRegex(const std::string &regex, bool ignoreCase) {
    return std::make_unique<RE2>(regex, RegexOptions(ignoreCase));
}

bool RegisterSearchFunctions(sqlite3 *db) {
    return Register(db, "regexp", MatchFunction<false>) && Register(db, "regexpi", MatchFunction<true>);
}

} // namespace kelo::platform
