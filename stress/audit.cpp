#include "audit.h"

#include <algorithm>
#include <filesystem>
#include <fstream>
#include <iterator>
#include <limits>

#include "base/sqlite.h"
#include "ledger.h"

namespace kelo::stress {
namespace {

namespace fs = std::filesystem;

constexpr const char *kRows[kDatabases] = {
    "SELECT id, event FROM log NOT INDEXED WHERE id >= ?1 ORDER BY id",
    "SELECT id, device FROM eps NOT INDEXED WHERE id >= ?1 ORDER BY id",
    "SELECT id, msg FROM logs NOT INDEXED WHERE id >= ?1 ORDER BY id"};
constexpr size_t kMostFaults = 50;

class Auditor {
public:
    explicit Auditor(const Site &site) : site_(site), book_(site) {}

    Findings Run() {
        fs::create_directory(site_.folder + "/audit");
        for (const Database database : {kEvents, kAccounts, kLogs}) {
            const std::string path = site_.PathOf(database);
            ReadBytesAround(path);
            if (fs::exists(path))
                ReadSound(path, database, &Book::Entry::live);
        }
        for (const std::string &folder : {site_.Attic(), site_.Archives()})
            ReadFolder(folder);
        book_.ForEach([this](const Token &token, const Book::Entry &entry) { Judge(token, entry); });
        return findings_;
    }

private:
    using Count = uint8_t Book::Entry::*;

    void Fault(const std::string &text) {
        if (findings_.faults.size() < kMostFaults)
            findings_.faults.push_back(text);
    }

    // A copy with its companions, as reading changes them.
    std::string Copy(const std::string &path) const {
        std::string copy = site_.folder + "/audit/copy.db";
        for (const char *file : {"", "-wal", "-journal", "-shm"}) {
            fs::remove(copy + file);
            if (file != std::string("-shm") && fs::exists(path + file))
                fs::copy_file(path + file, copy + file);
        }
        return copy;
    }

    void Take(const Token &token, Count count, const std::string &path) {
        Book::Entry *entry = book_.Find(token);
        if (entry == nullptr)
            return Fault(TextOf(token) + " is in " + path + ", and nobody has tried it");
        if (entry->*count < std::numeric_limits<uint8_t>::max())
            ++(entry->*count);
    }

    void ReadSound(const std::string &path, Database database, Count count) {
        try {
            tool::SqliteConnection db(Copy(path), {.mode = tool::SqliteMode::kWrite});
            int64_t next = 0;
            ReadRows(db, database, count, path, next);
            const std::string finding = db.Text("PRAGMA integrity_check(1)");
            if (finding != "ok")
                Fault(path + " is damaged: " + finding);
        } catch (const tool::SqliteError &error) {
            Fault(path + " cannot be read: " + error.what());
        }
    }

    // The rows before and behind what is damaged.
    void ReadDamaged(const std::string &path, Database database, Count count) {
        constexpr int kMostSteps = 1000;
        constexpr int64_t kStep = 10; // ids, fewer than a page holds
        const std::string copy = Copy(path);
        std::fstream(copy, std::ios::in | std::ios::out) << "SQLite format 3" << '\0';
        try {
            tool::SqliteConnection db(copy, {.mode = tool::SqliteMode::kWrite});
            int64_t next = 0;
            for (int step = 0; step < kMostSteps; ++step, next += kStep) {
                try {
                    ReadRows(db, database, count, path, next);
                    return;
                } catch (const tool::SqliteError &) {
                }
            }
        } catch (const tool::SqliteError &) {
        }
    }

    // From the id `next` on, which is moved behind each row.
    void ReadRows(tool::SqliteConnection &db, Database database, Count count, const std::string &path,
                  int64_t &next) {
        tool::SqliteStatement rows(db, kRows[database]);
        rows.Bind(1, next);
        for (; rows.Step(); next = rows.Number(0) + 1)
            FindTokens(rows.Text(1).substr(0, 20), [&](const Token &token) { Take(token, count, path); });
    }

    void ReadBytes(const std::string &path) {
        std::ifstream file(path, std::ios::binary);
        const std::string bytes(std::istreambuf_iterator<char>(file), {});
        FindTokens(bytes, [&](const Token &token) {
            if (Book::Entry *entry = book_.Find(token))
                entry->isInBytes = true;
        });
    }

    // What was set aside and is still beside the database.
    void ReadBytesAround(const fs::path &path) {
        for (const auto &file : fs::directory_iterator(path.parent_path())) {
            if (file.path().filename().string().starts_with(path.filename().string() + ".corrupt"))
                ReadBytes(file.path());
        }
    }

    void ReadFolder(const std::string &folder) {
        if (!fs::exists(folder))
            return;
        for (const auto &file : fs::directory_iterator(folder)) {
            const std::string name = file.path().filename();
            if (name.ends_with(".db") && !name.starts_with("."))
                ReadSound(file.path(), kLogs, &Book::Entry::archived);
            if (name.find(".corrupt") == std::string::npos)
                continue;
            ReadBytes(file.path());
            if (!name.ends_with(".corrupt"))
                continue;
            const auto *database =
                std::find_if(kDatabaseNames.begin(), kDatabaseNames.end(), [&](const char *each) {
                    return name.find(std::string("-") + each + ".") != std::string::npos;
                });
            ReadDamaged(file.path(), static_cast<Database>(database - kDatabaseNames.begin()),
                        name.find(".torn") == std::string::npos ? &Book::Entry::aside : &Book::Entry::torn);
        }
    }

    void Judge(const Token &token, const Book::Entry &entry) {
        const auto is = [&](int facts) { return (entry.facts & facts) != 0; };
        if (!is(kTried))
            return;
        ++findings_.tried;
        const std::string who = TextOf(token) + " of " + kDatabaseNames[book_.DatabaseOf(token.worker)];
        const bool isRow = entry.live + entry.aside + entry.archived > 0;
        if (is(kRefused) && isRow)
            Fault(who + " was refused and is stored");
        if (is(kDeleted) && entry.live > 0)
            Fault(who + " was deleted and is there");
        if (entry.live + entry.aside > 1 + entry.again)
            Fault(who + " was found twice: live " + std::to_string(entry.live) + ", set aside " +
                  std::to_string(entry.aside));
        if (entry.live + entry.archived > 1 + entry.again)
            Fault(who + " was found twice: live " + std::to_string(entry.live) + ", archived " +
                  std::to_string(entry.archived));
        if (is(kAcknowledged | kAtRisk) && !is(kDeleting))
            Find(who, entry);
    }

    // Counts where an acknowledged token is.
    void Find(const std::string &who, const Book::Entry &entry) {
        ++findings_.acknowledged;
        uint64_t *const place = entry.live > 0                                 ? &findings_.live
                                : entry.archived > 0                           ? &findings_.archived
                                : entry.aside + entry.torn > 0                 ? &findings_.aside
                                : entry.isInBytes                              ? &findings_.inBytes
                                : (entry.facts & kDestroyed) != 0              ? &findings_.destroyed
                                : (entry.facts & (kAtRisk | kEndangered)) != 0 ? &findings_.atRisk
                                                                               : nullptr;
        if (place != nullptr)
            ++*place;
        else
            Fault(who + " was acknowledged and is lost");
    }

    const Site &site_;
    Book book_;
    Findings findings_;
};

} // namespace

Findings Audit(const Site &site) {
    return Auditor(site).Run();
}

} // namespace kelo::stress
