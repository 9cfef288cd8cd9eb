#include "cli/message.h"

#include <cstdio>
#include <cstring>

#include "base/errors.h"
#include "base/json.h"
#include "base/text_encoding.h"
#include "cli/exit_status.h"
#include "keloplatform/failure.h"
#include "kelosyslog/failure.h"

namespace kelo::tool {
namespace {

MessageForm form = MessageForm::kText;

const char *CodeOf(KELOFAILUREKIND kind) {
    switch (kind) {
    case KELO_FAILURE_BUSY:
        return "busy";
    case KELO_FAILURE_MISSING:
        return "missing";
    case KELO_FAILURE_PERMISSION:
        return "permission";
    case KELO_FAILURE_DAMAGED:
        return "damaged";
    case KELO_FAILURE_FULL:
        return "full";
    case KELO_FAILURE_TABLE:
        return "table";
    case KELO_FAILURE_COLUMN:
        return "column";
    default:
        return "database";
    }
}

// The failure of the file that the text names says more.
const char *CodeOf(int status, const std::string &text) {
    if (status == kExitUsage)
        return "usage";
    if (status != kExitDatabase)
        return "system";
    for (const KELOFAILURE *failure : {SyslogFailureGet(), KELOFailureGet()}) {
        if (*failure->path != '\0' && text.find(failure->path) != std::string::npos)
            return CodeOf(failure->kind);
    }
    return "database";
}

// The option at the front of the text; "" without one.
std::string OptionOf(const std::string &text) {
    constexpr const char *kLetters = "abcdefghijklmnopqrstuvwxyz0123456789-";
    return text.starts_with("-") ? text.substr(0, text.find_first_not_of(kLetters)) : "";
}

void Print(const std::string &line) {
    std::fprintf(stderr, "%s\n", line.c_str());
}

} // namespace

void SetMessageForm(MessageForm wanted) {
    form = wanted;
}

MessageForm ParseMessageForm(const std::string &name) {
    if (name != "text" && name != "json")
        throw UsageError("--errors: '" + name + "' is neither text nor json");
    return name == "json" ? MessageForm::kJson : MessageForm::kText;
}

void PrintMessage(const std::string &text) {
    if (form == MessageForm::kText)
        return Print("kelosyslog: " + EscapeForTerminal(text));
    std::string line;
    JsonObject object(line);
    object.Add("code", "note");
    object.Add("text", text);
    object.End();
    Print(line);
}

void PrintError(int status, const std::string &text) {
    if (form == MessageForm::kText)
        return PrintMessage(text);
    std::string line;
    JsonObject object(line);
    object.Add("code", CodeOf(status, text));
    object.AddJson("status", std::to_string(status));
    if (const std::string option = status == kExitUsage ? OptionOf(text) : ""; !option.empty())
        object.Add("option", option);
    object.Add("text", text);
    object.End();
    Print(line);
}

} // namespace kelo::tool
