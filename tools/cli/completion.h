#pragma once

#include <string>
#include <vector>

#include "cli/command.h"

namespace kelo::tool {

// The shell completion of the value of an option or an argument is declared with the option:
//
//     OfferWords(command.AddText("--by", interval, "INTERVAL", "second, minute or hour"),
//                {"second", "minute", "hour"});
//
// It checks nothing and is not part of help texts. Each function returns `option`.

// One of these words; with `after` only if that is the argument before.
Option OfferWords(Option option, const std::vector<std::string> &words, const std::string &after = "");
// Words separated by commas, of which each may be excluded by a leading '!'.
Option OfferList(Option option, const std::vector<std::string> &words);
// One of these logs, or an archive by its name.
Option OfferLogs(Option option, const std::vector<std::string> &words);

// How package/completion/kelosyslog.in completes the value: the name of what it does ("words", "list",
// "files", "nothing", ...) and, after a blank, the words for it. Without one of the functions above it comes
// from the type name of the option: files for PATH, moments for TIME, and so on.
std::string CompletionOf(const Option &option);

} // namespace kelo::tool
