#include "kelonotify/transfer.h"

#include <new>
#include <stdexcept>

#include "kelonotify/safe_text.h"

namespace kelo::tool {
namespace {

constexpr size_t kMostAnswerBytes = size_t{64} << 10;

} // namespace

size_t Transfer::DropAnswer(char *, size_t size, size_t count, void *transfer) {
    auto &self = *static_cast<Transfer *>(transfer);
    self.answerBytes_ += size * count;
    return self.answerBytes_ <= kMostAnswerBytes ? size * count : CURL_WRITEFUNC_ERROR;
}

size_t Transfer::DropHeader(char *, size_t size, size_t count, void *transfer) {
    return static_cast<Transfer *>(transfer)->CountHeader(size * count);
}

size_t Transfer::CountHeader(size_t bytes) {
    answerBytes_ += bytes;
    isHeaderTooLong_ = answerBytes_ > kMostAnswerBytes;
    return isHeaderTooLong_ ? CURL_WRITEFUNC_ERROR : bytes;
}

void Append(Slist &list, const std::string &text) {
    curl_slist *longer = curl_slist_append(list.get(), text.c_str());
    if (longer == nullptr)
        throw std::bad_alloc();
    (void)list.release();
    list.reset(longer);
}

Transfer::Transfer(const ChannelOptions &options, const char *protocols)
    : handle_(curl_easy_init()), caFile_(options.settings.Get("notify_ca_file")) {
    if (handle_ == nullptr)
        throw std::bad_alloc();
    Set(CURLOPT_NOSIGNAL, 1L);
    Set(CURLOPT_PROTOCOLS_STR, protocols);
    Set(CURLOPT_TIMEOUT, options.timeoutSec);
    Set(CURLOPT_CONNECTTIMEOUT, options.timeoutSec);
    Set(CURLOPT_SERVER_RESPONSE_TIMEOUT, options.timeoutSec);
    Set(CURLOPT_ERRORBUFFER, error_);
    Set(CURLOPT_WRITEFUNCTION, DropAnswer);
    Set(CURLOPT_WRITEDATA, this);
    Set(CURLOPT_HEADERFUNCTION, DropHeader);
    Set(CURLOPT_HEADERDATA, this);
    // Only the settings apply: no proxy of the environment, no password of a .netrc.
    Set(CURLOPT_PROXY, "");
    Set(CURLOPT_NETRC, static_cast<long>(CURL_NETRC_IGNORED));
    if (!caFile_.empty())
        Set(CURLOPT_CAINFO, caFile_.c_str());
}

void Transfer::Check(CURLcode code) {
    if (code == CURLE_OUT_OF_MEMORY)
        throw std::bad_alloc();
    if (code != CURLE_OK)
        throw std::runtime_error(curl_easy_strerror(code));
}

CURLcode Transfer::Run() {
    error_[0] = '\0';
    answerBytes_ = 0;
    isHeaderTooLong_ = false;
    const CURLcode code = curl_easy_perform(handle_.get());
    // What follows the headers does not matter: they have the answer.
    return code == CURLE_WRITE_ERROR && !isHeaderTooLong_ && answerBytes_ > kMostAnswerBytes ? CURLE_OK
                                                                                             : code;
}

long Transfer::Code() const {
    long code = 0;
    curl_easy_getinfo(handle_.get(), CURLINFO_RESPONSE_CODE, &code);
    return code;
}

std::string Transfer::Reason(CURLcode code) const {
    constexpr size_t kMaxBytes = 250;
    if (isHeaderTooLong_)
        return "the answer is longer than 64 KiB";
    return SafeLine(error_[0] != '\0' ? error_ : curl_easy_strerror(code), kMaxBytes);
}

} // namespace kelo::tool
