#include "cli/completion.h"

#include <CLI/CLI.hpp>

#include <utility>

namespace kelo::tool {
namespace {

// CLI11 keeps validators with an option. One that is not active checks nothing and stays out of help texts.
constexpr const char *kOffer = "offer";

constexpr std::pair<const char *, const char *> kOffersOfTypes[] = {
    {"PATH", "files"},
    {"FILE", "files"},
    {"DATABASE", "files"},
    {"DIR", "folders"},
    {"FOLDER", "folders"},
    {"WHEN", "words auto always never"},
    {"TIME", "words now today yesterday 1h 1d 1w"},
};

Option Offer(Option option, std::string offer, const std::vector<std::string> &words) {
    for (const std::string &word : words)
        offer += " " + word;
    option.Parsed().check(CLI::Validator(offer).name(kOffer).active(false));
    return option;
}

} // namespace

Option OfferWords(Option option, const std::vector<std::string> &words, const std::string &after) {
    return Offer(option, after.empty() ? "words" : "after " + after + " words", words);
}

Option OfferList(Option option, const std::vector<std::string> &words) {
    return Offer(option, "list", words);
}

Option OfferLogs(Option option, const std::vector<std::string> &words) {
    return Offer(option, "logs", words);
}

std::string CompletionOf(const Option &option) {
    try {
        return CLI::Validator(*option.Parsed().get_validator(kOffer)).active().get_description();
    } catch (const CLI::OptionNotFound &) {
        for (const auto &[type, offer] : kOffersOfTypes) {
            if (option.Parsed().get_type_name() == type)
                return offer;
        }
        return "nothing";
    }
}

} // namespace kelo::tool
