#include <json/json.h>

#include <fstream>

#include "keloplatform/kelonotify.h"
#include "keloplatform/torvc.h"
#include "notify/notify_fixture.h"
#include "support/source_dir.h"

using namespace kelo::test;

namespace {

constexpr char kTexts[] = "/usr/kelo/keloman/webman/modules/Quillbay/texts/";
constexpr char kAllOn[] =
    "smtp_mail_enabled=\"yes\"\nsms_enabled=\"yes\"\npushservice_mobile_enabled=\"yes\"\n"
    "pushservice_msn_enabled=\"no\"\npushservice_skype_enabled=\"yes\"\n";

class NotificationService : public NotifyTest {
protected:
    NotificationService() { NotifyCalls::AnswerWith(std::nullopt); }

    void InstallTexts() {
        std::filesystem::create_directories(root_.Path() + kTexts);
        std::filesystem::copy(SourcePath("package/texts"), root_.Path() + kTexts,
                              std::filesystem::copy_options::recursive);
    }

    int Send(const char *tag, const std::map<std::string, std::string> &values) {
        TORVSZHASH *hash = TORVCSzHashAlloc(8);
        for (const auto &[key, value] : values)
            TORVCSzHashSetValue(&hash, key.c_str(), value.c_str());
        const int result = SyslogMailSend(tag, &hash);
        TORVCSzHashFree(hash);
        return result;
    }

    std::vector<std::filesystem::path> Spooled(const char *folder = "new") const {
        std::set<std::filesystem::path> files;
        std::error_code missing;
        for (const auto &file :
             std::filesystem::directory_iterator(root_.File("var/spool/kelonotify/") + folder, missing))
            files.insert(file.path());
        return {files.begin(), files.end()};
    }

    // The only entry of the spool, which is then taken out.
    Json::Value Take() {
        Json::Value entry;
        for (const std::filesystem::path &file : Spooled()) {
            EXPECT_TRUE(entry.isNull()) << "more than one";
            std::ifstream(file) >> entry;
            EXPECT_EQ(file.filename(), entry["id"].asString() + ".json");
            std::filesystem::remove(file);
        }
        EXPECT_THAT(Spooled("tmp"), IsEmpty());
        return entry;
    }

    std::string TakeChannels() {
        const Json::Value entry = Take();
        std::string channels;
        for (const Json::Value &channel : entry["channels"])
            channels += channel.asString() + " ";
        return channels;
    }
};

} // namespace

TEST_F(NotificationService, SpoolsTheRenderedMessageWithAllThatDeliveryNeeds) {
    InstallTexts();
    WriteSettings(kAllOn);
    WriteRules(RuleText("r", 1, "0", "100", ""));
    const time_t before = time(nullptr);
    ASSERT_EQ(NotificationManager().NotificationSendKeyword("h\xFF\r\nBcc: x", "%HOST% \\n",
                                                            "say \"%KEYWORD%\" \\o/\n\x1B[0m"),
              0);
    struct stat status;
    ASSERT_EQ(stat(Spooled().at(0).c_str(), &status), 0);
    EXPECT_EQ(status.st_mode & 0007u, 0u);
    const Json::Value entry = Take();
    EXPECT_EQ(entry["version"].asInt(), 1);
    EXPECT_GE(entry["time"].asInt64(), before);
    EXPECT_EQ(entry["tag"].asString(), "KELOSYSLOG_KEYWORD_MATCH");
    EXPECT_EQ(entry["language"].asString(), "enu");
    EXPECT_EQ(entry["class"].asString(), "KELO.ZRT.Quillbay.BuiltIn");
    EXPECT_EQ(entry["channels"].size(), 5u);
    EXPECT_EQ(entry["title"].asString(), "Log with keyword %HOST% \\n from h\uFFFD  Bcc: x");
    EXPECT_EQ(entry["body"].asString(),
              "The log server received a log with the keyword %HOST% \\n.\n\nHost: h\uFFFD\\x0D\nBcc: x\n"
              "Log: say \"%KEYWORD%\" \\o/\n\\x1B[0m\n");
    EXPECT_EQ(entry["values"].size(), 3u);
    EXPECT_EQ(entry["values"]["%SYSLOG_CONTENT%"].asString(), "say \\\"%KEYWORD%\\\" \\\\o/\n\x1B[0m");
    EXPECT_THAT(Messages(), IsEmpty());
}

