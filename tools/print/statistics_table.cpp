#include "print/statistics_table.h"

#include <sys/ioctl.h>
#include <unistd.h>

#include <algorithm>
#include <array>
#include <cctype>
#include <cmath>
#include <cstdlib>

#include "base/json.h"
#include "base/text_encoding.h"

namespace kelo::tool {
namespace {

constexpr size_t kShortestBar = 10; // even where it makes the lines too long
constexpr size_t kWidestName = 40;

std::string Padding(size_t width, const std::string &text) {
    const size_t count = CharacterCount(text);
    return std::string(width > count ? width - count : 0, ' ');
}

} // namespace

std::string Bar(double value, double largest, size_t width, bool inUnicode) {
    if (value <= 0 || largest <= 0)
        return "";
    const double length = value / largest * static_cast<double>(width);
    if (!inUnicode)
        return std::string(std::max<size_t>(1, static_cast<size_t>(std::lround(length))), '#');
    constexpr std::array<const char *, 8> kBlocks = {"", "▏", "▎", "▍", "▌", "▋", "▊", "▉"};
    const size_t eighths = std::max<size_t>(1, static_cast<size_t>(std::lround(length * 8)));
    std::string bar;
    for (size_t i = 0; i < eighths / 8; ++i)
        bar += "█";
    return bar + kBlocks[eighths % 8];
}

size_t OutputWidth() {
    constexpr int kDefaultWidth = 80;
    winsize size{};
    int width = ioctl(STDOUT_FILENO, TIOCGWINSZ, &size) == 0 ? size.ws_col : 0;
    if (const char *columns = std::getenv("COLUMNS"); width == 0 && columns != nullptr)
        width = std::atoi(columns);
    return static_cast<size_t>(width > 0 ? width : kDefaultWidth);
}

std::string StatisticsTable::Write(OutputFormat format, bool hasHeader) const {
    if (IsCsv(format))
        return Csv(hasHeader, CsvStyleOf(format));
    if (format != OutputFormat::Text)
        return Json(format == OutputFormat::Json);
    std::string out;
    for (const std::string &line : TextLines(hasHeader))
        out += line + "\n";
    return out;
}

std::string StatisticsTable::Plot(size_t bar, size_t width, bool hasHeader, bool inUnicode) const {
    const std::vector<std::string> lines = TextLines(hasHeader);
    size_t taken = 0;
    for (const std::string &line : lines)
        taken = std::max(taken, CharacterCount(line) + 2);
    const size_t room = std::max(kShortestBar, width > taken ? width - taken : 0);
    double largest = 0;
    for (const std::vector<std::string> &cells : rows_)
        largest = std::max(largest, std::strtod(cells[bar].c_str(), nullptr));
    std::string out;
    const size_t heading = lines.size() - rows_.size();
    for (size_t i = 0; i < lines.size(); ++i) {
        std::string line = lines[i];
        if (i >= heading) {
            const double value = std::strtod(rows_[i - heading][bar].c_str(), nullptr);
            line += Padding(taken, line) + Bar(value, largest, room, inUnicode);
        }
        line.resize(line.find_last_not_of(' ') + 1);
        out += line + "\n";
    }
    return out;
}

// Numbers are aligned to the right, all else to the left.
std::vector<std::string> StatisticsTable::TextLines(bool hasHeader) const {
    std::vector<std::vector<std::string>> table;
    if (hasHeader && !rows_.empty()) {
        std::vector<std::string> &heading = table.emplace_back();
        for (const StatisticsColumn &column : columns_) {
            std::string name = column.name;
            for (char &letter : name)
                letter = static_cast<char>(std::toupper(static_cast<unsigned char>(letter)));
            heading.push_back(name);
        }
    }
    for (const std::vector<std::string> &cells : rows_) {
        std::vector<std::string> &line = table.emplace_back();
        for (const std::string &cell : cells)
            line.push_back(EscapeForTerminal(cell));
    }
    std::vector<size_t> widths(columns_.size());
    for (const std::vector<std::string> &cells : table) {
        for (size_t i = 0; i < cells.size(); ++i)
            widths[i] = std::max(widths[i], std::min(CharacterCount(cells[i]), kWidestName));
    }
    std::vector<std::string> lines;
    for (const std::vector<std::string> &cells : table) {
        std::string &line = lines.emplace_back();
        for (size_t i = 0; i < cells.size(); ++i) {
            const bool isLast = i + 1 == cells.size();
            if (columns_[i].isNumber)
                line += Padding(widths[i], cells[i]) + cells[i];
            else
                line += cells[i] + (isLast ? "" : Padding(widths[i], cells[i]));
            line += isLast ? "" : "  ";
        }
    }
    return lines;
}

std::string StatisticsTable::Json(bool isArray) const {
    std::string out;
    JsonLines lines(isArray);
    lines.Begin(out);
    for (const std::vector<std::string> &cells : rows_) {
        lines.BeginItem(out);
        JsonObject object(out);
        for (size_t i = 0; i < cells.size(); ++i) {
            if (columns_[i].isNumber)
                object.AddJson(columns_[i].name, cells[i]);
            else
                object.Add(columns_[i].name, cells[i]);
        }
        object.End();
        lines.EndItem(out);
    }
    lines.End(out);
    return out;
}

std::string StatisticsTable::Csv(bool hasHeader, CsvStyle style) const {
    std::string out;
    std::vector<std::string> names;
    for (const StatisticsColumn &column : columns_)
        names.emplace_back(column.name);
    if (hasHeader)
        AppendCsvLine(out, names, style);
    for (const std::vector<std::string> &cells : rows_)
        AppendCsvLine(out, cells, style);
    return out;
}

} // namespace kelo::tool
