// Any keyword gives SQL that SQLite prepares and runs, and that means the same wherever it stands. One that
// is written from known terms finds what a naive matcher finds.

#include <fuzzer/FuzzedDataProvider.h>
#include <unistd.h>

#include <algorithm>
#include <vector>

#include "keloplatform/gensqlregexp.h"
#include "keloplatform/kelodb.h"
#include "quiet.h"

namespace {

using Texts = std::vector<std::string>;

const Texts kTexts = {"",
                      "disk full",
                      "Wörter 100%_[x]",
                      "a\xff"
                      "b\xe9",
                      "it's /a\\b\"c*?",
                      "a",
                      "aab",
                      "ABab",
                      "[^a]b",
                      "a-b",
                      "b/a",
                      "%a_",
                      "\"b'"};
constexpr char kAlphabet[] = "aabbAB%_[]^'\"\\-/*?\1\1\2"; // the last two are any text and any character

std::string Quoted(const std::string &text) {
    std::string quoted;
    for (const char byte : text)
        quoted += byte == '\'' ? "''" : std::string(1, byte);
    return "'" + quoted + "'";
}

// A connection to the texts and a NULL in a file that has no name any more.
DBConnect_tag *Rows() {
    const char *folder = std::getenv("TMPDIR");
    std::string path = std::string(folder != nullptr && folder[0] == '/' ? folder : "/tmp") + "/fuzz-XXXXXX";
    const int file = mkstemp(path.data());
    DBConnect_tag *rows = file >= 0 ? KELODBConnect(nullptr, nullptr, nullptr, path.c_str()) : nullptr;
    close(file);
    std::string insert = "INSERT INTO logs VALUES (NULL)";
    for (const std::string &text : kTexts)
        insert += ", (" + Quoted(text) + ")";
    for (const std::string &sql : {std::string("CREATE TABLE logs(msg TEXT)"), insert}) {
        if (KELODBExecute(rows, sql.c_str(), nullptr) != 0)
            Fail("no table", path);
    }
    unlink(path.c_str());
    return rows;
}

// The texts of the rows that meet the condition; NULL as "NULL".
Texts Where(const std::string &condition) {
    static DBConnect_tag *const rows = Rows();
    const std::string sql = "SELECT ifnull(msg, 'NULL') AS msg FROM logs WHERE " + condition;
    DBResult_tag *result = nullptr;
    if (KELODBExecute(rows, sql.c_str(), &result) != 0)
        Fail(KELODBErrorGet(rows), sql);
    Texts found;
    for (unsigned int row = 0; KELODBFetchRow(result, &row) >= 0;)
        found.push_back(KELODBFetchField(result, row, "msg"));
    KELODBFreeResult(result);
    return found;
}

std::string LowerAscii(std::string text) {
    for (char &byte : text)
        byte = byte >= 'A' && byte <= 'Z' ? static_cast<char>(byte + ('a' - 'A')) : byte;
    return text;
}

// By the definition, character by character: whether the pattern matches the whole text.
bool Matches(std::string_view text, std::string_view pattern) {
    if (pattern.empty())
        return text.empty();
    if (pattern[0] == '\1')
        return Matches(text, pattern.substr(1)) || (!text.empty() && Matches(text.substr(1), pattern));
    const bool isAny = pattern[0] == '\2';
    if (text.empty() || (!isAny && pattern[0] != text[0]))
        return false;
    size_t length = 1;
    while (isAny && length < text.size() && (static_cast<unsigned char>(text[length]) & 0xC0) == 0x80)
        ++length;
    return Matches(text.substr(length), pattern.substr(1));
}

bool Contains(const std::string &text, const std::string &term) {
    return Matches(LowerAscii(term) == term ? LowerAscii(text) : text, "\1" + term + "\1");
}

std::string Written(const std::string &term) {
    std::string text;
    for (const char character : term) {
        if (std::string_view("*?\"\\-/").find(character) != std::string_view::npos)
            text += '\\';
        text += character == '\1' ? '*' : character == '\2' ? '?' : character;
    }
    return text;
}

void CompareWithNaiveMatcher(FuzzedDataProvider &input) {
    Texts expected = kTexts;
    std::string keyword;
    for (int terms = input.ConsumeIntegralInRange(1, 3); terms > 0; --terms) {
        std::string term;
        for (int length = input.ConsumeIntegralInRange(1, 4); length > 0; --length)
            term += kAlphabet[input.ConsumeIntegralInRange<size_t>(0, sizeof kAlphabet - 2)];
        const bool isExcluded = input.ConsumeBool();
        keyword += (isExcluded ? " -" : " ") + Written(term);
        std::erase_if(expected, [&](const std::string &text) { return Contains(text, term) == isExcluded; });
    }
    if (Where("msg IS NOT NULL AND (" + GenSQLRegexp(keyword, "msg") + ")") != expected)
        Fail("another result than the naive matcher's", keyword);
}

} // namespace

extern "C" int LLVMFuzzerTestOneInput(const uint8_t *data, size_t size) {
    const std::string keyword(reinterpret_cast<const char *>(data), size);
    const std::string sql = GenSQLRegexp(keyword, "msg");
    const Texts found = Where("(" + sql + ")");
    if (Where("1 AND " + sql + " AND 1") != found || Where("0 OR " + sql) != found)
        Fail("no operand", sql);
    if (GenSQLRegexp(" " + keyword, "msg") != sql)
        Fail("a leading blank changes it", sql);
    FuzzedDataProvider input(data, size);
    CompareWithNaiveMatcher(input);
    return 0;
}
