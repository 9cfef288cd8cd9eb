// recover-buffer: hands the messages that wait in a disk buffer of an earlier way of storing over to the
// message spool. The upgrade of the package calls it, and the administrator who changes the way.

#include <sys/stat.h>

#include <cstdio>
#include <string>

#include "base/errors.h"
#include "keepspool/buffer_recovery.h"

int main(int argc, char **argv) {
    using kelo::tool::BufferOwner;
    const std::string owner = argc > 1 ? argv[1] : "";
    if (argc < 3 || argc > 4 || (owner != "database" && owner != "receiver")) {
        std::fprintf(
            stderr, "usage: recover-buffer database|receiver FILE.rqf [SPOOL]\n"
                    "Stores what waits in the disk buffer of this way, which syslog-ng has not open, by the\n"
                    "message spool (/var/spool/kelosyslog). It may be called again when it was killed.\n");
        return 2;
    }
    umask(027);
    try {
        const std::string spool = argc > 3 ? argv[3] : "/var/spool/kelosyslog";
        const std::optional<uint64_t> messages = kelo::tool::RecoverBuffer(
            argv[2], spool, owner == "database" ? BufferOwner::kDatabase : BufferOwner::kReceiver);
        std::printf("%s%s is in the message spool and has the name %s.done now\n",
                    messages ? (std::to_string(*messages) + " messages: ").c_str() : "", argv[2], argv[2]);
    } catch (const kelo::tool::OutputError &error) {
        std::fprintf(stderr, "recover-buffer: %s\n", error.what());
        return 1;
    }
    return 0;
}
