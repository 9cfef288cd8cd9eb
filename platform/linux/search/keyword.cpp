#include "search/keyword.h"

#include <algorithm>
#include <cstddef>

namespace kelo::platform {
namespace {

constexpr std::string_view kBlanks = " \t\n\v\f\r";
// The characters that a backslash makes literal in a word and in a phrase. Before any other it is text, so
// that paths like c:\windows need no escapes.
constexpr std::string_view kEscapedInWord = "*?\"\\-/";
constexpr std::string_view kEscapedInPhrase = "\"\\";

bool IsBlank(char byte) {
    return kBlanks.find(byte) != std::string_view::npos;
}

bool IsEscape(std::string_view text, size_t at, std::string_view escaped) {
    return text[at] == '\\' && at + 1 < text.size() && escaped.find(text[at + 1]) != std::string_view::npos;
}

void AppendLiteral(std::vector<TermPiece> &pieces, char byte) {
    if (pieces.empty() || pieces.back().kind != TermPiece::Kind::kLiteral)
        pieces.push_back({TermPiece::Kind::kLiteral, {}});
    pieces.back().literal += byte;
}

// A term is found anywhere in a text, so kAnyText at its ends has no effect.
void AppendAnyText(std::vector<TermPiece> &pieces) {
    if (!pieces.empty() && pieces.back().kind != TermPiece::Kind::kAnyText)
        pieces.push_back({TermPiece::Kind::kAnyText, {}});
}

std::vector<TermPiece> WordPieces(std::string_view word) {
    std::vector<TermPiece> pieces;
    for (size_t at = 0; at < word.size(); ++at) {
        if (IsEscape(word, at, kEscapedInWord))
            AppendLiteral(pieces, word[++at]);
        else if (word[at] == '*')
            AppendAnyText(pieces);
        else if (word[at] == '?')
            pieces.push_back({TermPiece::Kind::kAnyCharacter, {}});
        else
            AppendLiteral(pieces, word[at]);
    }
    if (!pieces.empty() && pieces.back().kind == TermPiece::Kind::kAnyText)
        pieces.pop_back();
    return pieces;
}

// Takes terms from the front of a keyword.
class Reader {
public:
    explicit Reader(std::string_view keyword) : rest_(keyword) { SkipBlanks(); }

    bool AtEnd() const { return rest_.empty(); }
    Term TakeTerm();
    // Takes an OR before another term. Any other OR is an ordinary term.
    bool TakeOr();

private:
    void SkipBlanks() { rest_.remove_prefix(std::min(rest_.find_first_not_of(kBlanks), rest_.size())); }
    bool TakeRegex(std::string &regex);
    std::vector<TermPiece> TakePhrase();
    std::vector<TermPiece> TakeWord();

    std::string_view rest_;
};

Term Reader::TakeTerm() {
    Term term;
    if (rest_.size() > 1 && rest_[0] == '-' && !IsBlank(rest_[1])) {
        term.excluded = true;
        rest_.remove_prefix(1);
    }
    if (!TakeRegex(term.regex)) {
        // A quotation mark at the very end cannot open a phrase.
        const bool isPhrase = rest_[0] == '"' && rest_.size() > 1;
        term.pieces = isPhrase ? TakePhrase() : TakeWord();
    }
    SkipBlanks();
    return term;
}

bool Reader::TakeOr() {
    if (!rest_.starts_with("OR") || rest_.size() < 3 || !IsBlank(rest_[2]))
        return false;
    const size_t next = rest_.find_first_not_of(kBlanks, 2);
    if (next == std::string_view::npos)
        return false;
    rest_.remove_prefix(next);
    return true;
}

// The first slash that is not escaped must end the term: otherwise this is a path, not a regex.
bool Reader::TakeRegex(std::string &regex) {
    if (rest_[0] != '/')
        return false;
    size_t end = 1;
    while (end < rest_.size() && rest_[end] != '/')
        end += rest_[end] == '\\' ? 2 : 1;
    if (end >= rest_.size() || end == 1 || (end + 1 < rest_.size() && !IsBlank(rest_[end + 1])))
        return false;
    for (size_t at = 1; at < end; ++at) {
        if (rest_[at] == '\\' && rest_[++at] != '/')
            regex += '\\';
        regex += rest_[at];
    }
    rest_.remove_prefix(end + 1);
    return true;
}

std::vector<TermPiece> Reader::TakePhrase() {
    std::vector<TermPiece> pieces;
    size_t at = 1;
    for (; at < rest_.size() && rest_[at] != '"'; ++at) {
        if (IsEscape(rest_, at, kEscapedInPhrase))
            ++at;
        AppendLiteral(pieces, rest_[at]);
    }
    rest_.remove_prefix(std::min(at + 1, rest_.size()));
    return pieces;
}

std::vector<TermPiece> Reader::TakeWord() {
    const std::string_view word = rest_.substr(0, rest_.find_first_of(kBlanks));
    rest_.remove_prefix(word.size());
    return WordPieces(word);
}

} // namespace

std::vector<Alternatives> ParseKeyword(std::string_view keyword) {
    std::vector<Alternatives> groups;
    for (Reader reader(keyword); !reader.AtEnd();) {
        Alternatives &group = groups.emplace_back();
        do {
            group.push_back(reader.TakeTerm());
        } while (reader.TakeOr());
    }
    return groups;
}

} // namespace kelo::platform
