#pragma once

#include <random>
#include <string>
#include <vector>

#include "board.h"
#include "ledger.h"
#include "site.h"
#include "token.h"

namespace kelo::stress {

struct ProgramRun {
    int status = 0; // exit status; -N when signal N ended it
    std::string out;
};

// What every worker process has: its notes, its luck and its place on the board.
class Worker {
public:
    // `id` is the number of the process, which is never used again. `place` is its place on the board.
    Worker(const Site &site, Board &board, size_t place, uint32_t id, uint64_t seed, Database database);

    const Site &site;
    Board &board;
    const Database database;

    std::string Path() const { return site.PathOf(database); }
    bool IsOver() const { return board.isOver; }

    // New tokens, noted as tried.
    std::vector<Token> Try(size_t count);
    void Note(Fact fact, const std::vector<Token> &tokens) { ledger_.Note(fact, tokens); }
    // Records that something happened which must not happen.
    void Complain(const std::string &text) const;

    // A number from 0 to `end` - 1.
    size_t Pick(size_t end) { return std::uniform_int_distribution<size_t>(0, end - 1)(random_); }
    bool OneIn(size_t times) { return Pick(times) == 0; }
    // A token and what makes rows differ in length.
    std::string TextWith(const Token &token);
    // Up to so many milliseconds.
    void Pause(size_t mostMs);

    // Runs "kelosyslog" below the root. Complains when it crashes or its status is above `mostStatus`.
    ProgramRun RunProgram(std::vector<std::string> arguments, const std::string &input = "",
                          int mostStatus = 3);

private:
    friend class Operation;
    const size_t place_;
    const uint32_t id_;
    uint32_t tokens_ = 0;
    std::mt19937_64 random_;
    Ledger ledger_;
};

// One operation under test: shown on the board while it runs, so that one that hangs is seen.
class Operation {
public:
    Operation(Worker &worker, Kind kind);
    ~Operation();
    Operation(const Operation &) = delete;
    Operation &operator=(const Operation &) = delete;

    // Passes on whether it succeeded.
    bool Result(bool isDone) { return isDone_ = isDone; }

private:
    Worker &worker_;
    Kind kind_;
    bool isDone_ = false;
};

// The work of a process, until the run is over.
using Role = void (*)(Worker &worker);

void AddEvents(Worker &worker);
void CountRecords(Worker &worker);      // accounting
void WriteLikeSyslogNg(Worker &worker); // plain SQLite, reopened at a HUP signal
void Receive(Worker &worker);           // as "kelosyslog receive" stores
void ParseTexts(Worker &worker);        // "kelosyslog parse --db"
void Search(Worker &worker);
void Keep(Worker &worker); // "kelosyslog db check", "quarantine", "wal"
void Archive(Worker &worker);

} // namespace kelo::stress
