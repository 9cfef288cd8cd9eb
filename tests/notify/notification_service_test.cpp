#include <json/json.h>

#include <fstream>

#include "keloplatform/kelonotify.h"
#include "keloplatform/torvc.h"
#include "notify/notify_fixture.h"

namespace kelo::test {
namespace {

constexpr char kTexts[] = "usr/kelo/keloman/webman/modules/Quillbay/texts/";
constexpr char kAllOn[] =
    "smtp_mail_enabled=\"yes\"\nsms_enabled=\"yes\"\npushservice_mobile_enabled=\"yes\"\n"
    "pushservice_msn_enabled=\"no\"\npushservice_skype_enabled=\"yes\"\n";

class NotificationService : public NotifyTest {
protected:
    NotificationService() {
        PlatformCalls::answers.notification.reset();
        fs::create_directories(root_.File(kTexts));
        fs::copy(SourcePath("package/texts"), root_.File(kTexts), fs::copy_options::recursive);
    }

    int Send(const std::string &tag, const std::map<std::string, std::string> &values = {}) {
        TORVSZHASH *hash = TORVCSzHashAlloc(8);
        for (const auto &[key, value] : values)
            TORVCSzHashSetValue(&hash, key.c_str(), value.c_str());
        const int result = SyslogMailSend(tag.c_str(), &hash);
        TORVCSzHashFree(hash);
        return result;
    }

    std::set<fs::path> Spooled(const char *folder = "new") const {
        std::set<fs::path> files;
        std::error_code missing;
        for (const auto &file : fs::directory_iterator(root_.File("var/spool/kelonotify/") + folder, missing))
            files.insert(file.path());
        return files;
    }

    // Takes the only entry out of the spool.
    Json::Value Take() {
        Json::Value entry;
        for (const fs::path &file : Spooled()) {
            EXPECT_TRUE(entry.isNull()) << "more than one";
            std::ifstream(file) >> entry;
            EXPECT_EQ(file.filename(), entry["id"].asString() + ".json");
            fs::remove(file);
        }
        EXPECT_THAT(Spooled("tmp"), IsEmpty());
        return entry;
    }

