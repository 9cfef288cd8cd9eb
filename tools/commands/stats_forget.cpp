#include "commands/stats_forget.h"

#include <limits>

#include "base/errors.h"
#include "base/sqlite.h"
#include "cli/confirm.h"
#include "cli/exit_status.h"
#include "cli/program.h"
#include "commands/tell_receiver.h"
#include "print/key_values.h"
#include "print/output.h"
#include "read/accounting_samples.h"
#include "store/forgotten_devices.h"

namespace kelo::tool {
namespace {

// Only * and ? are wildcards, as in the options of a search.
std::string GlobOf(const std::string &name) {
    std::string pattern;
    for (const char byte : name)
        pattern += byte == '[' ? "[[]" : std::string(1, byte);
    return pattern;
}

std::vector<std::string> Select(const std::string &path, const ForgetOptions &options) {
    const uint64_t below = options.below.empty() ? std::numeric_limits<int64_t>::max()
                                                 : ParseNumber("--below", options.below, 1,
                                                               uint64_t{std::numeric_limits<int64_t>::max()});
    SqliteConnection db(path, {.trustsSchema = false});
    SqliteStatement select(db, "SELECT device FROM histogram WHERE device GLOB ?1 AND count < ?2");
    std::vector<std::string> devices;
    for (const std::string &name : options.names.empty() ? std::vector<std::string>{"*"} : options.names) {
        const std::string pattern = GlobOf(name);
        select.Bind(1, pattern);
        select.Bind(2, static_cast<int64_t>(below));
        while (select.Step())
            devices.push_back(select.Text(0));
    }
    return devices;
}

void PrintResult(const std::string &path, const ForgetOptions &options, size_t count,
                 const std::string &what) {
    Output output(false);
    if (options.format == OutputFormat::Text) {
        output.Write((options.isDryRun ? "would forget " : "forgot ") + what + "\n");
    } else {
        KeyValues values;
        values.Add("path", path);
        values.Add(options.isDryRun ? "matching" : "forgotten", static_cast<int64_t>(count));
        output.Write(values.Render(options.format));
    }
    output.Finish();
}

} // namespace

int ForgetDevicesByOptions(const std::string &path, const ForgetOptions &options, const std::string &root) {
    if (options.names.empty() && options.below.empty())
        throw UsageError("stats forget: which devices? Give their names, or --below");
    RequireHistogram(path);
    const std::vector<std::string> devices = Select(path, options);
    if (devices.empty()) {
        PrintMessage("no such device in " + path);
        return kExitNothing;
    }
    const std::string what =
        std::to_string(devices.size()) + (devices.size() == 1 ? " device" : " devices") + " in " + path;
    if (options.isDryRun) {
        PrintResult(path, options, devices.size(), what);
        return kExitFound;
    }
    if (!options.isConfirmed && !Confirm("stats forget", "forget the counts of " + what)) {
        PrintMessage("nothing forgotten");
        return kExitNothing;
    }
    ForgetDevices(path, devices);
    TellReceiver(root, "these devices until it is restarted");
    PrintResult(path, options, devices.size(), what);
    return kExitFound;
}

} // namespace kelo::tool
