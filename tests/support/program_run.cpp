#include "support/program_run.h"

#include <sys/wait.h>

#include <cstdlib>

#include "support/temp_root.h"

namespace kelo::test {
namespace {

std::string Quoted(std::string text) {
    for (size_t at = 0; (at = text.find('\'', at)) != std::string::npos; at += 4)
        text.replace(at, 1, "'\\''");
    return "'" + text + "'";
}

} // namespace

ProgramResult RunTool(const ProgramRun &run) {
    const TempRoot root;
    const std::string out = run.stdoutPath.empty() ? root.File("out") : run.stdoutPath;
    std::string command = "exec env TZ=UTC0";
    for (const std::string &entry : run.environment)
        command += " " + Quoted(entry);
    command += " " KELOSYSLOG_PROGRAM;
    for (const std::string &argument : run.arguments)
        command += " " + Quoted(argument);
    command += " </dev/null >" + out + " 2>" + root.File("err");
    const int status = std::system(command.c_str());
    return {WIFEXITED(status) ? WEXITSTATUS(status) : -1, run.stdoutPath.empty() ? ReadFile(out) : "",
            ReadFile(root.File("err"))};
}

} // namespace kelo::test
