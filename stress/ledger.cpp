#include "ledger.h"

#include <fcntl.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <system_error>
#include <utility>

namespace kelo::stress {
namespace {

constexpr std::pair<Fact, const char *> kWords[] = {
    {kTried, "trying"},         {kAcknowledged, "acknowledged"},
    {kAtRisk, "at-risk"},       {kRefused, "refused"},
    {kDeleting, "deleting"},    {kDeleted, "deleted"},
    {kUnsureDeleted, "unsure"}, {kAgain, "again"},
    {kDestroyed, "destroyed"},  {kEndangered, "endangered"}};

} // namespace

Ledger::Ledger(const Site &site, uint32_t worker, Database database)
    : fd_(open((site.Ledgers() + "/" + std::to_string(worker) + "-" + kDatabaseNames[database]).c_str(),
               O_WRONLY | O_CREAT | O_APPEND | O_CLOEXEC, 0600)) {
    if (fd_ < 0)
        throw std::system_error(errno, std::generic_category(), "cannot write a ledger");
}

Ledger::~Ledger() {
    close(fd_);
}

void Ledger::Note(Fact fact, const std::vector<Token> &tokens) {
    const auto *word = std::find_if(std::begin(kWords), std::end(kWords),
                                    [&](const auto &entry) { return entry.first == fact; });
    std::string lines;
    for (const Token &token : tokens)
        lines.append(word->second).append(" ").append(TextOf(token)).append("\n");
    if (write(fd_, lines.data(), lines.size()) != static_cast<ssize_t>(lines.size()))
        throw std::system_error(errno, std::generic_category(), "cannot write a ledger");
}

Book::Book(const Site &site) {
    for (const auto &file : std::filesystem::directory_iterator(site.Ledgers())) {
        const std::string name = file.path().filename();
        const size_t dash = name.find('-');
        const auto worker = static_cast<uint32_t>(std::strtoul(name.c_str(), nullptr, 10));
        const auto *database = std::find(kDatabaseNames.begin(), kDatabaseNames.end(), name.substr(dash + 1));
        databases_[worker] = static_cast<Database>(database - kDatabaseNames.begin());
        std::ifstream lines(file.path());
        for (std::string line; std::getline(lines, line);)
            ReadLine(line);
    }
}

void Book::ReadLine(const std::string &line) {
    const size_t blank = line.find(' ');
    const auto *word = std::find_if(std::begin(kWords), std::end(kWords),
                                    [&](const auto &entry) { return line.substr(0, blank) == entry.second; });
    if (word == std::end(kWords))
        return;
    FindTokens(line, [&](const Token &token) {
        std::vector<Entry> &entries = entries_[token.worker];
        if (entries.size() <= token.number)
            entries.resize(token.number + 1);
        Entry &entry = entries[token.number];
        entry.facts = static_cast<uint16_t>(entry.facts | word->first);
        entry.again = static_cast<uint16_t>(entry.again + (word->first == kAgain ? 1 : 0));
    });
}

Book::Entry *Book::Find(const Token &token) {
    const auto entries = entries_.find(token.worker);
    if (entries == entries_.end() || token.number >= entries->second.size())
        return nullptr;
    Entry &entry = entries->second[token.number];
    return (entry.facts & kTried) != 0 ? &entry : nullptr;
}

} // namespace kelo::stress
