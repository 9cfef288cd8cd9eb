#pragma once

#include <stdexcept>
#include <string>
#include <vector>

#include "base/files.h"
#include "spool/entry.h"
#include "spool/progress.h"

namespace kelo::tool {

// The spool cannot be read or changed. The text names the path and the cause.
struct SpoolError : std::runtime_error {
    using std::runtime_error::runtime_error;
};

// The entry is not there any more.
struct EntryGone : std::runtime_error {
    using std::runtime_error::runtime_error;
};

// The folders of docs/notification-spool.md below `root`. What changes them is on the disk when the call
// returns; every function throws SpoolError when that cannot be done.
class Spool {
public:
    explicit Spool(const std::string &root) : path_(root + "/var/spool/kelonotify") {}

    const std::string &Path() const { return path_; }
    std::string File(const std::string &name) const { return path_ + "/" + name; }

    // Creates the folders that are missing.
    void CreateFolders() const;

    // Makes this process the one that delivers, for as long as the handle lives; an empty handle when
    // another one does.
    FileHandle Lock() const;

    // The ids in `new/` and in `failed/`, oldest first. A folder that is missing holds none.
    std::vector<std::string> NewIds() const { return Ids("new"); }
    std::vector<std::string> FailedIds() const { return Ids("failed"); }

    // The entry of this id. Throws EntryGone, or std::runtime_error with the reason when it is damaged.
    Entry ReadNew(const std::string &id) const { return ReadEntry("new/" + id + ".json", id); }
    Entry ReadFailed(const std::string &id) const { return ReadEntry("failed/" + id + ".json", id); }

    // What is recorded of an entry; empty when nothing is, or the record is damaged.
    Progress ReadProgress(const std::string &id) const { return ReadRecord("state/" + id + ".json"); }
    Progress ReadFailedProgress(const std::string &id) const { return ReadRecord("failed/" + id + ".state"); }
    void SaveProgress(const std::string &id, const Progress &progress) const;

    // The channels that do not work at present, by name.
    Progress ReadChannels() const { return ReadRecord("channels.json"); }
    void SaveChannels(const Progress &channels) const { Save("channels.json", channels); }

    // The entry was delivered: removes it, then its record.
    void Finish(const std::string &id) const;
    // Puts the entry and its record into `failed/`.
    void GiveUp(const std::string &id, const Progress &progress) const;
    // Puts a given-up entry back into `new/`; what was delivered of it stays delivered. False when there is
    // no such entry.
    bool Retry(const std::string &id, int64_t now) const;

    // Asks the deliverer to try everything at once; TakeRetryRequest tells it, once.
    void RequestRetry() const;
    bool TakeRetryRequest() const;

    // Removes records whose entries are gone, and temporary files that a crash left behind a day ago.
    void CleanUp(int64_t now) const;

private:
    std::vector<std::string> Ids(const std::string &folder) const;
    Entry ReadEntry(const std::string &name, const std::string &id) const;
    Progress ReadRecord(const std::string &name) const;
    void Save(const std::string &name, const Progress &progress) const;
    void Require(bool isDone, const std::string &name) const;

    std::string path_;
};

} // namespace kelo::tool
