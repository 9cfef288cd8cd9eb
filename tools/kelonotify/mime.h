#pragma once

#include <cstdint>
#include <string>
#include <string_view>

namespace kelo::tool {

// The parts of a mail. Addresses have been checked: they consist of printable ASCII without blanks, brackets
// and commas.
struct Mail {
    std::string sender;
    std::string recipient;
    std::string subject;   // one line of UTF-8
    std::string body;      // lines of UTF-8, each ended by a line feed
    std::string messageId; // without its angle brackets
    int64_t time = 0;      // seconds since the epoch
};

// The mail according to RFC 5322 and RFC 2045: ASCII lines of at most 76 characters (but long addresses),
// each ended by CR LF. The same mail always gives the same bytes.
std::string WriteMime(const Mail &mail);

// The text, as RFC 2047 words on folded lines if it cannot be in a header unchanged. `used` is the number of
// characters before it on the line.
std::string EncodeHeader(std::string_view text, size_t used);

// The text as quoted-printable (RFC 2045) with CR LF at the line ends. No line begins with a dot.
std::string EncodeQuotedPrintable(std::string_view text);

} // namespace kelo::tool
