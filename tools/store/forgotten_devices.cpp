#include "store/forgotten_devices.h"

#include <sys/stat.h>

#include "base/sqlite.h"

namespace kelo::tool {
namespace {

constexpr const char *kDelete = "DELETE FROM histogram WHERE device IN (SELECT device FROM forgotten);"
                                "DELETE FROM eps WHERE device IN (SELECT device FROM forgotten)";

bool HasNotes(SqliteConnection &db) {
    return db.Number("SELECT count(*) FROM sqlite_master WHERE type = 'table' AND name = 'forgotten'") > 0 &&
           db.Number("SELECT EXISTS (SELECT 1 FROM forgotten)") > 0;
}

// A vacuum writes the whole file, so it has to pay.
void GiveSpaceBack(SqliteConnection &db) {
    if (db.Number("PRAGMA freelist_count") * 2 <= db.Number("PRAGMA page_count"))
        return;
    db.Run("VACUUM");
    db.Checkpoint(true);
}

} // namespace

void ForgetDevices(const std::string &path, const std::vector<std::string> &names) {
    SqliteConnection db(path, {.mode = SqliteMode::kWrite, .trustsSchema = false});
    {
        SqliteTransaction transaction(db);
        db.Run("CREATE TABLE IF NOT EXISTS forgotten (device TEXT PRIMARY KEY)");
        SqliteStatement note(db, "INSERT OR IGNORE INTO forgotten VALUES (?1)");
        for (const std::string &name : names) {
            note.Bind(1, name);
            note.Run();
        }
        db.Run(kDelete);
        transaction.Commit();
    }
    GiveSpaceBack(db);
}

bool DropForgottenDevices(const std::string &path) {
    struct stat status {};
    if (stat(path.c_str(), &status) != 0)
        return false;
    SqliteConnection db(path, {.mode = SqliteMode::kWrite, .trustsSchema = false});
    if (!HasNotes(db))
        return false;
    SqliteTransaction transaction(db);
    db.Run(kDelete);
    db.Run("DELETE FROM forgotten");
    transaction.Commit();
    return true;
}

} // namespace kelo::tool
