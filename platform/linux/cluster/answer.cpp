#include "cluster/answer.h"

#include "cluster/cluster_error.h"

namespace kelo::platform {
namespace {

char Unescaped(char byte) {
    switch (byte) {
    case 'b':
        return '\b';
    case 'f':
        return '\f';
    case 'n':
        return '\n';
    case 'r':
        return '\r';
    case 't':
        return '\t';
    case '0':
        return '\0';
    default: // a quotation mark, a backslash
        return byte;
    }
}

void Unescape(std::string_view field, std::string &value) {
    value.clear();
    for (size_t at = field.find('\\'); at != std::string_view::npos; at = field.find('\\')) {
        value.append(field.substr(0, at));
        if (at + 1 < field.size())
            value += Unescaped(field[at + 1]);
        field.remove_prefix(std::min(at + 2, field.size()));
    }
    value.append(field);
}

[[noreturn]] void RefuseLine(std::string_view line) {
    throw ClusterError(KELO_FAILURE_IO,
                       "the answer is not whole, it has '" + std::string(line.substr(0, 200)) + "'");
}

} // namespace

void AnswerReader::TakeLine(std::string_view line) {
    std::string_view rest = line;
    for (size_t column = 0; column < values_.size(); ++column) {
        const size_t tab = rest.find('\t');
        const bool isLast = column + 1 == values_.size();
        if (isLast != (tab == std::string_view::npos))
            RefuseLine(line);
        Unescape(rest.substr(0, tab), values_[column]);
        rest.remove_prefix(isLast ? rest.size() : tab + 1);
    }
    if (values_.back() != kRowEnd)
        RefuseLine(line);
    rows_.TakeRow({values_.data(), values_.size() - 1});
}

void AnswerReader::Take(std::string_view part) {
    for (size_t end = part.find('\n'); end != std::string_view::npos; end = part.find('\n')) {
        if (begun_.empty()) {
            TakeLine(part.substr(0, end));
        } else {
            begun_.append(part.substr(0, end));
            TakeLine(begun_);
            begun_.clear();
        }
        part.remove_prefix(end + 1);
    }
    begun_.append(part);
}

void AnswerReader::Finish() const {
    if (!begun_.empty())
        RefuseLine(begun_);
}

} // namespace kelo::platform
