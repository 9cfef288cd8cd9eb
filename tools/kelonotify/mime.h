#pragma once

#include <cstdint>
#include <string>
#include <string_view>

namespace kelo::tool {

// What a mail consists of. Addresses have been checked: they hold nothing but printable ASCII without
// blanks, brackets and commas.
struct Mail {
    std::string sender;
    std::string recipient;
    std::string subject;   // one line of UTF-8
    std::string body;      // lines of UTF-8, each ended by a line feed
    std::string messageId; // without its angle brackets
    int64_t time = 0;      // seconds since the epoch
};

// The mail as RFC 5322 and RFC 2045 want it: ASCII lines of at most 76 characters (but long addresses), each
// ended by CR LF. The same mail always gives the same bytes.
std::string WriteMime(const Mail &mail);

// The text as RFC 2047 words on folded lines where it cannot stand in a header as it is. `used` is how many
// characters stand on the line before it.
std::string EncodeHeader(std::string_view text, size_t used);

// The text as quoted-printable (RFC 2045) with CR LF at the line ends. No line begins with a dot.
std::string EncodeQuotedPrintable(std::string_view text);

} // namespace kelo::tool
