#include "receive/spool_record.h"

#include <algorithm>
#include <charconv>
#include <cstdio>
#include <ctime>
#include <iterator>
#include <optional>

#include "receive/raw_message.h"

namespace kelo::tool {
namespace {

constexpr std::string_view kVersion = "1 ";
constexpr size_t kIdBytes = 8;
constexpr size_t kMarkBytes = kVersion.size() + kIdBytes + 1;
constexpr size_t kMaxHeaderBytes = 512;

bool IsHex(char byte) {
    return (byte >= '0' && byte <= '9') || (byte >= 'a' && byte <= 'f');
}

// Whether a host id and the blanks around it are at `at`, behind a version.
bool HasId(std::string_view bytes, size_t at) {
    const std::string_view id = bytes.substr(at, kIdBytes + 1);
    return id.size() == kIdBytes + 1 && id.back() == ' ' && std::all_of(id.begin(), id.end() - 1, IsHex);
}

bool IsOtherVersion(std::string_view bytes) {
    const size_t digits = bytes.find_first_not_of("0123456789");
    return digits != std::string_view::npos && digits > 0 && digits < 4 && bytes[digits] == ' ' &&
           HasId(bytes, digits + 1) && !bytes.starts_with(kVersion);
}

template <typename Number>
bool Read(std::string_view text, Number &number) {
    const auto [end, error] = std::from_chars(text.data(), text.data() + text.size(), number);
    return error == std::errc() && end == text.data() + text.size();
}

_SYSLOG_DB_PRIORITY_tag SeverityOf(std::string_view word) {
    const auto *const found =
        std::find(std::begin(g_MappingSyslogPrior), std::end(g_MappingSyslogPrior), word);
    return found != std::end(g_MappingSyslogPrior)
               ? static_cast<_SYSLOG_DB_PRIORITY_tag>(found - std::begin(g_MappingSyslogPrior))
               : SYSLOG_PRIO_DEBUG;
}

// "+05:30" in seconds.
std::optional<int> SecondsOf(std::string_view zone) {
    int hours = 0;
    int minutes = 0;
    const bool isValid = zone.size() == 6 && (zone[0] == '+' || zone[0] == '-') && zone[3] == ':' &&
                         Read(zone.substr(1, 2), hours) && Read(zone.substr(4), minutes);
    if (!isValid)
        return std::nullopt;
    const int seconds = hours * 3600 + minutes * 60;
    return zone[0] == '-' ? -seconds : seconds;
}

// The rewrite rule r_kelo_address_6: a socket of both families shows an address of IPv4 in another form.
std::string_view PlainAddress(std::string_view address) {
    constexpr std::string_view kMapped = "::ffff:";
    const bool isMapped = address.starts_with(kMapped) &&
                          address.find_first_not_of("0123456789.", kMapped.size()) == std::string_view::npos;
    return isMapped ? address.substr(kMapped.size()) : address;
}

} // namespace

struct SpoolParser::Header {
    enum Field { kReceipt, kHost, kProg, kMsg, kUtc, kZone, kFacility, kLevel, kTag, kIp, kFields };
    std::string_view fields[kFields];
    size_t bytes = 0;
    bool isPassedOn = false;

    // Fails where a blank is missing.
    bool Split(std::string_view text) {
        for (int i = 0; i < kFields; ++i) {
            if (isPassedOn && (i == kProg || i == kLevel || i == kTag))
                continue; // one empty field with the one before
            const size_t blank = text.substr(0, kMaxHeaderBytes).find(' ', bytes);
            if (blank == std::string_view::npos)
                return false;
            fields[i] = text.substr(bytes, blank - bytes);
            bytes = blank + 1;
            isPassedOn = isPassedOn || (i == kHost && fields[i].empty());
        }
        return true;
    }

