#include "network/run_program.h"

#include <fcntl.h>
#include <spawn.h>
#include <sys/wait.h>
#include <unistd.h>

#include <cerrno>
#include <cstdlib>
#include <cstring>

#include "base/errors.h"
#include "base/files.h"

namespace kelo::tool {
namespace {

constexpr size_t kMostOutput = 65536;

// The path of a program, which ordinary users have no folder of system programs for; its name if there is
// none.
std::string PathOf(const std::string &program) {
    const char *path = std::getenv("PATH");
    const std::string folders = std::string(path != nullptr ? path : "") + ":/usr/sbin:/sbin:/usr/bin:/bin:";
    for (size_t begin = 0, end; (end = folders.find(':', begin)) != std::string::npos; begin = end + 1) {
        std::string file = folders.substr(begin, end - begin) + "/" + program;
        if (end > begin && access(file.c_str(), X_OK) == 0)
            return file;
    }
    return program;
}

// Its input is empty, and both outputs go to `output`.
class Redirections {
public:
    explicit Redirections(int output) {
        posix_spawn_file_actions_init(&actions_);
        posix_spawn_file_actions_addopen(&actions_, STDIN_FILENO, "/dev/null", O_RDONLY, 0);
        posix_spawn_file_actions_adddup2(&actions_, output, STDOUT_FILENO);
        posix_spawn_file_actions_adddup2(&actions_, output, STDERR_FILENO);
    }
    ~Redirections() { posix_spawn_file_actions_destroy(&actions_); }
    Redirections(const Redirections &) = delete;
    Redirections &operator=(const Redirections &) = delete;

    const posix_spawn_file_actions_t *Get() const { return &actions_; }

private:
    posix_spawn_file_actions_t actions_{};
};

std::string ReadToEnd(const FileHandle &file) {
    std::string text;
    char buffer[4096];
    for (ssize_t size;
         (size = read(file.Get(), buffer, sizeof buffer)) > 0 || (size < 0 && errno == EINTR);) {
        if (size > 0 && text.size() < kMostOutput)
            text.append(buffer, static_cast<size_t>(size));
    }
    return text;
}

} // namespace

ProgramRun RunAndWait(const std::vector<std::string> &arguments) {
    int ends[2];
    if (pipe2(ends, O_CLOEXEC) != 0)
        throw OutputError("cannot run " + arguments.front() + ": " + std::strerror(errno));
    const FileHandle reader(ends[0]);
    FileHandle writer(ends[1]);
    std::vector<char *> words;
    words.reserve(arguments.size() + 1);
    for (const std::string &argument : arguments)
        words.push_back(const_cast<char *>(argument.c_str()));
    words.push_back(nullptr);
    pid_t pid = 0;
    const Redirections redirections(writer.Get());
    const int error = posix_spawn(&pid, PathOf(arguments.front()).c_str(), redirections.Get(), nullptr,
                                  words.data(), environ);
    if (error != 0)
        throw OutputError("cannot run " + arguments.front() + ": " + std::strerror(error));
    writer = FileHandle();
    ProgramRun run;
    run.output = ReadToEnd(reader);
    int status = 0;
    while (waitpid(pid, &status, 0) < 0 && errno == EINTR) {
    }
    run.status = WIFEXITED(status) ? WEXITSTATUS(status) : 128 + WTERMSIG(status);
    return run;
}

} // namespace kelo::tool
