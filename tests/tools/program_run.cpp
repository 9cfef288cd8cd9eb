#include "program_run.h"

#include <fcntl.h>
#include <sys/wait.h>
#include <unistd.h>

#include <cstdlib>
#include <stdexcept>

#include "support/temp_root.h"

namespace kelo::test {
namespace {

[[noreturn]] void Execute(const ProgramRun &run, const std::string &out, const std::string &err) {
    dup2(open("/dev/null", O_RDONLY), STDIN_FILENO);
    dup2(open(out.c_str(), O_WRONLY | O_CREAT, 0600), STDOUT_FILENO);
    dup2(open(err.c_str(), O_WRONLY | O_CREAT, 0600), STDERR_FILENO);
    setenv("TZ", "UTC0", 1);
    for (const std::string &entry : run.environment)
        setenv(entry.substr(0, entry.find('=')).c_str(), entry.substr(entry.find('=') + 1).c_str(), 1);
    std::vector<char *> arguments = {const_cast<char *>("kelosyslog")};
    for (const std::string &argument : run.arguments)
        arguments.push_back(const_cast<char *>(argument.c_str()));
    arguments.push_back(nullptr);
    execv(KELOSYSLOG_PROGRAM, arguments.data());
    _exit(127);
}

} // namespace

ProgramResult RunTool(const ProgramRun &run) {
    const TempRoot root;
    const std::string out = run.stdoutPath.empty() ? root.File("out") : run.stdoutPath;
    const std::string err = root.File("err");
    const pid_t child = fork();
    if (child == 0)
        Execute(run, out, err);
    int status = 0;
    if (child < 0 || waitpid(child, &status, 0) != child)
        throw std::runtime_error("cannot run kelosyslog");
    return {WIFEXITED(status) ? WEXITSTATUS(status) : -1, run.stdoutPath.empty() ? ReadFile(out) : "",
            ReadFile(err)};
}

} // namespace kelo::test
