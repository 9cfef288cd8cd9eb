#include "damage.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <string>

#include "base/files.h"

namespace kelo::stress {
namespace {

constexpr size_t kPageBytes = 4096;
// The format of a write-ahead log: a header, then frames with a header and a page each.
constexpr size_t kWalHeaderBytes = 32;
constexpr size_t kFrameHeaderBytes = 24;
constexpr size_t kFrameBytes = kFrameHeaderBytes + kPageBytes;

class Bytes {
public:
    explicit Bytes(const std::string &path) : file_(open(path.c_str(), O_RDWR | O_CLOEXEC)) {
        struct stat status {};
        if (file_ && fstat(file_.Get(), &status) == 0)
            size_ = static_cast<size_t>(status.st_size);
    }
    size_t Size() const { return size_; }
    std::string Read(size_t at, size_t count) const {
        std::string bytes(count, '\0');
        const ssize_t got = pread(file_.Get(), bytes.data(), count, static_cast<off_t>(at));
        bytes.resize(got > 0 ? static_cast<size_t>(got) : 0);
        return bytes;
    }
    void Overwrite(size_t at, size_t count) const {
        const std::string bytes(count, '\xff');
        std::ignore = pwrite(file_.Get(), bytes.data(), count, static_cast<off_t>(at));
    }

private:
    tool::FileHandle file_;
    size_t size_ = 0;
};

size_t Below(size_t end, std::mt19937_64 &random) {
    return std::uniform_int_distribution<size_t>(0, end - 1)(random);
}

void NoteTokens(Fact fact, const std::string &bytes, Ledger &ledger) {
    std::vector<Token> tokens;
    FindTokens(bytes, [&](const Token &token) { tokens.push_back(token); });
    if (!tokens.empty())
        ledger.Note(fact, tokens);
}

bool OverwritePages(const Bytes &file, std::mt19937_64 &random, Ledger &ledger) {
    const size_t pages = file.Size() / kPageBytes;
    if (pages < 2)
        return false;
    for (size_t count = 1 + Below(3, random); count > 0; --count) {
        const size_t at = (1 + Below(pages - 1, random)) * kPageBytes;
        NoteTokens(kDestroyed, file.Read(at, kPageBytes), ledger);
        file.Overwrite(at, kPageBytes);
    }
    return true;
}

// Either what tells SQLite that it is a database, or the start of the schema.
bool OverwriteHeader(const Bytes &file, std::mt19937_64 &random) {
    if (file.Size() < kPageBytes)
        return false;
    Below(2, random) == 0 ? file.Overwrite(0, 16) : file.Overwrite(100, 8);
    return true;
}

// SQLite may give up all transactions from that of the frame on, some of which may be in the database
// already. Then pages of different times make one tree, and what is written next can hit any of them.
bool OverwriteFrame(const Bytes &file, const Bytes &wal, std::mt19937_64 &random, Ledger &ledger) {
    if (wal.Size() < kWalHeaderBytes + kFrameBytes)
        return false;
    NoteTokens(kEndangered, file.Read(0, file.Size()) + wal.Read(0, wal.Size()), ledger);
    const size_t frame = Below((wal.Size() - kWalHeaderBytes) / kFrameBytes, random);
    wal.Overwrite(kWalHeaderBytes + frame * kFrameBytes + kFrameHeaderBytes, kPageBytes);
    return true;
}

} // namespace

bool Inflict(Damage damage, const std::string &path, std::mt19937_64 &random, Ledger &ledger) {
    switch (damage) {
    case Damage::kPages:
        return OverwritePages(Bytes(path), random, ledger);
    case Damage::kHeader:
        return OverwriteHeader(Bytes(path), random);
    case Damage::kWal:
        return OverwriteFrame(Bytes(path), Bytes(path + "-wal"), random, ledger);
    }
    return false;
}

} // namespace kelo::stress
