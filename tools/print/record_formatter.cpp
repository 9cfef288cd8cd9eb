#include "print/record_formatter.h"

#include <unistd.h>

#include <algorithm>

#include "base/errors.h"
#include "base/json.h"
#include "base/text_encoding.h"

namespace kelo::tool {
namespace {

using Log = _SYSLOG_LOG_DATA_tag;

constexpr const char *kColourEnd = "\x1b[0m";

const char *ColourOf(const Log &log) {
    if (log.prio <= SYSLOG_PRIO_ERR)
        return "\x1b[1;31m";
    switch (log.prio) {
    case SYSLOG_PRIO_WARNING:
        return "\x1b[33m";
    case SYSLOG_PRIO_NOTICE:
        return "\x1b[1m";
    case SYSLOG_PRIO_DEBUG:
        return "\x1b[90m";
    default:
        return "";
    }
}

void AppendColoured(std::string &out, const std::string &text, const char *colour) {
    out += colour;
    out += text;
    if (*colour != '\0')
        out += kColourEnd;
}

class LayoutWriter : public RecordFormatter {
protected:
    explicit LayoutWriter(RecordLayout layout) : layout_(std::move(layout)), time_(layout_.inUtc) {}

    const RecordLayout &Layout() const { return layout_; }
    // Valid until the next call.
    std::string_view Value(const RecordField &field, const Log &log,
                           std::string (TimeFormat::*form)(int64_t) const) {
        if (IsTime(field))
            return text_ = RecordTime(log, layout_.kind, time_, form);
        const std::string_view text = field.text(log, digits_);
        return layout_.maxMessage && IsMessage(field)
                   ? text.substr(0, WholeCharacters(text, *layout_.maxMessage))
                   : text;
    }
    std::string Message(const Log &log) const {
        std::string text = RecordMessage(log, layout_.kind);
        if (layout_.maxMessage)
            text.resize(WholeCharacters(text, *layout_.maxMessage));
        return text;
    }
    std::string Time(const Log &log, std::string (TimeFormat::*form)(int64_t) const) const {
        return RecordTime(log, layout_.kind, time_, form);
    }
    const char *Colour(const Log &log) const {
        return layout_.hasColour && layout_.kind != TableKind::Transfer ? ColourOf(log) : "";
    }

private:
    RecordLayout layout_;
    TimeFormat time_;
    std::string text_; // of the time
    RecordField::Digits digits_{};
};

class TextWriter final : public LayoutWriter {
public:
    explicit TextWriter(RecordLayout layout) : LayoutWriter(std::move(layout)) {
        for (const RecordField *field : Layout().fields)
            widths_.push_back(CharacterCount(field->name));
    }

    // The heading waits for the first record, so that an empty result prints nothing.
    void Add(const Log &log, std::string &out) override {
        std::vector<std::string> cells;
        for (const RecordField *field : Layout().fields)
            cells.push_back(EscapeForTerminal(Value(*field, log, &TimeFormat::Plain)));
        Widen(cells);
        if (Layout().hasHeader && !isHeaderWritten_)
            AppendHeader(out);
        isHeaderWritten_ = true;
        AppendColoured(out, Line(cells), Colour(log));
        out += '\n';
    }

private:
    void Widen(const std::vector<std::string> &cells) {
        constexpr size_t kWidest = 40; // a single long value must not push all others off the screen
        for (size_t i = 0; i < cells.size(); ++i)
            widths_[i] = std::max(widths_[i], std::min(CharacterCount(cells[i]), kWidest));
    }
    std::string Line(const std::vector<std::string> &cells) const {
        std::string line;
        for (size_t i = 0; i < cells.size(); ++i) {
            line += cells[i];
            if (i + 1 == cells.size())
                break;
            const size_t width = CharacterCount(cells[i]);
            line.append(widths_[i] > width ? widths_[i] - width : 0, ' ');
            line += "  ";
        }
        return line;
    }
    void AppendHeader(std::string &out) const {
        std::vector<std::string> names;
        for (const RecordField *field : Layout().fields) {
            names.emplace_back(field->name);
            for (char &letter : names.back())
                letter = static_cast<char>(letter - 'a' + 'A');
        }
        AppendColoured(out, Line(names), Layout().hasColour ? "\x1b[4m" : "");
        out += '\n';
    }

