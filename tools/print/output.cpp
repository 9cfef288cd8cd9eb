#include "print/output.h"

#include <poll.h>
#include <sys/wait.h>
#include <unistd.h>

#include <cerrno>
#include <csignal>
#include <cstdlib>
#include <cstring>
#include <utility>

#include "base/errors.h"

namespace kelo::tool {
namespace {

constexpr size_t kBufferSize = 64 * 1024;

// Whether somebody else lets the user run this program, who then must not run others with it.
bool IsLent() {
    return std::getenv("SUDO_UID") != nullptr || geteuid() != getuid();
}

std::string PagerCommand() {
    if (IsLent())
        return "less";
    const char *pager = std::getenv("PAGER");
    return pager == nullptr ? "less" : pager;
}

// In the child: the pager reads from the pipe and gets the signals that we ignore.
[[noreturn]] void RunPager(const std::string &command, int readEnd) {
    dup2(readEnd, STDIN_FILENO);
    setenv("LESS", "FRX", 0); // leave when it fits on the screen, show colours
    if (IsLent())
        setenv("LESSSECURE", "1", 1); // no commands, no other files
    std::signal(SIGPIPE, SIG_DFL);
    execl("/bin/sh", "sh", "-c", command.c_str(), nullptr);
    _exit(127);
}

} // namespace

ColourMode ParseColourMode(const std::string &name) {
    if (name == "auto")
        return ColourMode::Auto;
    if (name == "always")
        return ColourMode::Always;
    if (name == "never")
        return ColourMode::Never;
    throw UsageError("--color: '" + name + "' is none of auto, always, never");
}

bool WantsColour(ColourMode mode, bool isTerminal, const char *noColor, const char *term) {
    if (mode != ColourMode::Auto)
        return mode == ColourMode::Always;
    const bool isForbidden = noColor != nullptr && *noColor != '\0';
    const bool isDumb = term == nullptr || std::strcmp(term, "dumb") == 0;
    return isTerminal && !isForbidden && !isDumb;
}

bool WantsColour(ColourMode mode) {
    return WantsColour(mode, isatty(STDOUT_FILENO) == 1, std::getenv("NO_COLOR"), std::getenv("TERM"));
}

Output::Output(bool mayPage) : mayPage_(mayPage && isatty(STDOUT_FILENO) == 1) {}

Output::~Output() {
    ClosePager();
}

void Output::StartPager() {
    mayPage_ = false;
    const std::string command = PagerCommand();
    int ends[2];
    if (command.empty() || command == "cat" || pipe(ends) != 0)
        return;
    const FileHandle readEnd(ends[0]);
    FileHandle writeEnd(ends[1]);
    pager_ = fork();
    if (pager_ == 0) {
        writeEnd = FileHandle();
        RunPager(command, readEnd.Get());
    }
    if (pager_ > 0)
        pipe_ = std::move(writeEnd);
}

void Output::ClosePager() {
    if (pager_ <= 0)
        return;
    pipe_ = FileHandle();
    while (waitpid(pager_, nullptr, 0) < 0 && errno == EINTR) {
    }
    pager_ = -1;
}

int Output::File() const {
    return pipe_ ? pipe_.Get() : STDOUT_FILENO;
}

void Output::Write(std::string_view text) {
    if (text.size() >= kBufferSize) {
        Flush();
        WriteThrough(text);
        return;
    }
    buffer_ += text;
    if (buffer_.size() >= kBufferSize)
        Flush();
}

void Output::Flush() {
    WriteThrough(buffer_);
    buffer_.clear();
}

void Output::WriteThrough(std::string_view rest) {
    if (mayPage_ && !rest.empty())
        StartPager();
    while (!rest.empty()) {
        const ssize_t written = write(File(), rest.data(), rest.size());
        if (written >= 0) {
            rest.remove_prefix(static_cast<size_t>(written));
        } else if (errno == EAGAIN) {
            pollfd waiting{File(), POLLOUT, 0};
            poll(&waiting, 1, -1);
        } else if (errno == EPIPE) {
            throw OutputClosed();
        } else if (errno != EINTR) {
            throw OutputError(std::string("cannot write the output: ") + std::strerror(errno));
        }
    }
}

void Output::Wait(int timeoutMs) const {
    pollfd waiting{File(), 0, 0}; // no event requested: only a failure ends the wait
    if (poll(&waiting, 1, timeoutMs) > 0 && (waiting.revents & (POLLERR | POLLHUP | POLLNVAL)) != 0)
        throw OutputClosed();
}

void Output::Finish() {
    Flush();
    ClosePager();
}

} // namespace kelo::tool
