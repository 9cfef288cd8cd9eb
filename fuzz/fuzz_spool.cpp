// What a service may have left in the spool and as the receiver's state is read, or refused with a reason.

#include <fuzzer/FuzzedDataProvider.h>

#include "folder.h"
#include "kelonotify/feed.h"
#include "receive/receiver_state.h"
#include "status/notifications.h"

using namespace kelo::tool;

// The rest of the input is each of the files.
extern "C" int LLVMFuzzerTestOneInput(const uint8_t *data, size_t size) {
    static const std::string root = FuzzFolder();
    static const Spool spool = [] {
        Spool made(root);
        made.CreateFolders();
        std::filesystem::create_directories(root + "/run/kelosyslog");
        return made;
    }();
    const std::string content(reinterpret_cast<const char *>(data), size);
    const std::string id = "000000000001.0-1-0";
    WriteFuzzFile(ReceiverStatePath(root), content);
    WriteFuzzFile(spool.File("channels.json"), content);
    WriteFuzzFile(spool.File("new/" + id + ".json"), content);
    WriteFuzzFile(spool.File("state/" + id + ".json"), content);
    WriteFuzzFile(spool.File("desktop/feed.jsonl"), content);
    if (const auto state = ReadReceiverState(root); state && !WriteReceiverState(root, *state))
        Fail("what was read as a state cannot be written", content);
    GatherNotifications(root);
    spool.SaveProgress(id, spool.ReadProgress(id));
    try {
        const Entry entry = spool.ReadNew(id);
        if (Feed(spool).Add(entry) == Feed::Added::No)
            Fail("not added to the feed", content);
        if (Feed(spool).Add(entry) != Feed::Added::AlreadyThere)
            Fail("added to the feed twice", content);
    } catch (const SpoolError &error) {
        Fail("the spool", error.what());
    } catch (const std::runtime_error &) { // damaged
    }
    return 0;
}
