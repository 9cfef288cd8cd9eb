#include "worker.h"

#include <fcntl.h>
#include <sys/wait.h>
#include <syslog.h>
#include <unistd.h>

#include <chrono>
#include <csignal>
#include <cstdarg>
#include <cstdio>
#include <thread>

#include "base/files.h"

namespace kelo::stress {
namespace {

void AppendLine(const std::string &path, const std::string &text) {
    const std::string line = std::to_string(NowMs()) + " " + text + "\n";
    const tool::FileHandle file(open(path.c_str(), O_WRONLY | O_CREAT | O_APPEND | O_CLOEXEC, 0600));
    tool::WriteAll(file.Get(), line);
}

std::string reports; // the path, in a worker

std::string ReadToEnd(int fd) {
    std::string text;
    char block[65536];
    for (ssize_t count; (count = read(fd, block, sizeof block)) > 0;)
        text.append(block, static_cast<size_t>(count));
    return text;
}

// In the child process; does not return.
[[noreturn]] void Become(std::vector<std::string> &arguments, int input, int output, const Site &site) {
    const int errors = open(site.Reports().c_str(), O_WRONLY | O_CREAT | O_APPEND, 0600);
    dup2(input, STDIN_FILENO);
    dup2(output, STDOUT_FILENO);
    dup2(errors, STDERR_FILENO);
    std::vector<char *> pointers;
    for (std::string &argument : arguments)
        pointers.push_back(argument.data());
    pointers.push_back(nullptr);
    execv(pointers.front(), pointers.data());
    _exit(127);
}

} // namespace

Worker::Worker(const Site &where, Board &shared, size_t place, uint32_t id, uint64_t seed, Database works)
    : site(where), board(shared), database(works), place_(place), id_(id), random_(seed + id),
      ledger_(where, id, works) {
    reports = where.Reports();
    std::signal(SIGPIPE, SIG_IGN); // of a program that was killed while it reads
    board.places[place].since = 0;
    std::ignore = std::freopen(reports.c_str(), "a", stderr); // what the sqlite3 tool says
}

std::vector<Token> Worker::Try(size_t count) {
    std::vector<Token> tokens;
    for (size_t i = 0; i < count; ++i)
        tokens.push_back({id_, ++tokens_});
    Note(kTried, tokens);
    return tokens;
}

void Worker::Complain(const std::string &text) const {
    AppendLine(site.Complaints(), "worker " + std::to_string(id_) + " on " + Path() + ": " + text);
}

std::string Worker::TextWith(const Token &token) {
    return TextOf(token) + " " + std::string(OneIn(50) ? 6000 : Pick(300), 'x');
}

void Worker::Pause(size_t mostMs) {
    std::this_thread::sleep_for(std::chrono::milliseconds(Pick(mostMs + 1)));
}

ProgramRun Worker::RunProgram(std::vector<std::string> arguments, const std::string &input, int mostStatus) {
    std::string line;
    for (const std::string &argument : arguments)
        line += " " + argument;
    arguments.insert(arguments.begin(), {KELO_PROGRAM, "--root", site.Root()});
    int in[2];
    int out[2];
    if (pipe2(in, O_CLOEXEC) != 0 || pipe2(out, O_CLOEXEC) != 0)
        return {127, ""};
    const pid_t process = fork();
    if (process == 0)
        Become(arguments, in[0], out[1], site);
    close(in[0]);
    close(out[1]);
    tool::WriteAll(in[1], input);
    close(in[1]);
    ProgramRun run;
    run.out = ReadToEnd(out[0]);
    close(out[0]);
    int status = 0;
    waitpid(process, &status, 0);
    run.status = WIFEXITED(status) ? WEXITSTATUS(status) : -WTERMSIG(status);
    if (arguments[3] == "db" || arguments[3] == "archive")
        AppendLine(reports, "kelosyslog" + line + ": status " + std::to_string(run.status) + " " + run.out);
    if (run.status > mostStatus || (run.status < 0 && run.status != -SIGKILL))
        Complain("kelosyslog" + line + " ended with status " + std::to_string(run.status));
    return run;
}

Operation::Operation(Worker &worker, Kind kind) : worker_(worker), kind_(kind) {
    Board::Place &place = worker.board.places[worker.place_];
    place.kind = kind;
    place.number = worker.tokens_;
    place.since = NowMs();
}

Operation::~Operation() {
    worker_.board.places[worker_.place_].since = 0;
    ++(isDone_ ? worker_.board.done : worker_.board.failed)[kind_];
}

} // namespace kelo::stress

// What the library reports, for whoever must explain a complaint.
#define KELO_REPORT                                                                                          \
    const int error = errno;                                                                                 \
    char text[2048];                                                                                         \
    va_list arguments;                                                                                       \
    va_start(arguments, format);                                                                             \
    errno = error;                                                                                           \
    std::vsnprintf(text, sizeof text, format, arguments);                                                    \
    va_end(arguments);                                                                                       \
    if ((priority & 7) <= LOG_NOTICE)                                                                        \
        kelo::stress::AppendLine(kelo::stress::reports, std::to_string(getpid()) + " " + text);              \
    errno = error;

extern "C" void syslog(int priority, const char *format, ...) {
    KELO_REPORT
}
extern "C" void __syslog_chk(int priority, int, const char *format, ...) {
    KELO_REPORT
}
