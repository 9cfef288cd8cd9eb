#include "status/message_spool.h"

#include "base/folder.h"

namespace kelo::tool {
namespace {

std::optional<uint64_t> BytesOfFiles(const std::string &path) {
    const Folder folder(path);
    const auto names = folder.Names();
    if (!names)
        return std::nullopt;
    uint64_t sum = 0;
    for (const std::string &name : *names) {
        const std::optional<struct stat> status = folder.Status(name); // keep-spool may remove it meanwhile
        if (status && S_ISREG(status->st_mode))
            sum += static_cast<uint64_t>(status->st_size);
    }
    return sum;
}

} // namespace

MessageSpoolStatus GatherMessageSpool(const std::string &root, const NetworkStatus &network) {
    MessageSpoolStatus status;
    if (!network.isUsed || network.settings.spool.empty())
        return status;
    status.folder = root + network.settings.spool;
    status.bytes = BytesOfFiles(status.folder + "/files");
    return status;
}

} // namespace kelo::tool
