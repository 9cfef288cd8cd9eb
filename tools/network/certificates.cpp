#include "network/certificates.h"

#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <cstdio>
#include <cstring>
#include <ctime>
#include <memory>
#include <optional>

#include "base/errors.h"
#include "base/files.h"
#include "base/time_format.h"
#include "network/late_crypto.h"

namespace kelo::tool {
namespace {

constexpr int64_t kDaySec = 86400;
constexpr int64_t kSoonSec = 30 * kDaySec; // of a certificate
constexpr int64_t kSoonForListSec = 14 * kDaySec;

struct Deleter {
    void operator()(BIO *bio) const { BIO_free(bio); }
    void operator()(X509 *certificate) const { X509_free(certificate); }
    void operator()(X509_CRL *list) const { X509_CRL_free(list); }
    void operator()(EVP_PKEY *key) const { EVP_PKEY_free(key); }
};
using Bio = std::unique_ptr<BIO, Deleter>;
using Certificate = std::unique_ptr<X509, Deleter>;
using RevocationList = std::unique_ptr<X509_CRL, Deleter>;
using Key = std::unique_ptr<EVP_PKEY, Deleter>;

int RefusePassword(char *, int, int, void *) {
    return 0;
}

int64_t Seconds(const ASN1_TIME *time) {
    std::tm parts{};
    return time != nullptr && ASN1_TIME_to_tm(time, &parts) == 1 ? timegm(&parts) : 0;
}

std::string Date(int64_t seconds) {
    return TimeFormat(false).Plain(seconds);
}

// "server.pem expires on DATE"
class Inspection {
public:
    Inspection(std::string folder, int64_t now) : folder_(std::move(folder)), now_(now) {}

    TlsFiles Run() {
        ReadServer();
        ReadAuthorities();
        ReadLists();
        return std::move(files_);
    }

private:
    std::string Path(const char *name) const { return folder_ + "/" + name; }
    void Fault(const char *name, const std::string &what) {
        files_.faults.push_back(Path(name) + " " + what);
    }
    void Warn(const char *name, const std::string &what) {
        files_.warnings.push_back(Path(name) + " " + what);
    }

    // Nothing for a file that is missing or that may not be read; the first is a fault.
    std::optional<std::string> Read(const char *name) {
        struct stat status {};
        const bool isFolder = stat(Path(name).c_str(), &status) == 0 && S_ISDIR(status.st_mode);
        std::optional<std::string> text = isFolder ? std::nullopt : ReadWhole(Path(name));
        if (isFolder)
            Fault(name, "is a folder, not a file");
        else if (!text && errno != EACCES)
            Fault(name, std::string("cannot be read: ") + std::strerror(errno));
        return text;
    }

    // All objects of one kind in a file.
    template <typename Object>
    std::vector<Object> ReadAll(const char *name, const char *kind, const auto &read) {
        std::vector<Object> objects;
        const std::optional<std::string> text = Read(name);
        if (!text)
            return objects;
        const Bio bio(BIO_new_mem_buf(text->data(), static_cast<int>(text->size())));
        while (Object object{read(bio.get(), nullptr, RefusePassword, nullptr)})
            objects.push_back(std::move(object));
        if (objects.empty())
            Fault(name, std::string("has no ") + kind + " in PEM form");
        return objects;
    }

    void CheckValidity(const char *name, const X509 *certificate) {
        const int64_t begin = Seconds(X509_get0_notBefore(certificate));
        const int64_t end = Seconds(X509_get0_notAfter(certificate));
        if (now_ >= end)
            Fault(name, "expired on " + Date(end));
        else if (now_ < begin)
            Fault(name, "is not valid before " + Date(begin));
        else if (end - now_ < kSoonSec)
            Warn(name, "expires on " + Date(end));
    }

