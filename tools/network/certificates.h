#pragma once

#include <cstdint>
#include <string>
#include <vector>

namespace kelo::tool {

// What reception over TLS needs in one folder: the certificate of the server (server.pem) and its key
// (server.key), the certificates of the authorities whose devices are admitted (ca.pem), and their lists of
// revoked certificates (crl.pem). syslog-ng finds the lists through links crl/HASH.r0, named after the
// authorities.
struct TlsFiles {
    std::vector<std::string> faults;    // with these syslog-ng does not start or refuses every device
    std::vector<std::string> warnings;  // soon a fault, or unsafe
    std::vector<std::string> listLinks; // the names that the links must have
};

// Reads the files. `now` is in seconds since the epoch. What the caller may not read is not judged.
TlsFiles InspectTlsFiles(const std::string &folder, int64_t now);

// Creates the links to crl.pem that are missing, and the folder crl. Throws OutputError, which names the
// path.
void LinkRevocationLists(const std::string &folder, const TlsFiles &files);

} // namespace kelo::tool
