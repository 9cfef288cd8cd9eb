#pragma once

#include <sys/types.h>

#include <functional>
#include <string>

#include "support/temp_root.h"

namespace kelo::test {

struct ProgramResult {
    int status = -1; // exit status; -N when signal N ended it
    std::string out;
    std::string err;
};

// The command line, for a shell that runs in the folder and finds the programs of this build by their
// names.
std::string InFolder(const std::string &folder, const std::string &command);

// A shell that runs a command in a folder; after "exec" it is the program itself. Without a terminal, in UTC,
// with a pipe as its standard input.
class ChildProgram {
public:
    ChildProgram(const std::string &folder, const std::string &command);
    ~ChildProgram(); // kills it
    ChildProgram(const ChildProgram &) = delete;
    ChildProgram &operator=(const ChildProgram &) = delete;

    pid_t Pid() const { return pid_; }
    std::string Out() const { return ReadFile(outputs_.File("out")); } // so far
    std::string Err() const { return ReadFile(outputs_.File("err")); }
    void Send(const std::string &text) const;
    // Waits until the condition holds; false when the program ends before, or after a minute.
    bool Await(const std::function<bool()> &isReached);
    bool AwaitErr(const std::string &text);
    // Waits until "exec" has made it the program of this name.
    bool AwaitName(const std::string &name);
    // Waits for its end, with its input left open or closed.
    ProgramResult AwaitEnd();
    ProgramResult End();

private:
    bool HasEnded(int options);

    TempRoot outputs_;
    int input_ = -1;
    pid_t pid_ = -1;
    int status_ = -1; // from waitpid
    bool hasEnded_ = false;
};

// Runs a command to its end, with an empty standard input.
inline ProgramResult RunIn(const std::string &folder, const std::string &command) {
    return ChildProgram(folder, command).End();
}

} // namespace kelo::test
