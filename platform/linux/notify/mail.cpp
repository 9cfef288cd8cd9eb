#include <cerrno>
#include <charconv>

#include "common/catch_bad_alloc.h"
#include "common/failure.h"
#include "files/refusal.h"
#include "keloplatform/kelonotify.h"
#include "notify/settings.h"

using namespace kelo::platform;

namespace {

// A missing port is 0.
bool CopyPort(const Settings &settings, int &port) {
    const std::string text = settings.Get("smtp_port", "0");
    const char *end = text.data() + text.size();
    const auto [parsed, error] = std::from_chars(text.data(), end, port);
    if (error == std::errc() && parsed == end && port >= 0 && port <= 65535)
        return true;
    ReportRefusal(settings.Path(), 0, "the value of smtp_port is not a port");
    errno = EBADMSG;
    return false;
}

bool Fill(KELOMAIL &mail) {
    const Settings settings;
    return settings.IsLoaded() && settings.CopyTo(mail.server, "smtp_server") &&
           CopyPort(settings, mail.port) && settings.CopyTo(mail.security, "smtp_security") &&
           settings.CopyTo(mail.user, "smtp_user") && settings.CopyTo(mail.password, "smtp_password") &&
           settings.CopyTo(mail.sender, "smtp_from") && settings.CopyTo(mail.recipients, "smtp_to") &&
           settings.CopyTo(mail.subjectPrefix, "smtp_subject_prefix");
}

} // namespace

int KELOMailGet(KELOMAIL *mail) {
    if (mail == nullptr)
        return FailWithErrno("KELOMailGet", "", EINVAL);
    *mail = KELOMAIL{};
    if (CatchBadAlloc(false, [&] { return Fill(*mail); }))
        return 0;
    FailWithErrno("KELOMailGet", "", errno);
    *mail = KELOMAIL{};
    return -1;
}

int KELOMailGetMailNum(KELOMAIL *mail) {
    if (mail == nullptr)
        return 0;
    constexpr std::string_view kSeparators = ",; \t";
    const std::string_view recipients = mail->recipients;
    int count = 0;
    for (size_t at = recipients.find_first_not_of(kSeparators); at != std::string_view::npos; ++count) {
        const size_t end = recipients.find_first_of(kSeparators, at);
        at = recipients.find_first_not_of(kSeparators, end);
    }
    return count;
}
