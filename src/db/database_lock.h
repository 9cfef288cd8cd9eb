#pragma once

#include <string>

namespace kelo {

// The right to create, move or remove the database at a path: one thread of one process has it at a time.
//
// It is a lock on the file PATH.lock, which is there only while somebody has or wants the lock. One that a
// killed process has left is taken over. Whoever may only read the folder cannot open the file, so cannot
// keep the lock from those who may write there.
class DatabaseLock {
public:
    // Waits for the lock, at most 30 seconds. Throws std::bad_alloc.
    explicit DatabaseLock(const std::string &dbPath);
    // Releases the lock and removes the file.
    ~DatabaseLock();
    DatabaseLock(const DatabaseLock &) = delete;
    DatabaseLock &operator=(const DatabaseLock &) = delete;

    // False, after a report, when the lock could not be taken although the folder could be written. A folder
    // that cannot be written needs no lock: what is attempted there fails by itself.
    bool MayGoOn() const;
    // Whether the lock was taken over from a process that was killed, whose work may be half done.
    bool IsInherited() const { return isInherited_; }

    // Whether somebody has the lock or was killed with it.
    static bool IsThere(const std::string &dbPath);
    // Whether somebody else has the lock.
    static bool IsTaken(const std::string &dbPath);

private:
    bool Take();
    int Make() const;

    const std::string path_;
    int fd_ = -1;
    int error_ = 0; // why there is no lock
    bool isInherited_ = false;
};

} // namespace kelo
