// A log checked against 1,000 keyword rules and the notification sent, against a bare durable write of the
// same bytes.

#include <fcntl.h>
#include <unistd.h>

#include <cstdio>
#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <string>

#include "keloplatform/root.h"
#include "kelosyslog/notification.h"
#include "kelosyslog/root.h"
#include "support/folder.h"
#include "support/measure.h"

using namespace kelo::bench;

namespace {

constexpr int kRules = 1000;
constexpr int kRounds = 9;
constexpr int kSends = 50; // in a round

// The last rule is the one that fires.
void WriteRules(const std::string &root) {
    std::filesystem::create_directories(root + "/etc/kelosyslog");
    std::ofstream file(root + "/etc/kelosyslog/notify.conf");
    for (int i = 0; i < kRules; ++i)
        file << "[R" << i << "]\nnotify_type=\"2\"\nnotify_pat=\"keyword" << i
             << ".\"\nnotify_enable=\"1\"\n";
}

void InstallTexts(const std::string &root) {
    const std::string texts = root + "/usr/kelo/keloman/webman/modules/Quillbay/texts";
    std::filesystem::create_directories(texts);
    std::filesystem::copy(KELO_TEXTS, texts, std::filesystem::copy_options::recursive);
}

// The content of any entry of the spool.
std::string SpooledEntry(const std::string &root) {
    const std::filesystem::directory_iterator entries(root + "/var/spool/kelonotify/new");
    std::ifstream file(entries->path());
    return std::string(std::istreambuf_iterator<char>(file), {});
}

// Writes `content` to a temporary file, syncs it, renames it into another folder and syncs that.
void WriteFileAtomically(const std::string &folder, const std::string &content) {
    static int number = 0;
    const std::string name = "/" + std::to_string(number++);
    const int file = open((folder + "/tmp" + name).c_str(), O_WRONLY | O_CREAT | O_EXCL, 0640);
    const int target = open((folder + "/new").c_str(), O_RDONLY | O_DIRECTORY);
    const bool isWritten =
        write(file, content.data(), content.size()) == static_cast<ssize_t>(content.size()) &&
        fsync(file) == 0 &&
        std::rename((folder + "/tmp" + name).c_str(), (folder + "/new" + name).c_str()) == 0 &&
        fsync(target) == 0;
    close(target);
    close(file);
    if (!isWritten)
        Fail("cannot write to " + folder);
}

void CheckAndSend(NotificationManager &manager, const _SYSLOG_LOG_DATA_tag &log) {
    const std::string keyword = manager.CheckKeyword(log.msg);
    if (keyword.empty() || manager.NotificationSendKeyword(log.host, keyword, log) != 0)
        Fail("not sent");
}

} // namespace

int main() {
    const Folder folder("bench-notify");
    SyslogRootSet(folder.Path());
    KELORootSet(folder.Path().c_str());
    WriteRules(folder.Path());
    InstallTexts(folder.Path());
    std::filesystem::create_directories(folder.Path() + "/bare/tmp");
    std::filesystem::create_directories(folder.Path() + "/bare/new");

    NotificationManager manager;
    _SYSLOG_LOG_DATA_tag log;
    log.host = "host01";
    log.msg = "session of user 17 from 192.168.1.17 closed with keyword" + std::to_string(kRules - 1) +
              ". after 3 s";
    CheckAndSend(manager, log);
    const std::string entry = SpooledEntry(folder.Path());

    const auto repeat = [](const std::function<void()> &work) {
        return [work] {
            return Time([&] {
                for (int i = 0; i < kSends; ++i)
                    work();
            });
        };
    };
    const std::vector<double> times =
        MedianTimes({{"send", repeat([&] { CheckAndSend(manager, log); })},
                     {"bare", repeat([&] { WriteFileAtomically(folder.Path() + "/bare", entry); })}},
                    kRounds);
    PrintHeading("A log checked against " + std::to_string(kRules) + " rules and sent", "ms each");
    return PrintRatio("check and send", times[0] / kSends, "bare durable write", times[1] / kSends, 1.5) ? 0
                                                                                                         : 1;
}
