#include "support/child_program.h"

#include <fcntl.h>
#include <gtest/gtest.h>
#include <sys/wait.h>
#include <unistd.h>

#include <chrono>
#include <csignal>
#include <thread>
#include <utility>

#include "support/source_dir.h"

namespace kelo::test {

std::string InFolder(const std::string &folder, const std::string &command) {
    return "cd '" + folder + "' && PATH=" + BuildPath("bin") + ":$PATH TZ=UTC0 && export PATH TZ && " +
           command;
}

ChildProgram::ChildProgram(const std::string &folder, const std::string &command) {
    const std::string line =
        "exec >" + outputs_.File("out") + " 2>" + outputs_.File("err") + "; " + InFolder(folder, command);
    int ends[2];
    EXPECT_EQ(pipe2(ends, O_CLOEXEC), 0);
    pid_ = fork();
    if (pid_ == 0) {
        for (const int signal : {SIGHUP, SIGINT, SIGQUIT}) // ignored under nohup and in the background
            std::signal(signal, SIG_DFL);
        dup2(ends[0], STDIN_FILENO);
        execl("/bin/sh", "sh", "-c", line.c_str(), nullptr);
        _exit(127);
    }
    close(ends[0]);
    input_ = ends[1];
}

ChildProgram::~ChildProgram() {
    if (!hasEnded_)
        kill(pid_, SIGKILL);
    End();
}

void ChildProgram::Send(const std::string &text) const {
    EXPECT_EQ(write(input_, text.data(), text.size()), static_cast<ssize_t>(text.size()));
}

bool ChildProgram::HasEnded(int options) {
    hasEnded_ = hasEnded_ || waitpid(pid_, &status_, options) == pid_;
    return hasEnded_;
}

bool ChildProgram::Await(const std::function<bool()> &isReached) {
    const auto deadline = std::chrono::steady_clock::now() + std::chrono::minutes(1);
    while (!isReached()) {
        if (HasEnded(WNOHANG) || std::chrono::steady_clock::now() > deadline)
            return isReached();
        std::this_thread::sleep_for(std::chrono::milliseconds(2));
    }
    return true;
}

bool ChildProgram::AwaitErr(const std::string &text) {
    return Await([&] { return Err().find(text) != std::string::npos; });
}

bool ChildProgram::AwaitName(const std::string &name) {
    const std::string path = "/proc/" + std::to_string(pid_) + "/comm";
    return Await([&] { return ReadFile(path) == name.substr(0, 15) + "\n"; });
}

ProgramResult ChildProgram::AwaitEnd() {
    HasEnded(0);
    return {WIFEXITED(status_) ? WEXITSTATUS(status_) : -WTERMSIG(status_), Out(), Err()};
}

ProgramResult ChildProgram::End() {
    if (input_ >= 0)
        close(std::exchange(input_, -1));
    return AwaitEnd();
}

} // namespace kelo::test
