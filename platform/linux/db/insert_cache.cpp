#include "db/insert_cache.h"

#include <strings.h>

#include <charconv>
#include <cstring>

namespace kelo::platform {
namespace {

constexpr size_t kMaxTextLength = 4096; // writing longer ones takes longer than compiling them
constexpr const char *kBlanks = " \t\n\r\f";
// Characters allowed in the head of a statement: no quotes, no comments, no second statement.
constexpr const char *kHeadBytes =
    "abcdefghijklmnopqrstuvwxyzABCDEFGHIJKLMNOPQRSTUVWXYZ0123456789_,() \t\n\r\f";

void PassBlanks(const char *&text) {
    text += std::strspn(text, kBlanks);
}

} // namespace

std::optional<bool> InsertCache::Run(sqlite3 *db, const char *sql) {
    if (!Read(sql))
        return std::nullopt;
    if (form_ != knownForm_) {
        prepared_.reset();
        knownForm_.swap(form_);
        return std::nullopt;
    }
    if (prepared_ == nullptr) {
        sqlite3_stmt *statement = nullptr;
        if (sqlite3_prepare_v3(db, knownForm_.c_str(), -1, SQLITE_PREPARE_PERSISTENT, &statement, nullptr) !=
            SQLITE_OK)
            return false;
        prepared_.reset(statement);
    }
    return RunPrepared();
}

// Splits a text into its form and its literals; false for any other kind of text.
bool InsertCache::Read(const char *sql) {
    form_.clear();
    literalCount_ = 0;
    if (strncasecmp(sql, "INSERT ", 7) != 0 || strnlen(sql, kMaxTextLength) == kMaxTextLength)
        return false;
    const char *text = sql;
    if (!ReadHead(text))
        return false;
    do {
        PassBlanks(text);
        if (!ReadLiteral(text))
            return false;
        PassBlanks(text);
        form_ += *text;
    } while (*text++ == ',');
    if (text[-1] != ')')
        return false;
    PassBlanks(text);
    text += *text == ';';
    PassBlanks(text);
    return *text == '\0';
}

// Everything up to the bracket before the literals.
bool InsertCache::ReadHead(const char *&text) {
    const size_t headLength = std::strspn(text, kHeadBytes);
    const std::string_view head(text, headLength);
    constexpr std::string_view kValues = " VALUES";
    const size_t values = head.find(kValues);
    if (values == std::string_view::npos)
        return false;
    const size_t bracket = head.find_first_not_of(kBlanks, values + kValues.size());
    if (bracket == std::string_view::npos || head[bracket] != '(')
        return false;
    form_.assign(head, 0, bracket + 1);
    text += bracket + 1;
    return strcasestr(form_.c_str(), "SELECT") == nullptr; // it has more values than one row
}

bool InsertCache::ReadLiteral(const char *&text) {
    if (strncasecmp(text, "NULL", 4) == 0) {
        form_ += "NULL";
        text += 4;
        return true;
    }
    form_ += '?';
    if (*text != '\'')
        return ReadNumber(text);
    ReadText(text);
    return text != nullptr;
}

InsertCache::Literal &InsertCache::NextLiteral() {
    if (literalCount_ == literals_.size())
        literals_.emplace_back();
    return literals_[literalCount_++];
}

// A text between single quotes; an unterminated text gives null.
void InsertCache::ReadText(const char *&text) {
    Literal &literal = NextLiteral();
    if (!std::holds_alternative<std::string>(literal))
        literal.emplace<std::string>();
    auto &value = std::get<std::string>(literal);
    value.clear();
    for (++text; const char *quote = std::strchr(text, '\''); ++text) {
        value.append(text, quote);
        text = quote + 1;
        if (*text != '\'')
            return;
        value += '\'';
    }
    text = nullptr;
}

// A whole number that SQLite reads as a whole number too.
bool InsertCache::ReadNumber(const char *&text) {
    constexpr size_t kSafeDigits = 18;
    const char *digits = text + (*text == '-');
    const size_t count = std::strspn(digits, "0123456789");
    const char next = digits[count];
    if (count == 0 || count > kSafeDigits ||
        (next != ',' && next != ')' && std::strchr(kBlanks, next) == nullptr))
        return false;
    sqlite3_int64 number = 0;
    text = std::from_chars(text, digits + count, number).ptr;
    NextLiteral() = number;
    return true;
}

bool InsertCache::RunPrepared() {
    sqlite3_stmt *statement = prepared_.get();
    for (size_t i = 0; i < literalCount_; ++i) {
        const int parameter = static_cast<int>(i) + 1;
        const auto *text = std::get_if<std::string>(&literals_[i]);
        const int status =
            text != nullptr ? sqlite3_bind_text(statement, parameter, text->data(),
                                                static_cast<int>(text->size()), SQLITE_STATIC)
                            : sqlite3_bind_int64(statement, parameter, std::get<sqlite3_int64>(literals_[i]));
        if (status != SQLITE_OK)
            return false;
    }
    const bool isDone = sqlite3_step(statement) == SQLITE_DONE;
    return sqlite3_reset(statement) == SQLITE_OK && isDone;
}

} // namespace kelo::platform
