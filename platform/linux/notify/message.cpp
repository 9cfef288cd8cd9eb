#include "notify/message.h"

#include <optional>

#include "files/refusal.h"
#include "files/section_cache.h"
#include "text/plain_text.h"

namespace kelo::platform {
namespace {

constexpr size_t kMaxTitleBytes = 250;
constexpr std::string_view kPlaceholderCharacters = "ABCDEFGHIJKLMNOPQRSTUVWXYZ0123456789_";

struct Template {
    std::string title;
    std::string body;
    std::string jsonEscaped;
};

// The language becomes part of a path.
bool IsLanguage(const std::string &language) {
    return !language.empty() &&
           language.find_first_not_of("abcdefghijklmnopqrstuvwxyz"
                                      "ABCDEFGHIJKLMNOPQRSTUVWXYZ0123456789_-") == std::string::npos;
}

std::optional<Template> LoadTemplate(const std::string &path, const std::string &tag) {
    const std::shared_ptr<const SectionText> text = LoadSectionText(path);
    const SectionText::Section *section = text != nullptr ? text->Find(tag) : nullptr;
    if (section == nullptr)
        return std::nullopt;
    std::vector<SectionEntry> entries;
    if (const size_t line = text->Entries(*section, entries); line > 0) {
        ReportRefusal(path, line, "neither KEY=\"VALUE\" nor a comment");
        return std::nullopt;
    }
    Template found;
    for (const SectionEntry &entry : entries) {
        if (entry.key == "title")
            found.title = entry.value;
        else if (entry.key == "body")
            found.body = entry.value;
        else if (entry.key == "json_escaped")
            found.jsonEscaped = entry.value;
    }
    if (found.title.empty() || found.body.empty())
        return std::nullopt;
    return found;
}

// The text before its quotes and backslashes were escaped.
std::string Unescape(std::string_view text) {
    std::string plain;
    for (size_t i = 0; i < text.size(); ++i) {
        const bool escape =
            text[i] == '\\' && i + 1 < text.size() && (text[i + 1] == '"' || text[i + 1] == '\\');
        plain += text[escape ? ++i : i];
    }
    return plain;
}

// The placeholder at the start of `text` (which begins with a percent sign); empty if there is none.
std::string_view PlaceholderAt(std::string_view text) {
    const size_t end = text.find_first_not_of(kPlaceholderCharacters, 1);
    if (end == std::string_view::npos || end == 1 || text[end] != '%')
        return {};
    return text.substr(0, end + 1);
}

Message PlainMessage(const std::string &tag, const TORVSZHASH &values) {
    Message message{"Notification " + tag, "The log server sent the notification " + tag + ".\n"};
    for (const TORVSZHASH::Entry &entry : values.entries) {
        if (entry.key != kClassKey)
            message.body += entry.key + ": " + entry.value + "\n";
    }
    return message;
}

} // namespace

std::string FillTemplate(std::string_view text, const TORVSZHASH &values, std::string_view jsonEscaped) {
    std::string filled;
    while (!text.empty()) {
        const std::string_view placeholder = text.front() == '%' ? PlaceholderAt(text) : std::string_view();
        if (!placeholder.empty()) {
            const TORVSZHASH::Entry *entry = values.Find(placeholder);
            const bool escaped = jsonEscaped.find(placeholder) != std::string_view::npos;
            if (entry == nullptr)
                filled += '-';
            else
                filled += escaped ? Unescape(entry->value) : entry->value;
            text.remove_prefix(placeholder.size());
        } else if (text.starts_with("\\n") || text.starts_with("\\\\")) {
            filled += text[1] == 'n' ? '\n' : '\\';
            text.remove_prefix(2);
        } else {
            filled += text.front();
            text.remove_prefix(1);
        }
    }
    return filled;
}

Message RenderMessage(const std::string &tag, const std::string &textsDir, const std::string &language,
                      const TORVSZHASH &values) {
    std::optional<Template> text;
    if (IsLanguage(language))
        text = LoadTemplate(textsDir + "/" + language + "/notify", tag);
    if (!text)
        text = LoadTemplate(textsDir + "/enu/notify", tag);
    Message message = PlainMessage(tag, values);
    if (text) {
        message.title = FillTemplate(text->title, values, text->jsonEscaped);
        message.body = FillTemplate(text->body, values, text->jsonEscaped);
    }
    message.title = ToOneLine(message.title, kMaxTitleBytes);
    message.body = ToPlainText(message.body);
    if (!message.body.ends_with('\n'))
        message.body += '\n';
    return message;
}

} // namespace kelo::platform
