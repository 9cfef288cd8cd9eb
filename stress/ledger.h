#pragma once

#include <map>
#include <string>
#include <vector>

#include "site.h"
#include "token.h"

namespace kelo::stress {

// What is known of a token, as bits.
enum Fact : uint16_t {
    kTried = 1,
    kAcknowledged = 2, // it is stored
    kAtRisk = 4,       // stored in a file whose write-ahead log was damaged
    kRefused = 8,      // it is not stored
    kDeleting = 16,
    kDeleted = 32,
    kUnsureDeleted = 64, // while the write-ahead log was damaged
    kAgain = 128,        // a failed flush may have stored it, and it is stored again
    kDestroyed = 256,    // it was in bytes that were overwritten
    kEndangered = 512    // it was in a file whose write-ahead log was damaged
};

// The notes of one process: a file to which every note is appended at once, so that it survives its writer.
class Ledger {
public:
    // Throws std::system_error.
    Ledger(const Site &site, uint32_t worker, Database database);
    ~Ledger();
    Ledger(const Ledger &) = delete;
    Ledger &operator=(const Ledger &) = delete;

    void Note(Fact fact, const std::vector<Token> &tokens);

private:
    int fd_;
};

// All ledgers together.
class Book {
public:
    struct Entry {
        uint16_t facts = 0;
        uint16_t again = 0; // how often kAgain was noted
        // How often it was found as a row: in live databases, in files set aside, in archives. And whether
        // its text is in the bytes of a file set aside.
        uint8_t live = 0;
        uint8_t aside = 0;
        uint8_t archived = 0;
        uint8_t torn = 0; // in files set aside whose write-ahead log was damaged, where a row may come twice
        bool isInBytes = false;
    };
    explicit Book(const Site &site);

    // The entry of a token; null for one that nobody has tried.
    Entry *Find(const Token &token);
    Database DatabaseOf(uint32_t worker) const { return databases_.at(worker); }

    template <typename Visit>
    void ForEach(Visit visit) {
        for (auto &[worker, entries] : entries_) {
            for (uint32_t number = 1; number < entries.size(); ++number)
                visit(Token{worker, number}, entries[number]);
        }
    }

private:
    void ReadLine(const std::string &line);

    std::map<uint32_t, std::vector<Entry>> entries_; // by worker, then by number
    std::map<uint32_t, Database> databases_;
};

} // namespace kelo::stress