    // Host and program have lengths in the record of a parsed message only.
    bool ReadLengths(size_t &host, size_t &prog, size_t &msg) const {
        return Read(fields[kMsg], msg) &&
               (isPassedOn ? fields[kFacility].empty()
                           : Read(fields[kHost], host) && Read(fields[kProg], prog)) &&
               host < kMaxRecordBytes && prog < kMaxRecordBytes && msg < kMaxRecordBytes &&
               host + prog + msg < kMaxRecordBytes;
    }
};

SpoolParser::Piece SpoolParser::Parse(std::string_view bytes, _SYSLOG_LOG_DATA_tag &log) {
    if (mark_.empty() && IsOtherVersion(bytes))
        return Piece::kForeign;
    const Piece piece = ParseRecord(bytes, log);
    return piece == Piece::kGarbage ? Skip(bytes) : piece;
}

SpoolParser::Piece SpoolParser::ParseRecord(std::string_view bytes, _SYSLOG_LOG_DATA_tag &log) {
    const std::string_view mark = bytes.substr(0, kMarkBytes);
    if (mark.size() < kMarkBytes)
        return mark_.starts_with(mark) || mark_.empty() ? Piece::kPartial : Piece::kGarbage;
    if (mark_.empty() ? !mark.starts_with(kVersion) || !HasId(mark, kVersion.size()) : mark != mark_)
        return Piece::kGarbage;

    Header header;
    if (!header.Split(bytes.substr(kMarkBytes)))
        return bytes.size() < kMaxHeaderBytes && bytes.find(mark, 1) == std::string_view::npos
                   ? Piece::kPartial
                   : Piece::kGarbage;
    size_t host = 0;
    size_t prog = 0;
    size_t msg = 0;
    int64_t utc = 0;
    const bool isValid = Read(header.fields[Header::kReceipt], receipt_) &&
                         header.ReadLengths(host, prog, msg) && Read(header.fields[Header::kUtc], utc);
    if (!isValid || !SetTime(log, utc, header.fields[Header::kZone]))
        return Piece::kGarbage;
    const size_t body = kMarkBytes + header.bytes;
    const size_t names = header.isPassedOn ? 0 : host + 1 + prog;
    const size_t size = body + names + 1 + msg + 1;
    // A record that was cut off is followed by the next one, and its length would swallow that.
    const std::string_view record = bytes.substr(0, size);
    if ((mark_.empty() ? record.find(mark, 1) : FindMark(record, 1)) != std::string_view::npos)
        return Piece::kGarbage;
    if (bytes.size() < size)
        return Piece::kPartial;
    if ((!header.isPassedOn && bytes[body + host] != ' ') || bytes[body + names] != ' ' ||
        bytes[size - 1] != '\n')
        return Piece::kGarbage;

    log.ip = header.isPassedOn ? PlainAddress(header.fields[Header::kIp]) : header.fields[Header::kIp];
    const std::string_view text = bytes.substr(body + names + 1, msg);
    if (prog > 0 || !ParseRawMessage(text, log)) {
        log.fac = header.isPassedOn ? "user" : header.fields[Header::kFacility];
        log.prio = header.isPassedOn ? SYSLOG_PRIO_NOTICE : SeverityOf(header.fields[Header::kLevel]);
        log.tag = header.isPassedOn ? "0d" : header.fields[Header::kTag];
        log.host = header.isPassedOn ? std::string_view(log.ip) : bytes.substr(body, host);
        log.prog = prog > 0 ? bytes.substr(body + host + 1, prog) : "-";
        log.msg = text;
    }
    if (mark_.empty()) {
        mark_ = mark;
        markSearcher_.emplace(mark_.data(), mark_.data() + mark_.size());
    }
    size_ = size;
    return Piece::kRecord;
}

// The bytes up to the beginning of the next record. The last ones may be a part of that.
SpoolParser::Piece SpoolParser::Skip(std::string_view bytes) {
    const size_t start = FindStart(bytes, 1);
    if (start != std::string_view::npos) {
        size_ = start;
        return Piece::kGarbage;
    }
    if (bytes.size() <= kMarkBytes)
        return Piece::kPartial;
    size_ = bytes.size() - kMarkBytes;
    return Piece::kGarbage;
}

size_t SpoolParser::FindStart(std::string_view bytes, size_t from) const {
    if (!mark_.empty())
        return FindMark(bytes, from);
    for (size_t at = bytes.find(kVersion, from); at != std::string_view::npos;
         at = bytes.find(kVersion, at + 1)) {
        if (HasId(bytes, at + kVersion.size()))
            return at;
    }
    return std::string_view::npos;
}

// Every record is searched for it, and most steps of this search are as long as the mark.
size_t SpoolParser::FindMark(std::string_view bytes, size_t from) const {
    const char *const end = bytes.data() + bytes.size();
    const char *const found = (*markSearcher_)(bytes.data() + std::min(from, bytes.size()), end).first;
    return found != end ? static_cast<size_t>(found - bytes.data()) : std::string_view::npos;
}

bool SpoolParser::SetTime(_SYSLOG_LOG_DATA_tag &log, int64_t utc, std::string_view zone) {
    if (utc != utc_ || zone != zone_) {
        const std::optional<int> offset = SecondsOf(zone);
        std::tm parts{};
        const std::time_t local = offset ? utc + *offset : 0;
        if (!offset || gmtime_r(&local, &parts) == nullptr)
            return false;
        char text[64];
        date_.assign(text, std::strftime(text, sizeof text, "%Y/%m/%d", &parts));
        time_.assign(text, std::strftime(text, sizeof text, "%H:%M:%S", &parts));
        utc_ = utc;
        zone_ = zone;
    }
    log.utcsec = utc;
    log.tzoffset = zone_;
    log.ldate = date_;
    log.ltime = time_;
    return true;
}

} // namespace kelo::tool
