#pragma once

#include <stdexcept>
#include <string>
#include <vector>

#include "base/folder.h"
#include "spool/entry.h"
#include "spool/progress.h"

namespace kelo::tool {

// The spool cannot be read or changed. The text names the path and the cause.
struct SpoolError : std::runtime_error {
    using std::runtime_error::runtime_error;
};

// The entry does not exist any more.
struct EntryGone : std::runtime_error {
    using std::runtime_error::runtime_error;
};

// The folders of docs/notification-spool.md below `root`. They belong to a service, so no link in them is
// followed. A change is on the disk when the call returns;
// every function throws SpoolError if that fails.
class Spool {
public:
    explicit Spool(const std::string &root) : path_(root + "/var/spool/kelonotify") {}

    const std::string &Path() const { return path_; }
    std::string File(const std::string &name) const { return path_ + "/" + name; }
    Folder Sub(const std::string &name) const { return {Folder(path_), name}; }

    // Creates the folders that are missing.
    void CreateFolders() const;

    // Makes this process the one that delivers, during the lifetime of the handle; an empty handle if another
    // one does.
    FileHandle Lock() const;

    // The ids in `new/` and in `failed/`, oldest first. A missing folder has none.
    std::vector<std::string> NewIds() const { return Ids("new"); }
    std::vector<std::string> FailedIds() const { return Ids("failed"); }

    // The entry of this id. Throws EntryGone, or std::runtime_error with the reason when it is damaged.
    Entry ReadNew(const std::string &id) const { return ReadEntry("new/" + id + ".json", id); }
    Entry ReadFailed(const std::string &id) const { return ReadEntry("failed/" + id + ".json", id); }

    // The delivery record of an entry; empty if there is none or it is damaged.
    Progress ReadProgress(const std::string &id) const { return ReadRecord("state/" + id + ".json"); }
    Progress ReadFailedProgress(const std::string &id) const { return ReadRecord("failed/" + id + ".state"); }
    void SaveProgress(const std::string &id, const Progress &progress) const;

    // The channels that do not work at present, by name.
    Progress ReadChannels() const { return ReadRecord("channels.json"); }
    void SaveChannels(const Progress &channels) const { Save("channels.json", channels); }

    // The entry was delivered: removes it, then its record.
    void Finish(const std::string &id) const;
    // Moves the entry and its record to `failed/`.
    void GiveUp(const std::string &id, const Progress &progress) const;
    // Moves a given-up entry back to `new/`; its completed deliveries stay recorded. False if there is no
    // such entry.
    bool Retry(const std::string &id, int64_t now) const;

    // Asks the deliverer to try everything immediately; TakeRetryRequest returns the request once.
    void RequestRetry() const;
    bool TakeRetryRequest() const;

    // Removes records whose entries are gone, and temporary files that a crash left a day ago.
    void CleanUp(int64_t now) const;

private:
    std::vector<std::string> Ids(const std::string &folder) const;
    Entry ReadEntry(const std::string &name, const std::string &id) const;
    Progress ReadRecord(const std::string &name) const;
    void Save(const std::string &name, const Progress &progress) const;
    // The folder of "folder/file", and the file's name in it.
    Folder FolderOf(const std::string &name) const;
    static std::string Leaf(const std::string &name) { return name.substr(name.find('/') + 1); }
    std::vector<std::string> NamesIn(const std::string &folder) const;
    std::optional<std::string> Read(const std::string &name) const;
    bool Exists(const std::string &name) const;
    void Remove(const std::string &name) const;
    void Rename(const std::string &name, const std::string &newName) const;
    void Require(bool isDone, const std::string &name) const;

    std::string path_;
};

} // namespace kelo::tool
