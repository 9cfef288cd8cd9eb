#include "cluster/pattern.h"

#include <algorithm>
#include <vector>

#include "cluster/cluster_error.h"

namespace kelo::platform {
namespace {

// RE2 refuses a deeper nesting than 1000.
constexpr std::ptrdiff_t kMaxGroups = 500;

// A part of a pattern: literal text, or a wildcard.
struct Part {
    enum class Kind { kText, kAnyText, kAnyCharacter } kind;
    std::string text;
};
using Parts = std::vector<Part>;

void AddText(Parts &parts, char byte) {
    if (parts.empty() || parts.back().kind != Part::Kind::kText)
        parts.push_back({Part::Kind::kText, {}});
    parts.back().text += byte;
}

void AddAnyText(Parts &parts) {
    if (parts.empty() || parts.back().kind != Part::Kind::kAnyText)
        parts.push_back({Part::Kind::kAnyText, {}});
}

Parts GlobParts(std::string_view pattern) {
    Parts parts;
    for (size_t at = 0; at < pattern.size(); ++at) {
        if (pattern[at] == '*') {
            AddAnyText(parts);
        } else if (pattern[at] == '?') {
            parts.push_back({Part::Kind::kAnyCharacter, {}});
        } else if (pattern[at] == '[') {
            const std::string_view set = pattern.substr(at, 3);
            if (set.size() < 3 || set[2] != ']' || set[1] == '^' ||
                (static_cast<unsigned char>(set[1]) & 0x80) != 0)
                throw ClusterError(KELO_FAILURE_STATEMENT,
                                   "a cluster knows no GLOB sets of several characters: '" +
                                       std::string(pattern.substr(at, 20)) + "'");
            AddText(parts, set[1]);
            at += 2;
        } else {
            AddText(parts, pattern[at]);
        }
    }
    return parts;
}

Parts LikeParts(std::string_view pattern, bool hasEscape) {
    Parts parts;
    for (size_t at = 0; at < pattern.size(); ++at) {
        const bool isEscape = hasEscape && pattern[at] == '\\';
        if (isEscape && at + 1 == pattern.size())
            throw ClusterError(KELO_FAILURE_STATEMENT, "a LIKE pattern ends with its escape character");
        if (isEscape)
            AddText(parts, pattern[++at]);
        else if (pattern[at] == '%')
            AddAnyText(parts);
        else if (pattern[at] == '_')
            parts.push_back({Part::Kind::kAnyCharacter, {}});
        else
            AddText(parts, pattern[at]);
    }
    return parts;
}

bool IsLetter(char byte) {
    return (byte >= 'a' && byte <= 'z') || (byte >= 'A' && byte <= 'Z');
}

// A regex that matches the text itself. A letter in either case becomes a set: the flag would also fold
// letters outside ASCII.
void AppendRegexOf(const std::string &text, bool ignoreCase, std::string &regex) {
    constexpr std::string_view kSpecial = R"(\^$.|?*+()[]{})";
    for (const char byte : text) {
        if (ignoreCase && IsLetter(byte))
            regex.append({'[', static_cast<char>(byte | 0x20), static_cast<char>(byte & ~0x20), ']'});
        else if (kSpecial.find(byte) != std::string_view::npos)
            regex.append({'\\', byte});
        else
            regex += byte;
    }
}

std::string RegexOf(const Parts &parts, bool ignoreCase) {
    std::string regex = "(?s:^";
    for (const Part &part : parts) {
        if (part.kind == Part::Kind::kAnyText)
            regex += "\\C*"; // bytes, as a text need not be UTF-8
        else if (part.kind == Part::Kind::kAnyCharacter)
            regex += '.';
        else
            AppendRegexOf(part.text, ignoreCase, regex);
    }
    return regex + "$)";
}

bool HasLetters(const std::string &text) {
    return std::any_of(text.begin(), text.end(), IsLetter);
}

std::string PartsCondition(const std::string &column, const Parts &parts, bool ignoreCase) {
    const auto isAny = [&](size_t at) { return parts[at].kind == Part::Kind::kAnyText; };
    if (parts.size() == 1 && isAny(0))
        return "1";
    const bool isText = parts.empty() || (parts.size() == 1 && parts[0].kind == Part::Kind::kText);
    const bool foldsCase = ignoreCase && std::any_of(parts.begin(), parts.end(),
                                                     [](const Part &part) { return HasLetters(part.text); });
    if (isText && !foldsCase)
        return column + " = " + EngineText(parts.empty() ? "" : parts[0].text);
    if (parts.size() == 3 && isAny(0) && isAny(2) && parts[1].kind == Part::Kind::kText)
        return (foldsCase ? "positionCaseInsensitive(" : "position(") + column + ", " +
               EngineText(parts[1].text) + ") > 0";
    return "match(" + column + ", " + EngineText(RegexOf(parts, foldsCase)) + ")";
}

} // namespace

std::string EngineText(std::string_view text) {
    std::string literal = "'";
    for (const char byte : text) {
        if (byte == '\'' || byte == '\\')
            literal += '\\';
        literal += byte;
    }
    return literal + "'";
}

std::string GlobCondition(const std::string &column, std::string_view pattern) {
    return PartsCondition(column, GlobParts(pattern), false);
}

std::string LikeCondition(const std::string &column, std::string_view pattern, bool hasEscape) {
    return PartsCondition(column, LikeParts(pattern, hasEscape), true);
}

// The engine looks into a regex for a text that every match has, outside of groups only, and does not know
// the flags. So the regex is put into more groups than it can close itself by a parenthesis that the engine
// misunderstands, such as in a set.
std::string RegexCondition(const std::string &column, std::string_view regex, bool ignoreCase) {
    const std::ptrdiff_t groups = std::count(regex.begin(), regex.end(), ')');
    if (groups > kMaxGroups)
        throw ClusterError(KELO_FAILURE_STATEMENT, "a regular expression with more than " +
                                                       std::to_string(kMaxGroups) + " parentheses");
    std::string wrapped = ignoreCase ? "(?i-s:" : "(?-s:";
    for (std::ptrdiff_t i = 0; i < groups; ++i)
        wrapped += "(?:";
    wrapped.append(regex).append(static_cast<size_t>(groups) + 1, ')');
    return "match(" + column + ", " + EngineText(wrapped) + ")";
}

} // namespace kelo::platform
