// Any command text is read without a crash or an exception, and fails with exactly one message.

#include <cstddef>
#include <cstdint>
#include <cstdlib>

#include "kelosyslog/cmdparser.h"

namespace {

int messages;

} // namespace

extern "C" void syslog(int, const char *, ...) {
    ++messages;
}
extern "C" void __syslog_chk(int, int, const char *, ...) {
    ++messages;
}

extern "C" int LLVMFuzzerTestOneInput(const uint8_t *data, size_t size) {
    std::string text(reinterpret_cast<const char *>(data), size);
    const std::string before = text;
    std::vector<Json::Value> commands(1);
    messages = 0;
    const bool parsed = CmdParser().CmdParse(text, commands);
    if (messages != (parsed ? 0 : 1) || text != before || commands.empty())
        std::abort();
    return 0;
}