    std::string ChannelsOf(const std::string &tag) {
        EXPECT_EQ(Send(tag), 0);
        std::string channels;
        const Json::Value entry = Take();
        for (const Json::Value &channel : entry["channels"])
            channels += channel.asString() + " ";
        return channels;
    }
};

TEST_F(NotificationService, SpoolsTheRenderedMessageWithAllThatDeliveryNeeds) {
    WriteSettings(kAllOn);
    WriteRules(RuleText("r", 1, "0", "100", ""));
    const time_t before = time(nullptr);
    ASSERT_EQ(NotificationManager().NotificationSendKeyword("h\xFF\r\nBcc: x", "%HOST% \\n",
                                                            "say \"%KEYWORD%\" \\o/\n\x1B[0m"),
              0);
    struct stat status;
    ASSERT_EQ(stat(Spooled().begin()->c_str(), &status), 0);
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
    EXPECT_THAT(TakeTexts(), IsEmpty());
}

TEST_F(NotificationService, HasATextForEveryTagInEnglishAndGerman) {
    std::set<std::string> bodies; // a missing German text would be the English one again
    for (const std::string language : {"enu", "ger"}) {
        WriteSettings("notify_language=\"" + language + "\"\n");
        for (const std::string tag :
             {"EPS_EXCEED", "SEV_EXCEED", "KEYWORD_MATCH", "VOL_FULL", "DB_CORRUPT", "ShareRemove",
              "ShareRename", "ShareEncMount", "ShareEncUnmount", "TEST"}) {
            ASSERT_EQ(Send("KELOSYSLOG_" + tag), 0);
            const Json::Value entry = Take();
            EXPECT_NE(entry["title"].asString(), "Notification KELOSYSLOG_" + tag);
            EXPECT_TRUE(bodies.insert(entry["body"].asString()).second) << language << " " << tag;
        }
    }
}

TEST_F(NotificationService, GivesAPlainMessageWhereThereIsNoText) {
    WriteSettings("notify_language=\"../enu\"\n");
    ASSERT_EQ(Send("KELOSYSLOG_SEV_EXCEED", {{"%SEV%", "err"}}), 0); // English, without a host
    EXPECT_EQ(Take()["title"].asString(), "Log of severity err from -");
    for (const std::string text : {"", "[NEW]\ntitle=\"x\"\n", "[NEW]\ntitle=\"x\"\nbody=\"open\n"}) {
        WriteFile(root_.File(kTexts) + "enu/notify", text);
        ASSERT_EQ(Send("NEW", {{"%A%", "1"}, {"DESKTOP_NOTIFY_CLASSNAME", "c"}}), 0);
        const Json::Value entry = Take();
        EXPECT_EQ(entry["title"].asString(), "Notification NEW");
        EXPECT_EQ(entry["body"].asString(), "The log server sent the notification NEW.\n%A%: 1\n");
    }
    EXPECT_THAT(TakeTexts(), ElementsAre(HasSubstr("enu/notify:3: ")));
}

TEST_F(NotificationService, UsesTheChannelsThatSettingsAndFilterAllow) {
    const std::string all = "mail sms push_mobile push_skype desktop ";
    const std::string filter = root_.File("etc/kelosyslog/notify.filter");
    EXPECT_EQ(ChannelsOf("T"), "desktop ");
    WriteSettings(std::string(kAllOn) + "desktop_enabled=\"no\"\n");
    EXPECT_EQ(ChannelsOf("T"), "mail sms push_mobile push_skype ");
    WriteSettings(kAllOn);
    WriteFile(filter, "A=\"mail,desktop\"\nB = push_skype; sms push_msn\nC=\"push\"\nD=\"all\"\nE=\"none\"\n"
                      "F=\"\"\nG=\"fax mail\"\n");
    for (const auto &[tag, channels] : std::map<std::string, std::string>{{"A", "mail desktop "},
                                                                          {"B", "sms push_skype "},
                                                                          {"C", "push_mobile push_skype "},
                                                                          {"D", all},
                                                                          {"other", all},
                                                                          {"E", ""},
                                                                          {"F", ""}})
        EXPECT_EQ(ChannelsOf(tag), channels) << tag;
    EXPECT_THAT(TakeTexts(), IsEmpty());
    EXPECT_EQ(ChannelsOf("G"), "mail ");
    EXPECT_THAT(TakeTexts(), ElementsAre(HasSubstr("notify.filter: no such channel: fax")));
    // A filter that cannot be read takes no channel away.
    fs::remove(filter);
    fs::create_directory(filter);
    EXPECT_EQ(ChannelsOf("A"), all);
    EXPECT_THAT(TakeTexts(), ElementsAre(HasSubstr("every channel is used: Is a directory")));
}

TEST_F(NotificationService, KeepsNotificationsInTheOrderOfTheirSending) {
    for (int i = 0; i < 20; ++i)
        ASSERT_EQ(Send("T" + std::to_string(i)), 0);
    int number = 0;
    for (const auto &file : Spooled())
        EXPECT_THAT(ReadFile(file.string()), HasSubstr("\"T" + std::to_string(number++) + "\""));
    EXPECT_EQ(number, 20);
}

TEST_F(NotificationService, ReportsASpoolThatTakesNothing) {
    WriteFile(root_.File("var/spool/kelonotify"), "");
    EXPECT_EQ(Send("T"), -1);
    EXPECT_THAT(TakeTexts(), ElementsAre("Cannot put notification \"T\" into the spool: Not a directory",
                                         "Fail to send notification: T"));
    EXPECT_EQ(KELOSysNotifySendNotificationCustomized("", "", "", nullptr, 0), -1);
    EXPECT_THAT(TakeTexts(), ElementsAre(HasSubstr("Invalid argument")));
}

} // namespace
} // namespace kelo::test
