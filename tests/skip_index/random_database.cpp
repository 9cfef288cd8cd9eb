#include "random_database.h"

#include <sqlite3.h>
#include <unistd.h>

#include <utility>

#include "builders.h"
#include "keloplatform/skip_index.h"
#include "support/log_database.h"

namespace kelo::test {
namespace {

constexpr long long kIdsPerSegment = 131'072;
constexpr size_t kMostRows = 40'000;

std::string Quoted(const std::string &text) {
    std::string quoted = "'";
    for (const char byte : text)
        quoted.append(byte == '\'' ? 2 : 1, byte);
    return quoted + "'";
}

std::string Hex(const std::string &text) {
    std::string hex;
    for (const char byte : text) {
        char digits[3];
        std::snprintf(digits, sizeof digits, "%02x", static_cast<unsigned char>(byte));
        hex += digits;
    }
    return hex;
}

} // namespace

RandomDatabase::RandomDatabase(Random &random)
    : random_(random), isShared_(false), path_(root_.File("logs.db")) {
    Begin(path_, kIdsPerSegment * 3 - 18'000);
    Append(25'000);
}

RandomDatabase::RandomDatabase(Random &random, const std::string &path)
    : random_(random), isShared_(true), path_(path) {}

void RandomDatabase::Begin(const std::string &path, long long firstId) {
    CreateLogDatabase(path);
    RunSql(path, "INSERT INTO sqlite_sequence VALUES('logs', " + std::to_string(firstId - 1) + ")");
}

// Rows come in the order of their times, but for a clock that is set, and odd values.
std::string RandomDatabase::Times() {
    time_ += random_.OneIn(200) ? random_.Below(4'000) : random_.Below(3);
    if (random_.OneIn(3'000))
        time_ -= std::min<size_t>(time_ - 1'600'000'000, random_.Below(20'000));
    const size_t day = (time_ - 1'600'000'000) / 5'000;
    std::string second = std::to_string(time_);
    std::string date =
        "'2020/0" + std::to_string(1 + day / 28 % 9) + "/" + std::to_string(10 + day % 28 % 20) + "'";
    if (random_.OneIn(20'000))
        second = random_.OneIn(2) ? "NULL" : random_.OneIn(2) ? "'soon'" : "1600000000.5";
    if (random_.OneIn(20'000))
        date = random_.OneIn(2) ? "NULL" : random_.OneIn(2) ? "'2020/1/3'" : "x'323032302f30312f3131'";
    return date + "," + second;
}

std::string RandomDatabase::Message() {
    std::string text;
    for (size_t words = random_.Below(5); words > 0; --words)
        text.append(random_.OneIn(2'000) ? random_.Of(kOddWords) : random_.Of(topic_))
            .append(random_.OneIn(8) ? "" : " ");
    text += std::to_string(random_.Below(random_.OneIn(2) ? 100 : 1'000'000'000));
    return text;
}

// Rows of the usual kind, and now and then one that SQLite reads differently than it is written.
void RandomDatabase::Append(size_t count) {
    TestDatabase db(path_);
    db.Run("PRAGMA synchronous=OFF; BEGIN IMMEDIATE");
    std::string values;
    for (size_t i = 0; i < count; ++i) {
        const std::string text = Message();
        std::string value = Quoted(text);
        if (random_.OneIn(2'000))
            value = random_.OneIn(2) ? "NULL" : "CAST(x'" + Hex(text + '\0' + Message()) + "' AS TEXT)";
        else if (random_.OneIn(2'000))
            value = random_.OneIn(2) ? "x'" + Hex(text) + "'" : std::to_string(random_.Below(1u << 31));
        values.append(values.empty() ? "" : ",").append("('host").append(std::to_string(random_.Below(20)));
        values.append("','prog").append(std::to_string(random_.Below(9))).append("','");
        values.append(random_.OneIn(3'000) ? "emerg" : random_.OneIn(9) ? "err" : "info");
        values.append(random_.OneIn(900) ? "','kern'," : "','daemon',")
            .append(Times())
            .append(",")
            .append(value)
            .append(")");
        if (i % 200 == 199 || i + 1 == count) {
            db.Run("INSERT INTO logs(host,prog,llevel,fac,ldate,utcsec,msg) VALUES" + values);
            values.clear();
            topic_ = {random_.Of(kWords), random_.Of(kWords), random_.Of(kWords)};
        }
    }
    db.Run("COMMIT");
}

void RandomDatabase::Delete() {
    TestDatabase db(path_);
    const std::string sizeText = db.Run("SELECT max(id) - min(id) FROM logs");
    const size_t size = sizeText.empty() ? 1 : std::stoul(sizeText) + 1;
    const std::string first = "(SELECT min(id) FROM logs)";
    if (random_.OneIn(20))
        db.Run("DELETE FROM logs");
    else if (random_.OneIn(2) || size > kMostRows)
        db.Run("DELETE FROM logs WHERE id < " + first + "+" +
               std::to_string(size > kMostRows ? size - kMostRows / 2 : random_.Below(size)));
    else if (random_.OneIn(2))
        db.Run("DELETE FROM logs WHERE id % 7 = 3 AND id - " + first + " BETWEEN " +
               std::to_string(random_.Below(size)) + " AND " + std::to_string(random_.Below(size)));
    else
        db.Run("DELETE FROM logs WHERE id > (SELECT max(id) FROM logs) - " +
               std::to_string(random_.Below(size)));
}

void RandomDatabase::Replace() {
    for (const char *suffix : {"", "-wal", "-shm"})
        unlink((path_ + suffix).c_str());
    Begin(path_, static_cast<long long>(random_.Below(kIdsPerSegment * 2)) + 1);
    Append(5'000 + random_.Below(20'000));
}

// The ids begin again, as after a file was emptied by hand.
void RandomDatabase::Clear() {
    RunSql(path_, "DELETE FROM logs; DELETE FROM sqlite_sequence WHERE name = 'logs'");
    Begin(path_, static_cast<long long>(random_.Below(kIdsPerSegment)) + 1);
    Append(random_.Below(40'000));
}

void RandomDatabase::Copy() {
    fs::remove(copy_);
    RunSql(path_, "VACUUM INTO '" + copy_ + "'");
    RunSql(copy_, "PRAGMA journal_mode = WAL");
}

// An older copy is written over the content of the file.
void RandomDatabase::CopyBack() {
    if (!fs::exists(copy_))
        return;
    RunSql(path_, "PRAGMA wal_checkpoint(TRUNCATE)");
    for (const char *suffix : {"-wal", "-shm"})
        unlink((path_ + suffix).c_str());
    std::ofstream(path_, std::ios::binary | std::ios::trunc)
        << std::ifstream(copy_, std::ios::binary).rdbuf();
    Append(random_.OneIn(2) ? random_.Below(25'000) : 0);
}

void RandomDatabase::RenameBack() {
    if (!fs::exists(copy_))
        return;
    for (const char *suffix : {"-wal", "-shm"})
        unlink((path_ + suffix).c_str());
    fs::copy_file(copy_, path_ + ".new");
    fs::rename(path_ + ".new", path_);
    Append(random_.OneIn(2) ? random_.Below(25'000) : 0);
}

// The same by SQLite, while others use the database.
void RandomDatabase::BackUpBack() {
    if (!fs::exists(copy_))
        return;
    TestDatabase from(copy_);
    TestDatabase to(path_);
    sqlite3_backup *backup = sqlite3_backup_init(to.Get(), "main", from.Get(), "main");
    while (sqlite3_backup_step(backup, -1) == SQLITE_BUSY) {
    }
    sqlite3_backup_finish(backup);
    Append(random_.OneIn(2) ? random_.Below(25'000) : 0);
}

void RandomDatabase::DamageIndex() {
    std::string bytes = ReadFile(index_);
    if (bytes.empty())
        return;
    if (random_.OneIn(3))
        bytes.resize(random_.Below(bytes.size()));
    else if (random_.OneIn(2)) {
        const size_t at = random_.Below(bytes.size());
        std::fill_n(bytes.begin() + static_cast<std::ptrdiff_t>(at), (bytes.size() - at) / 2, '\0');
    } else
        for (size_t flips = random_.OneIn(2) ? 1 : 2'000; flips > 0; --flips)
            random_.Of(bytes) ^= static_cast<char>(1 << random_.Below(8));
    WriteFile(index_, bytes);
}

void RandomDatabase::ChangeVersion() {
    std::string bytes = ReadFile(index_);
    if (bytes.empty() || bytes[0] == '\0')
        return;
    bytes[16] = 99;
    WriteFile(index_, bytes);
    mustBeReported_ = true;
    isBuilt_ = false;
}

// The index of another database with the same ids.
void RandomDatabase::TakeOtherIndex() {
    if (!fs::exists(copy_) || KELODBSkipIndexBuild(copy_.c_str(), 0) != KELODB_SKIP_COMPLETE ||
        !fs::exists(copy_ + "-skip") || fs::file_size(copy_ + "-skip") == 0)
        return;
    fs::rename(copy_ + "-skip", index_);
    mustBeReported_ = true;
    isBuilt_ = false;
}

void RandomDatabase::RemoveIndex() {
    unlink(index_.c_str());
    mayBeBad_ = mustBeReported_ = false;
}

void RandomDatabase::Build(int maxMs) {
    isBuilt_ = KELODBSkipIndexBuild(path_.c_str(), maxMs) == KELODB_SKIP_COMPLETE || isBuilt_;
}

void RandomDatabase::KillBuilder() {
    BuildAndKill(path_, random_.Below(random_.OneIn(2) ? 60 : 600));
    mustBeReported_ = false; // what it reported is not known
}

void RandomDatabase::StarveBuilder() {
    linesOfOthers_ += BuildWithin(path_, random_.Below(8'000'000));
}

void RandomDatabase::BuildBesides() {
    linesOfOthers_ += BuildTogether(path_, 4);
}

void RandomDatabase::DeleteLittle() {
    const std::string newest = RunSql(path_, "SELECT ifnull(max(id), 0) / 16384 * 16384 FROM logs");
    RunSql(path_, "DELETE FROM logs WHERE id BETWEEN " + newest + " - " + std::to_string(random_.Below(300)) +
                      " AND " + newest + " - 1");
}

void RandomDatabase::AppendSome() {
    Append(random_.Below(random_.OneIn(3) ? 20'000 : 500));
    if (random_.OneIn(2))
        Delete();
}

void RandomDatabase::Vacuum() {
    RunSql(path_, "VACUUM");
}

struct RandomDatabase::Event {
    const char *name;
    void (RandomDatabase::*happen)();
    size_t weight = 1;
    bool spoils = false;          // the index does not fit afterwards
    bool isPossibleShared = true; // while others have the database open
};

const RandomDatabase::Event RandomDatabase::kEvents[] = {
    {"append", &RandomDatabase::AppendSome, 4},
    {"delete", &RandomDatabase::Delete},
    {"delete the newest that are covered", &RandomDatabase::DeleteLittle, 2},
    {"vacuum", &RandomDatabase::Vacuum},
    {"another file", &RandomDatabase::Replace, 1, true, false},
    {"ids begin again", &RandomDatabase::Clear, 1, true, false},
    {"copy", &RandomDatabase::Copy, 2},
    {"copy written back", &RandomDatabase::CopyBack, 1, true, false},
    {"copy renamed back", &RandomDatabase::RenameBack, 1, true, false},
    {"copy restored by SQLite", &RandomDatabase::BackUpBack, 1, true},
    {"index cut or damaged", &RandomDatabase::DamageIndex, 2, true},
    {"index of another version", &RandomDatabase::ChangeVersion, 1, true},
    {"index of another database", &RandomDatabase::TakeOtherIndex, 1, true},
    {"index removed", &RandomDatabase::RemoveIndex},
    {"build a part", &RandomDatabase::BuildPart},
    {"build", &RandomDatabase::BuildAll},
    {"builder killed", &RandomDatabase::KillBuilder, 2},
    {"builder that cannot write", &RandomDatabase::StarveBuilder},
    {"several builders", &RandomDatabase::BuildBesides},
};

// Most searches are to have an index.
void RandomDatabase::Change() {
    std::vector<const Event *> possible;
    for (const Event &event : kEvents) {
        if (event.isPossibleShared || !isShared_)
            possible.insert(possible.end(), event.weight, &event);
    }
    const Event &event = *random_.Of(possible);
    last_ = event.name;
    ++changes_[last_];
    mayBeBad_ |= event.spoils;
    (this->*event.happen)();
    if (random_.OneIn(2))
        Build(random_.OneIn(8) ? 1 : 0);
}

std::string RandomDatabase::CheckLines(const std::vector<std::string> &lines) {
    const size_t count = lines.size() + std::exchange(linesOfOthers_, 0);
    const size_t most = mayBeBad_ ? 1 : 0;
    const size_t least = mustBeReported_ && isBuilt_ ? 1 : 0;
    lines_ += count;
    if (count != 0 || least != 0)
        mayBeBad_ = mustBeReported_ = false;
    if (count >= least && count <= most)
        return "";
    std::string text = std::to_string(count) + " lines in the system log";
    for (const std::string &line : lines)
        text += "\n  " + line;
    return text;
}

std::string RandomPartOfMessage(const std::string &database, Random &random) {
    std::string id = "(SELECT min(id) FROM logs) + " + std::to_string(random.Below(kMostRows));
    if (random.OneIn(3)) // at the end of what the index knows
        id = "((" + id + ") / 16384 * 16384 - " + std::to_string(random.Below(2)) + ")";
    const std::string text =
        RunSql(database, "SELECT msg FROM logs WHERE id >= " + id + " AND msg NOT NULL LIMIT 1");
    if (text.empty())
        return "none";
    return text.substr(random.Below(text.size()), 1 + random.Below(24));
}

} // namespace kelo::test
