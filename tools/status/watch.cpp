#include "status/watch.h"

#include <sys/ioctl.h>
#include <termios.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <csignal>

#include "base/errors.h"
#include "base/event_loop.h"
#include "base/files.h"
#include "print/output.h"

namespace kelo::tool {
namespace {

constexpr const char *kEnter = "\x1b[?1049h\x1b[?25l"; // the alternate screen, no cursor
constexpr const char *kLeave = "\x1b[?25h\x1b[?1049l";

// The terminal of the standard output while screens are drawn in place on it; nothing otherwise.
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
    // Whether keys come from the standard input.
    bool IsInput() const { return isInput_; }
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

} // namespace

void Watch(const WatchOptions &options, const DrawScreen &draw) {
    EventLoop loop;
    bool isOver = false;
    bool isDue = false;
    const auto end = [&] { isOver = true; };
    const auto next = [&] { isDue = true; };
    const EventSource signals[] = {loop.AddSignal(SIGINT, end), loop.AddSignal(SIGTERM, end),
                                   loop.AddSignal(SIGHUP, end), loop.AddSignal(SIGWINCH, next)};
    Terminal terminal(options.inPlace);
    const EventSource reader = loop.AddHangUp(STDOUT_FILENO, [] { throw OutputClosed(); });
    EventSource keys;
    if (terminal.IsInput())
        keys = loop.AddInput(STDIN_FILENO, [&] { isOver = terminal.IsQuitTyped(); });
    EventSource pause = loop.AddTimer(next);
    Output output(false);
    for (bool isFirst = true; !isOver; isFirst = false) {
        const std::string screen = draw(terminal.IsOutput() ? Terminal::Height() : 0);
        output.Write(terminal.IsOutput() ? InPlace(screen) : (isFirst ? "" : options.separator) + screen);
        output.Flush();
        isDue = false;
        pause.FireAt(std::chrono::steady_clock::now() + options.pause);
        while (!isDue && !isOver)
            loop.Wait();
    }
}

} // namespace kelo::tool
