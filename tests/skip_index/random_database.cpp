#include "random_database.h"

#include <unistd.h>

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

RandomDatabase::RandomDatabase(Random &random) : random_(random) {
    Begin(path_, kIdsPerSegment * 3 - 18'000);
    Append(25'000);
}

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

// An older copy takes the place of the database, or of its content.
void RandomDatabase::Restore(bool inPlace) {
    if (!fs::exists(copy_))
        return;
    RunSql(path_, "PRAGMA wal_checkpoint(TRUNCATE)");
    for (const char *suffix : {"-wal", "-shm"})
        unlink((path_ + suffix).c_str());
    if (inPlace) {
        std::ofstream(path_, std::ios::binary | std::ios::trunc)
            << std::ifstream(copy_, std::ios::binary).rdbuf();
    } else {
        fs::copy_file(copy_, path_ + ".new");
        fs::rename(path_ + ".new", path_);
    }
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

// Most searches are to have an index.
std::string RandomDatabase::Change() {
    std::string done = ChangeSomething();
    if (random_.OneIn(2))
        KELODBSkipIndexBuild(path_.c_str(), random_.OneIn(8) ? 1 : 0);
    return done;
}

std::string RandomDatabase::ChangeSomething() {
    switch (random_.Below(13)) {
    case 0:
        Delete();
        return "delete";
    case 1:
        RunSql(path_, "VACUUM");
        return "vacuum";
    case 2:
        if (random_.OneIn(3))
            Replace();
        return "replace";
    case 3:
        RunSql(path_, "PRAGMA wal_checkpoint(TRUNCATE)");
        fs::copy_file(path_, copy_, fs::copy_options::overwrite_existing);
        return "copy";
    case 4:
        Restore(true);
        return "restore in place";
    case 5:
        Restore(false);
        return "restore";
    case 6:
        DamageIndex();
        return "damage the index";
    case 7:
        unlink(index_.c_str());
        return "remove the index";
    case 8:
        KELODBSkipIndexBuild(path_.c_str(), 1);
        return "build a part";
    case 9:
        KELODBSkipIndexBuild(path_.c_str(), 0);
        return "build";
    default:
        Append(random_.Below(random_.OneIn(3) ? 20'000 : 500));
        if (random_.OneIn(2))
            Delete();
        return "append";
    }
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
