#include "keepspool/waiting_messages.h"

#include <fcntl.h>
#include <spawn.h>
#include <sys/mman.h>
#include <sys/random.h>
#include <sys/wait.h>
#include <unistd.h>

#include <array>
#include <cerrno>
#include <charconv>
#include <cstdio>
#include <cstring>
#include <optional>

#include "base/errors.h"
#include "base/files.h"

namespace kelo::tool {
namespace {

constexpr size_t kFields = 4;

[[noreturn]] void Fail(const std::string &path, const std::string &reason) {
    throw OutputError(path + ": " + reason);
}

// What stands between two fields: random bytes, which no sender knows. dqtool has no template functions that
// give lengths, and each byte may be part of a message.
std::string MakeMark(const std::string &path) {
    std::array<unsigned char, 16> bytes{};
    if (getrandom(bytes.data(), bytes.size(), 0) != static_cast<ssize_t>(bytes.size()))
        Fail(path, std::strerror(errno));
    std::string mark;
    char digits[3];
    for (const unsigned char byte : bytes) {
        std::snprintf(digits, sizeof digits, "%02x", static_cast<unsigned>(byte));
        mark += digits;
    }
    return mark;
}

std::string TemplateOf(const std::string &mark) {
    return mark + "${R_UNIXTIME} ${R_TZOFFSET} ${FACILITY} ${LEVEL} ${TAG} ${.kelo.ip}" + mark + "${HOST}" +
           mark + "${PROGRAM}" + mark + "${MESSAGE}" + mark;
}

// dqtool prints milliseconds, unlike syslog-ng as configured.
void CutFraction(std::string &header) {
    const size_t end = header.find(' ');
    const size_t point = header.find('.');
    if (point < end && end != std::string::npos)
        header.erase(point, end - point);
}

// Collects the fields out of dqtool's output, which has nothing but line feeds between two messages.
class FieldSplitter {
public:
    FieldSplitter(std::string mark, const std::function<void(const WaitingMessage &)> &take)
        : mark_(std::move(mark)), take_(take) {}

    void Add(std::string_view bytes) {
        const size_t searched = rest_.size() < mark_.size() ? 0 : rest_.size() - mark_.size();
        rest_ += bytes;
        size_t begin = 0;
        for (size_t end = rest_.find(mark_, searched); end != std::string::npos;
             end = rest_.find(mark_, begin)) {
            TakeField(rest_.substr(begin, end - begin));
            begin = end + mark_.size();
        }
        rest_.erase(0, begin);
    }

    uint64_t Messages() const { return messages_; }

private:
    // The first field of each message begins behind a mark, and what is before that is no field.
    void TakeField(std::string field) {
        if (known_ > 0)
            fields_[known_ - 1] = std::move(field);
        if (++known_ <= kFields)
            return;
        known_ = 0;
        ++messages_;
        CutFraction(fields_[0]);
        take_({fields_[0], fields_[1], fields_[2], fields_[3]});
    }

    std::string mark_;
    const std::function<void(const WaitingMessage &)> &take_;
    std::string rest_;
    std::array<std::string, kFields> fields_;
    size_t known_ = 0;
    uint64_t messages_ = 0;
};

// dqtool with this output and standard error.
pid_t StartDqtool(const std::string &path, const std::string &format, int output, int errors) {
    posix_spawn_file_actions_t actions;
    posix_spawn_file_actions_init(&actions);
    posix_spawn_file_actions_addopen(&actions, STDIN_FILENO, "/dev/null", O_RDONLY, 0);
    posix_spawn_file_actions_adddup2(&actions, output, STDOUT_FILENO);
    posix_spawn_file_actions_adddup2(&actions, errors, STDERR_FILENO);
    const std::array<const char *, 6> words = {"dqtool", "cat", "-t", format.c_str(), path.c_str(), nullptr};
    pid_t process = 0;
    const int error =
        posix_spawnp(&process, "dqtool", &actions, nullptr, const_cast<char *const *>(words.data()), environ);
    posix_spawn_file_actions_destroy(&actions);
    if (error != 0)
        Fail(path, std::string("dqtool, of syslog-ng, cannot be started: ") + std::strerror(error));
    return process;
}

std::string TextOf(int file) {
    std::string text(4096, '\0');
    const ssize_t bytes = pread(file, text.data(), text.size(), 0);
    text.resize(bytes > 0 ? static_cast<size_t>(bytes) : 0);
    return text;
}

// The number in "...; number_of_messages='3003'".
std::optional<uint64_t> NumberIn(const std::string &text) {
    constexpr std::string_view kName = "number_of_messages='";
    uint64_t number = 0;
    const size_t at = text.find(kName);
    if (at == std::string::npos)
        return std::nullopt;
    const char *begin = text.data() + at + kName.size();
    return std::from_chars(begin, text.data() + text.size(), number).ec == std::errc() ? std::optional(number)
                                                                                       : std::nullopt;
}

} // namespace

uint64_t ReadWaitingMessages(const std::string &path,
                             const std::function<void(const WaitingMessage &)> &take) {
    int ends[2];
    const FileHandle errors(memfd_create("dqtool", MFD_CLOEXEC));
    if (!errors || pipe2(ends, O_CLOEXEC) != 0)
        Fail(path, std::strerror(errno));
    const FileHandle reader(ends[0]);
    FileHandle writer(ends[1]);
    const std::string mark = MakeMark(path);
    const pid_t process = StartDqtool(path, TemplateOf(mark), writer.Get(), errors.Get());
    writer = FileHandle();

    FieldSplitter fields(mark, take);
    std::string block(64 * 1024, '\0');
    for (ssize_t bytes;
         (bytes = read(reader.Get(), block.data(), block.size())) > 0 || (bytes < 0 && errno == EINTR);) {
        if (bytes > 0)
            fields.Add({block.data(), static_cast<size_t>(bytes)});
    }
    int status = 0;
    while (waitpid(process, &status, 0) < 0 && errno == EINTR) {
    }
    const std::string said = TextOf(errors.Get());
    const std::optional<uint64_t> number = NumberIn(said);
    if (status != 0 || !number)
        Fail(path, "dqtool cannot read it: " + said);
    if (fields.Messages() != *number)
        Fail(path, "it is damaged: " + std::to_string(fields.Messages()) + " of " + std::to_string(*number) +
                       " messages can be read");
    return *number;
}

} // namespace kelo::tool
