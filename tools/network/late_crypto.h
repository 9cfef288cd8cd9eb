#pragma once

#include <openssl/pem.h>
#include <openssl/x509.h>
#include <openssl/x509v3.h>

#include "base/late_function.h"

namespace kelo::tool {

// The functions of libcrypto that are used, loaded at the first call.
#define KELO_CRYPTO(name) inline constinit const LateFunction<decltype(::name)> name("libcrypto.so.3", #name)
KELO_CRYPTO(ASN1_TIME_to_tm);
KELO_CRYPTO(BIO_free);
KELO_CRYPTO(BIO_new_mem_buf);
KELO_CRYPTO(EVP_PKEY_free);
KELO_CRYPTO(PEM_read_bio_PrivateKey);
KELO_CRYPTO(PEM_read_bio_X509);
KELO_CRYPTO(PEM_read_bio_X509_CRL);
KELO_CRYPTO(X509_CRL_free);
KELO_CRYPTO(X509_CRL_get0_nextUpdate);
KELO_CRYPTO(X509_CRL_get_issuer);
KELO_CRYPTO(X509_CRL_verify);
KELO_CRYPTO(X509_NAME_cmp);
KELO_CRYPTO(X509_NAME_hash_ex);
KELO_CRYPTO(X509_check_ca);
KELO_CRYPTO(X509_check_private_key);
KELO_CRYPTO(X509_check_purpose);
KELO_CRYPTO(X509_free);
KELO_CRYPTO(X509_get0_notAfter);
KELO_CRYPTO(X509_get0_notBefore);
KELO_CRYPTO(X509_get0_pubkey);
KELO_CRYPTO(X509_get_subject_name);
#undef KELO_CRYPTO

} // namespace kelo::tool