    std::vector<size_t> widths_;
    bool isHeaderWritten_ = false;
};

class ShortWriter final : public LayoutWriter {
public:
    explicit ShortWriter(RecordLayout layout) : LayoutWriter(std::move(layout)) {}

    void Add(const Log &log, std::string &out) override {
        out += EscapeForTerminal(Time(log, &TimeFormat::Short) + " " + log.host + " " + log.prog + ": ");
        AppendColoured(out, EscapeForTerminal(Message(log)), Colour(log));
        out += '\n';
    }
};

class JsonWriter final : public LayoutWriter {
public:
    explicit JsonWriter(RecordLayout layout)
        : LayoutWriter(std::move(layout)), lines_(Layout().format == OutputFormat::Json) {
        for (const RecordField *field : Layout().fields)
            names_.emplace_back(field->name);
    }

    void Begin(std::string &out) override { lines_.Begin(out); }
    void Add(const Log &log, std::string &out) override {
        lines_.BeginItem(out);
        JsonObject object(out);
        for (size_t i = 0; i < names_.size(); ++i) {
            const RecordField &field = *Layout().fields[i];
            const std::string_view value = Value(field, log, &TimeFormat::Iso);
            if (field.isNumber)
                object.AddJson(names_[i], value);
            else
                object.Add(names_[i], value);
            if (Layout().maxMessage && IsMessage(field)) {
                RecordField::Digits digits;
                object.AddJson("length", std::to_string(field.text(log, digits).size()));
            }
        }
        object.End();
        lines_.EndItem(out);
    }
    void End(std::string &out) override { lines_.End(out); }

private:
    JsonLines lines_;
    std::vector<JsonName> names_;
};

class CsvWriter final : public LayoutWriter {
public:
    explicit CsvWriter(RecordLayout layout)
        : LayoutWriter(std::move(layout)), style_(CsvStyleOf(Layout().format)) {}

    void Begin(std::string &out) override {
        if (!Layout().hasHeader)
            return;
        CsvLine line(out, style_);
        for (const RecordField *field : Layout().fields)
            line.Add(field->name);
        line.End();
    }
    void Add(const Log &log, std::string &out) override {
        CsvLine line(out, style_);
        for (const RecordField *field : Layout().fields)
            line.Add(Value(*field, log, &TimeFormat::Iso));
        line.End();
    }

private:
    CsvStyle style_;
};

} // namespace

CsvStyle CsvStyleOf(OutputFormat format) {
    return {isatty(STDOUT_FILENO) == 1, format == OutputFormat::Spreadsheet};
}

OutputFormat ParseOutputFormat(const std::string &name) {
    constexpr std::pair<const char *, OutputFormat> kFormats[] = {
        {"text", OutputFormat::Text}, {"short", OutputFormat::Short},
        {"json", OutputFormat::Json}, {"jsonl", OutputFormat::Jsonl},
        {"csv", OutputFormat::Csv},   {"spreadsheet", OutputFormat::Spreadsheet}};
    for (const auto &[known, format] : kFormats) {
        if (name == known)
            return format;
    }
    throw UsageError("--output: '" + name +
                     "' is no format; formats are text, short, json, jsonl, csv, spreadsheet");
}

std::unique_ptr<RecordFormatter> MakeRecordWriter(RecordLayout layout) {
    if (layout.fields.empty())
        layout.fields =
            layout.format == OutputFormat::Text ? SummaryFields(layout.kind) : AllFields(layout.kind);
    switch (layout.format) {
    case OutputFormat::Short:
        return std::make_unique<ShortWriter>(std::move(layout));
    case OutputFormat::Json:
    case OutputFormat::Jsonl:
        return std::make_unique<JsonWriter>(std::move(layout));
    case OutputFormat::Csv:
    case OutputFormat::Spreadsheet:
        return std::make_unique<CsvWriter>(std::move(layout));
    default:
        return std::make_unique<TextWriter>(std::move(layout));
    }
}

} // namespace kelo::tool
