#include "status/watch.h"

#include <poll.h>
#include <sys/ioctl.h>
#include <sys/signalfd.h>
#include <termios.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <csignal>

#include "base/errors.h"
#include "base/files.h"
#include "print/output.h"

namespace kelo::tool {
namespace {

constexpr const char *kEnter = "\x1b[?1049h\x1b[?25l"; // the alternate screen, no cursor
constexpr const char *kLeave = "\x1b[?25h\x1b[?1049l";

// Takes the signals that end or resize, for as long as it lives.
class Signals {
public:
    Signals() {
        sigset_t set;
        sigemptyset(&set);
        for (const int signal : {SIGINT, SIGTERM, SIGHUP, SIGWINCH})
            sigaddset(&set, signal);
        sigprocmask(SIG_BLOCK, &set, &before_);
        file_ = FileHandle(signalfd(-1, &set, SFD_CLOEXEC | SFD_NONBLOCK));
    }
    ~Signals() { sigprocmask(SIG_SETMASK, &before_, nullptr); }
    Signals(const Signals &) = delete;
    Signals &operator=(const Signals &) = delete;

    int File() const { return file_.Get(); }
    // Whether one of those that came means the end. They are taken away: none strikes later.
    bool IsEnd() const {
        bool isEnd = false;
        for (signalfd_siginfo signal{}; read(File(), &signal, sizeof signal) == sizeof signal;)
            isEnd = isEnd || signal.ssi_signo != SIGWINCH;
        return isEnd;
    }

private:
    sigset_t before_{};
    FileHandle file_;
};

// The terminal of the standard output while screens are drawn in place on it; nothing where they are not.
class Terminal {
public:
    explicit Terminal(bool mayDraw) : isOutput_(mayDraw && isatty(STDOUT_FILENO) == 1) {
        isInput_ = isOutput_ && tcgetattr(STDIN_FILENO, &before_) == 0;
        if (!isOutput_)
            return;
        if (isInput_) {
            termios keys = before_;
            keys.c_lflag &= ~static_cast<tcflag_t>(ICANON | ECHO);
            keys.c_cc[VSUSP] = _POSIX_VDISABLE; // a stopped program would leave its screen behind
            keys.c_cc[VMIN] = 0;
            keys.c_cc[VTIME] = 0;
            tcsetattr(STDIN_FILENO, TCSANOW, &keys);
        }
        WriteAll(STDOUT_FILENO, kEnter);
    }
    ~Terminal() {
        if (isOutput_)
            WriteAll(STDOUT_FILENO, kLeave);
        if (isInput_)
            tcsetattr(STDIN_FILENO, TCSANOW, &before_);
    }
    Terminal(const Terminal &) = delete;
    Terminal &operator=(const Terminal &) = delete;

    bool IsOutput() const { return isOutput_; }
    // What to wait for keys on; -1 for nothing.
    int Input() const { return isInput_ ? STDIN_FILENO : -1; }
    bool IsQuitTyped() {
        char key = 0;
        const ssize_t size = read(STDIN_FILENO, &key, 1);
        if (size == 0 || (size < 0 && errno != EAGAIN && errno != EINTR))
            isKeyboardGone_ = true;
        return isKeyboardGone_ || key == 'q' || key == 'Q';
    }
    static size_t Height() {
        winsize size{};
        return ioctl(STDOUT_FILENO, TIOCGWINSZ, &size) == 0 ? size.ws_row : 0;
    }

private:
    termios before_{};
    bool isOutput_;
    bool isInput_ = false;
    bool isKeyboardGone_ = false;
};

// The screen over the one before: each line is erased before it is written.
std::string InPlace(const std::string &screen) {
    std::string text = "\x1b[H";
    for (size_t at = 0; at < screen.size();) {
        const size_t end = std::min(screen.find('\n', at), screen.size());
        text += (at == 0 ? "" : "\n") + ("\x1b[K" + screen.substr(at, end - at));
        at = end + 1;
    }
    return text + "\x1b[J";
}

// Waits for the next screen; false when there is to be none.
bool WaitForNext(std::chrono::milliseconds pause, const Signals &signals, Terminal &terminal) {
    pollfd waiting[] = {{signals.File(), POLLIN, 0}, {terminal.Input(), POLLIN, 0}, {STDOUT_FILENO, 0, 0}};
    const auto deadline = std::chrono::steady_clock::now() + pause;
    while (true) {
        const auto left = std::chrono::duration_cast<std::chrono::milliseconds>(
            deadline - std::chrono::steady_clock::now());
        const int count = poll(waiting, 3, static_cast<int>(std::max<int64_t>(left.count(), 0)));
        if (count == 0)
            return true;
        if (count < 0)
            continue; // EINTR: a signal that is not taken here, such as a debugger's
        if (waiting[0].revents != 0)
            return !signals.IsEnd();
        if (waiting[2].revents != 0)
            throw OutputClosed();
        if (waiting[1].revents != 0 && terminal.IsQuitTyped())
            return false;
    }
}

} // namespace

void Watch(const WatchOptions &options, const DrawScreen &draw) {
    const Signals signals;
    Terminal terminal(options.inPlace);
    Output output(false);
    for (bool isFirst = true;; isFirst = false) {
        const std::string screen = draw(terminal.IsOutput() ? Terminal::Height() : 0);
        output.Write(terminal.IsOutput() ? InPlace(screen) : (isFirst ? "" : options.separator) + screen);
        output.Flush();
        if (!WaitForNext(options.pause, signals, terminal))
            return;
    }
}

} // namespace kelo::tool
