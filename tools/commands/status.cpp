// kelosyslog status: checks the health of the log server.

#include <unistd.h>

#include "base/atomic_file.h"
#include "base/errors.h"
#include "cli/completion.h"
#include "cli/exit_status.h"
#include "cli/program.h"
#include "commands/commands.h"
#include "commands/common_options.h"
#include "print/output.h"
#include "print/record_formatter.h"
#include "print/statistics_table.h"
#include "status/server_status.h"
#include "status/status_json.h"
#include "status/status_prometheus.h"
#include "status/status_screen.h"
#include "status/watch.h"

namespace kelo::tool {
namespace {

constexpr const char *kFooter =
    "What needs attention stands first: syslog-ng that does not run or dropped messages, a receiver that "
    "died or waits, a database that is damaged, locked or was put aside, notifications that were given up "
    "or wait for long, a channel that fails, a volume with less than a tenth free.\n\n"
    "Examples:\n"
    "  kelosyslog status\n"
    "  kelosyslog status --watch 5        every 5 seconds, until q is typed\n"
    "  kelosyslog status -o json | jq .attention\n"
    "  kelosyslog status -o prometheus --to /var/lib/prometheus/node-exporter/kelosyslog.prom\n\n"
    "Exit status: 0 all is well, 1 something needs attention, 2 usage, 4 output.";

constexpr uint64_t kLongestPauseSec = 86400;
constexpr const char *kUsualPause = "2";

struct Options {
    std::string control;
    std::string format = "text";
    std::string colour = "auto";
    std::string pause;
    std::string to;
    bool mustWatch = false;
};

enum class Form { kScreen, kJson, kPrometheus };

Form ParseForm(const std::string &name) {
    if (name == "text")
        return Form::kScreen;
    if (name == "json")
        return Form::kJson;
    if (name == "prometheus")
        return Form::kPrometheus;
    throw UsageError("--output: there is no form '" + name + "' of this; forms are text, json, prometheus");
}

// What reads the file finds the whole old or new one.
void WriteTo(const std::string &path, const std::string &text) {
    AtomicFile file(path);
    file.Write(text);
    file.Commit();
}

int Run(const Options &options, const std::string &root) {
    const Form form = ParseForm(options.format);
    const bool hasColour = WantsColour(ParseColourMode(options.colour));
    const uint64_t pause = options.mustWatch ? ParseNumber("--watch", options.pause, 1, kLongestPauseSec) : 0;
    StatusOptions question;
    question.root = root;
    question.control = options.control;
    int result = kExitFound;
    const auto draw = [&](size_t height) {
        const ServerStatus status = GatherStatus(question);
        result = status.attention.empty() ? kExitFound : kExitNothing;
        const size_t width = isatty(STDOUT_FILENO) == 1 ? OutputWidth() : 0;
        return form == Form::kJson         ? StatusJson(status)
               : form == Form::kPrometheus ? StatusPrometheus(status)
                                           : RenderStatus(status, {width, height, hasColour});
    };
    if (options.mustWatch && (form == Form::kPrometheus || !options.to.empty()))
        throw UsageError("--watch: goes with the forms text and json, and without --to");
    if (options.mustWatch) {
        const bool isScreen = form == Form::kScreen;
        Watch({std::chrono::seconds(pause), isScreen, isScreen ? "\n" : ""}, draw);
        return result;
    }
    if (!options.to.empty()) {
        WriteTo(options.to, draw(0));
        return result;
    }
    Output output(false);
    output.Write(draw(0));
    output.Finish();
    return result;
}

// "--watch" is allowed with and without a number.
void AddWatch(Command command, Options &options) {
    command.AddOptionalText(
        "--watch",
        [&options](const std::string &pause) {
            options.mustWatch = true;
            options.pause = pause.empty() ? kUsualPause : pause;
        },
        "[SECONDS]", std::string("Show it anew every so many seconds (default ") + kUsualPause + ")");
}

} // namespace

void AddStatus(Program &program) {
    auto options = std::make_shared<Options>();
    Command command = AddSubcommand(program, "status", "Tell whether the log server is well",
                                    [options, &program] { return Run(*options, program.root); });
    command.Footer(kFooter);
    AddWatch(command, *options);
    OfferWords(command.AddText("-o,--output", options->format, "FORMAT",
                               "text (default), json (one object) or prometheus (metrics)"),
               {"text", "json", "prometheus"});
    command.AddText("--to", options->to, "FILE", "Write it there; the file is replaced as a whole");
    command.AddText("--color", options->colour, "WHEN",
                    "auto (default: on a terminal, unless NO_COLOR is set), always, never");
    command.AddText("--control", options->control, "PATH",
                    "This control socket of syslog-ng, not /var/lib/syslog-ng/syslog-ng.ctl");
}

} // namespace kelo::tool
