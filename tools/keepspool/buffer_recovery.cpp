#include "keepspool/buffer_recovery.h"

#include <fcntl.h>
#include <sys/file.h>
#include <sys/random.h>
#include <unistd.h>

#include <cerrno>
#include <cstdio>
#include <cstring>
#include <filesystem>
#include <optional>

#include "base/errors.h"
#include "base/folder.h"
#include "keepspool/waiting_messages.h"

namespace kelo::tool {
namespace {

constexpr const char *kDone = ".done";
constexpr const char *kCounted = ".counted"; // the end of the name of a file whose messages are counted
constexpr size_t kBlockBytes = 1024 * 1024;

[[noreturn]] void FailFor(const std::string &path) {
    throw OutputError(path + ": " + std::strerror(errno));
}

// The records of a spool file have the same random number in common, which no sender knows.
std::string MakeHostId(const std::string &path) {
    uint32_t number = 0;
    if (getrandom(&number, sizeof number, 0) != static_cast<ssize_t>(sizeof number))
        FailFor(path);
    char text[9];
    std::snprintf(text, sizeof text, "%08x", number);
    return text;
}

std::string RecordOf(const WaitingMessage &message, const std::string &hostId) {
    const std::string_view program = message.program.empty() ? "-" : message.program;
    std::string record = "1 " + hostId + " 0";
    for (const size_t bytes : {message.host.size(), program.size(), message.message.size()})
        record += " " + std::to_string(bytes);
    for (const std::string_view field : {message.header, message.host, program, message.message})
        record.append(" ").append(field);
    return record + "\n";
}

class Recovery {
public:
    Recovery(const std::string &buffer, const std::string &spool, BufferOwner owner)
        : bufferPath_(buffer), spoolPath_(spool), owner_(owner),
          name_(std::filesystem::path(buffer).filename().string()),
          home_(std::filesystem::absolute(buffer).parent_path().string()), spool_(spool),
          files_(spool_, "files") {}

    std::optional<uint64_t> Run() {
        const FileHandle lock(open(spoolPath_.c_str(), O_RDONLY | O_DIRECTORY | O_CLOEXEC));
        if (!lock || flock(lock.Get(), LOCK_EX) != 0)
            FailFor(spoolPath_);
        FinishEarlier();
        const std::optional<struct stat> status = home_.Status(name_);
        if (!status && errno == ENOENT && home_.Status(name_ + kDone))
            return std::nullopt;
        if (!status)
            FailFor(bufferPath_);
        if (!S_ISREG(status->st_mode))
            throw OutputError(bufferPath_ + ": not a regular file");
        RequireUnused();
        // The space that was reserved behind its end may be what is missing now.
        if (truncate(bufferPath_.c_str(), status->st_size) != 0)
            FailFor(bufferPath_);
        const std::string prepared = PreparedName(*status, owner_);
        const uint64_t messages = Prepare(prepared);
        if (!home_.Rename(name_, home_, name_ + kDone))
            FailFor(bufferPath_);
        Publish(prepared);
        return messages;
    }

private:
    static std::string PreparedName(const struct stat &buffer, BufferOwner owner) {
        return "buffer-" + std::to_string(buffer.st_ino) + (owner == BufferOwner::kDatabase ? kCounted : "");
    }

    // The third step of an earlier call.
    void FinishEarlier() const {
        const std::optional<struct stat> done = home_.Status(name_ + kDone);
        for (const BufferOwner owner : {BufferOwner::kDatabase, BufferOwner::kReceiver}) {
            if (done && spool_.Status(PreparedName(*done, owner)))
                Publish(PreparedName(*done, owner));
        }
    }

    // A lease for reading is given only while no process has the file open for writing. Where the file system
    // has no leases the caller must know.
    void RequireUnused() const {
        const FileHandle file = home_.Open(name_, O_RDONLY);
        if (!file)
            FailFor(bufferPath_);
        if (fcntl(file.Get(), F_SETLEASE, F_RDLCK) == 0)
            fcntl(file.Get(), F_SETLEASE, F_UNLCK);
        else if (errno == EAGAIN)
            throw OutputError(bufferPath_ + ": a process, such as syslog-ng, has it open");
    }

    uint64_t Prepare(const std::string &prepared) const {
        const FileHandle file = spool_.Open(prepared, O_WRONLY | O_CREAT | O_TRUNC);
        if (!file)
            FailFor(spoolPath_ + "/" + prepared);
        const std::string hostId = MakeHostId(spoolPath_);
        std::string block;
        const auto write = [&] {
            if (!WriteAll(file.Get(), block))
                FailFor(spoolPath_ + "/" + prepared);
            block.clear();
        };
        try {
            const uint64_t messages = ReadWaitingMessages(bufferPath_, [&](const WaitingMessage &message) {
                block += RecordOf(message, hostId);
                if (block.size() >= kBlockBytes)
                    write();
            });
            write();
            if (fsync(file.Get()) != 0 || !spool_.Sync())
                FailFor(spoolPath_ + "/" + prepared);
            return messages;
        } catch (const OutputError &) {
            spool_.Remove(prepared);
            throw;
        }
    }

    // Its own inode gives it a name that no other file has. The name comes before those that are times.
    void Publish(const std::string &prepared) const {
        const std::optional<struct stat> status = spool_.Status(prepared);
        const bool isEmpty = status && status->st_size == 0;
        const std::string name = "0-" + std::to_string(status ? status->st_ino : 0) +
                                 (prepared.ends_with(kCounted) ? kCounted : "");
        if (!status || !(isEmpty ? spool_.Remove(prepared) : spool_.Rename(prepared, files_, name)))
            FailFor(spoolPath_ + "/" + prepared);
    }

    std::string bufferPath_;
    std::string spoolPath_;
    BufferOwner owner_;
    std::string name_;
    Folder home_;
    Folder spool_;
    Folder files_;
};

} // namespace

std::optional<uint64_t> RecoverBuffer(const std::string &buffer, const std::string &spool,
                                      BufferOwner owner) {
    return Recovery(buffer, spool, owner).Run();
}

} // namespace kelo::tool