TEST_F(NotificationService, HasATextForEveryTagInEnglishAndGerman) {
    InstallTexts();
    std::set<std::string> bodies; // a missing German text would be the English one again
    for (const std::string language : {"enu", "ger"}) {
        WriteSettings("notify_language=\"" + language + "\"\n");
        for (const std::string tag :
             {"EPS_EXCEED", "SEV_EXCEED", "KEYWORD_MATCH", "VOL_FULL", "DB_CORRUPT", "ShareRemove",
              "ShareRename", "ShareEncMount", "ShareEncUnmount", "TEST"}) {
            ASSERT_EQ(Send(("KELOSYSLOG_" + tag).c_str(), {}), 0);
            const Json::Value entry = Take();
            EXPECT_NE(entry["title"].asString(), "Notification KELOSYSLOG_" + tag);
            EXPECT_TRUE(bodies.insert(entry["body"].asString()).second) << language << " " << tag;
        }
    }
}

TEST_F(NotificationService, GivesAPlainMessageWhereThereIsNoText) {
    InstallTexts();
    WriteSettings("notify_language=\"../enu\"\n");
    ASSERT_EQ(Send("KELOSYSLOG_SEV_EXCEED", {{"%SEV%", "err"}}), 0); // English, without a host
    EXPECT_EQ(Take()["title"].asString(), "Log of severity err from -");
    for (const std::string text : {"", "[NEW]\ntitle=\"x\"\n", "[NEW]\ntitle=\"x\"\nbody=\"open\n"}) {
        Write(std::string(kTexts) + "enu/notify", text);
        ASSERT_EQ(Send("NEW", {{"%A%", "1"}, {"DESKTOP_NOTIFY_CLASSNAME", "c"}}), 0);
        const Json::Value entry = Take();
        EXPECT_EQ(entry["title"].asString(), "Notification NEW");
        EXPECT_EQ(entry["body"].asString(), "The log server sent the notification NEW.\n%A%: 1\n");
    }
    EXPECT_THAT(Messages(), ElementsAre(HasSubstr("enu/notify:3: ")));
}

TEST_F(NotificationService, UsesTheChannelsThatSettingsAndFilterAllow) {
    ASSERT_EQ(Send("T", {}), 0);
    EXPECT_EQ(TakeChannels(), "desktop ");
    WriteSettings(std::string(kAllOn) + "desktop_enabled=\"no\"\n");
    ASSERT_EQ(Send("T", {}), 0);
    EXPECT_EQ(TakeChannels(), "mail sms push_mobile push_skype ");
    WriteSettings(kAllOn);
    Write("/etc/kelosyslog/notify.filter", "A=\"mail,desktop\"\nB = push_skype; sms push_msn\nC=\"push\"\n"
                                           "D=\"all\"\nE=\"none\"\nF=\"\"\nG=\"fax mail\"\n");
    const std::string all = "mail sms push_mobile push_skype desktop ";
    const std::map<const char *, std::string> kept = {{"A", "mail desktop "},
                                                      {"B", "sms push_skype "},
                                                      {"C", "push_mobile push_skype "},
                                                      {"D", all},
                                                      {"other", all}};
    for (const auto &[tag, channels] : kept) {
        ASSERT_EQ(Send(tag, {}), 0);
        EXPECT_EQ(TakeChannels(), channels) << tag;
    }
    EXPECT_EQ(Send("E", {}) + Send("F", {}), 0);
    EXPECT_THAT(Spooled(), IsEmpty());
    EXPECT_THAT(Messages(), IsEmpty());
    ASSERT_EQ(Send("G", {}), 0);
    EXPECT_EQ(TakeChannels(), "mail ");
    EXPECT_THAT(Messages(), ElementsAre(HasSubstr("notify.filter: no such channel: fax")));
    // A filter that cannot be read takes no channel away.
    std::filesystem::remove(root_.File("etc/kelosyslog/notify.filter"));
    std::filesystem::create_directory(root_.File("etc/kelosyslog/notify.filter"));
    ASSERT_EQ(Send("A", {}), 0);
    EXPECT_EQ(TakeChannels(), all);
    EXPECT_THAT(Messages(), ElementsAre(HasSubstr("every channel is used: Is a directory")));
}

TEST_F(NotificationService, KeepsNotificationsInTheOrderOfTheirSending) {
    for (int i = 0; i < 20; ++i)
        ASSERT_EQ(Send(("T" + std::to_string(i)).c_str(), {}), 0);
    int number = 0;
    for (const auto &file : Spooled())
        EXPECT_THAT(ReadFile(file.string()), HasSubstr("\"T" + std::to_string(number++) + "\""));
    EXPECT_EQ(number, 20);
}

TEST_F(NotificationService, ReportsASpoolThatTakesNothing) {
    Write("/var/spool/kelonotify", "");
    EXPECT_EQ(Send("T", {}), -1);
    EXPECT_THAT(Messages(), ElementsAre("Cannot put notification \"T\" into the spool: Not a directory",
                                        "Fail to send notification: T"));
    EXPECT_EQ(KELOSysNotifySendNotificationCustomized("", "", "", nullptr, 0), -1);
    EXPECT_THAT(Messages(), ElementsAre(HasSubstr("Invalid argument")));
}