    void ReadServer() {
        constexpr const char *kCertificate = "server.pem";
        constexpr const char *kKey = "server.key";
        const auto chain = ReadAll<Certificate>(kCertificate, "certificate", PEM_read_bio_X509);
        if (!chain.empty()) {
            CheckValidity(kCertificate, chain.front().get());
            if (X509_check_purpose(chain.front().get(), X509_PURPOSE_SSL_SERVER, 0) != 1)
                Fault(kCertificate, "is no certificate of a server");
        }
        struct stat status {};
        if (stat(Path(kKey).c_str(), &status) == 0 && IsOpen(status))
            Warn(kKey, "can be read by others than root: chmod 600");
        const auto keys = ReadAll<Key>(kKey, "key without a password", PEM_read_bio_PrivateKey);
        if (!keys.empty() && !chain.empty() &&
            X509_check_private_key(chain.front().get(), keys.front().get()) != 1)
            Fault(kKey, "is not the key of " + Path(kCertificate));
    }

    static bool IsOpen(const struct stat &status) {
        return (status.st_mode & S_IROTH) != 0 || ((status.st_mode & S_IRGRP) != 0 && status.st_gid != 0);
    }

    void ReadAuthorities() {
        constexpr const char *kName = "ca.pem";
        authorities_ = ReadAll<Certificate>(kName, "certificate", PEM_read_bio_X509);
        for (const Certificate &authority : authorities_) {
            CheckValidity(kName, authority.get());
            if (X509_check_ca(authority.get()) == 0)
                Fault(kName, "has a certificate that is not one of an authority");
        }
    }

    const X509_CRL *ListOf(const X509 *authority) const {
        for (const RevocationList &list : lists_) {
            if (X509_NAME_cmp(X509_CRL_get_issuer(list.get()), X509_get_subject_name(authority)) == 0 &&
                X509_CRL_verify(list.get(), X509_get0_pubkey(authority)) == 1)
                return list.get();
        }
        return nullptr;
    }

    // A device is refused when there is no list of its authority, or an old one.
    void ReadLists() {
        constexpr const char *kName = "crl.pem";
        lists_ = ReadAll<RevocationList>(kName, "list of revoked certificates", PEM_read_bio_X509_CRL);
        if (lists_.empty())
            return;
        for (const Certificate &authority : authorities_) {
            const X509_CRL *list = ListOf(authority.get());
            if (list == nullptr) {
                Fault(kName, "has no list of an authority in " + Path("ca.pem"));
                continue;
            }
            const int64_t end = Seconds(X509_CRL_get0_nextUpdate(list));
            if (end != 0 && now_ >= end)
                Fault(kName, "is out of date since " + Date(end) + ", so every device is refused");
            else if (end != 0 && end - now_ < kSoonForListSec)
                Warn(kName, "is out of date on " + Date(end) + "; from then on every device is refused");
            char link[32];
            std::snprintf(
                link, sizeof link, "%08lx.r0",
                X509_NAME_hash_ex(X509_get_subject_name(authority.get()), nullptr, nullptr, nullptr));
            files_.listLinks.emplace_back(link);
        }
    }

    std::string folder_;
    int64_t now_;
    TlsFiles files_;
    std::vector<Certificate> authorities_;
    std::vector<RevocationList> lists_;
};

} // namespace

TlsFiles InspectTlsFiles(const std::string &folder, int64_t now) {
    return Inspection(folder, now).Run();
}

void LinkRevocationLists(const std::string &folder, const TlsFiles &files) {
    const std::string links = folder + "/crl";
    if (mkdir(links.c_str(), 0755) != 0 && errno != EEXIST)
        throw OutputError("cannot create " + links + ": " + std::strerror(errno));
    for (const std::string &name : files.listLinks) {
        const std::string link = links + "/" + name;
        if (access(link.c_str(), F_OK) == 0)
            continue;
        unlink(link.c_str()); // one that leads nowhere
        if (symlink("../crl.pem", link.c_str()) != 0)
            throw OutputError("cannot create " + link + ": " + std::strerror(errno));
    }
}

} // namespace kelo::tool
