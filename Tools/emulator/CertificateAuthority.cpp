#include "CertificateAuthority.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <ctime>
#include <functional>
#include <memory>

#include <openssl/bio.h>
#include <openssl/bn.h>
#include <openssl/err.h>
#include <openssl/evp.h>
#include <openssl/pem.h>
#include <openssl/x509.h>
#include <openssl/x509v3.h>

namespace emu {
namespace {

struct PkeyFree { void operator()(EVP_PKEY* p) const { EVP_PKEY_free(p); } };
struct X509Free { void operator()(X509* p) const { X509_free(p); } };
struct BioFree { void operator()(BIO* p) const { BIO_free_all(p); } };
struct BnFree { void operator()(BIGNUM* p) const { BN_free(p); } };
struct ExtFree { void operator()(X509_EXTENSION* p) const { X509_EXTENSION_free(p); } };

using PkeyPtr = std::unique_ptr<EVP_PKEY, PkeyFree>;
using X509Ptr = std::unique_ptr<X509, X509Free>;
using BioPtr = std::unique_ptr<BIO, BioFree>;

// The library's queued error texts, oldest first, so that a failure names its first cause.
std::string takeOpenSslErrors(const std::string& what) {
    std::string text = what;
    unsigned long code = 0;
    char buffer[256];
    while ((code = ERR_get_error()) != 0) {
        ERR_error_string_n(code, buffer, sizeof buffer);
        text += ": ";
        text += buffer;
    }
    return text;
}

PkeyPtr makeP256Key() {
    return PkeyPtr(EVP_PKEY_Q_keygen(nullptr, nullptr, "EC", "P-256"));
}

bool setRandomSerial(X509* cert) {
    std::unique_ptr<BIGNUM, BnFree> serial(BN_new());
    if (!serial || !BN_rand(serial.get(), 127, BN_RAND_TOP_ANY, BN_RAND_BOTTOM_ANY)) return false;
    return BN_to_ASN1_INTEGER(serial.get(), X509_get_serialNumber(cert)) != nullptr;
}

bool setCommonName(X509_NAME* name, const std::string& commonName) {
    return X509_NAME_add_entry_by_txt(name, "O", MBSTRING_UTF8,
                                      reinterpret_cast<const unsigned char*>("Trelm emulator"), -1, -1, 0) == 1 &&
           X509_NAME_add_entry_by_txt(name, "CN", MBSTRING_UTF8,
                                      reinterpret_cast<const unsigned char*>(commonName.c_str()), -1, -1, 0) == 1;
}

// Extensions are added in order: the subject key identifier must exist before the authority key
// identifier of a self-signed certificate can refer to it.
bool addExtension(X509* cert, X509* issuer, int nid, const std::string& value) {
    X509V3_CTX ctx;
    X509V3_set_ctx_nodb(&ctx);
    X509V3_set_ctx(&ctx, issuer, cert, nullptr, nullptr, 0);
    std::unique_ptr<X509_EXTENSION, ExtFree> ext(X509V3_EXT_conf_nid(nullptr, &ctx, nid, value.c_str()));
    return ext && X509_add_ext(cert, ext.get(), -1) == 1;
}

// A certificate with everything but extensions and signature: version 3, a random serial, valid
// from an hour ago (tolerates clock differences between processes) for `days`.
X509Ptr startCertificate(EVP_PKEY* subjectKey, const std::string& commonName, long days) {
    X509Ptr cert(X509_new());
    if (!cert || X509_set_version(cert.get(), X509_VERSION_3) != 1 || !setRandomSerial(cert.get())) return {};
    if (!X509_gmtime_adj(X509_getm_notBefore(cert.get()), -3600) ||
        !X509_gmtime_adj(X509_getm_notAfter(cert.get()), days * 24L * 3600L))
        return {};
    if (!setCommonName(X509_get_subject_name(cert.get()), commonName)) return {};
    if (X509_set_pubkey(cert.get(), subjectKey) != 1) return {};
    return cert;
}

bool writePem(const std::string& path, mode_t mode, const std::function<int(BIO*)>& write, std::string& error) {
    int fd = ::open(path.c_str(), O_WRONLY | O_CREAT | O_TRUNC | O_CLOEXEC, mode);
    if (fd < 0) {
        error = "cannot create " + path;
        return false;
    }
    // An older file of this name keeps its mode through O_TRUNC; the key must not stay readable.
    if (::fchmod(fd, mode) != 0) {
        ::close(fd);
        error = "cannot set the mode of " + path;
        return false;
    }
    BioPtr bio(BIO_new_fd(fd, BIO_CLOSE));
    if (!bio) {
        ::close(fd);
        error = takeOpenSslErrors("cannot open " + path);
        return false;
    }
    if (write(bio.get()) != 1 || BIO_flush(bio.get()) != 1) {
        error = takeOpenSslErrors("cannot write " + path);
        return false;
    }
    return true;
}

}  // namespace

bool makeTlsFiles(const std::string& dir, const std::vector<std::string>& hostNames, TlsFiles& out,
                  std::string& error) {
    ERR_clear_error();
    if (hostNames.empty()) {
        error = "no host name for the server certificate";
        return false;
    }

    PkeyPtr caKey = makeP256Key();
    PkeyPtr serverKey = makeP256Key();
    if (!caKey || !serverKey) {
        error = takeOpenSslErrors("cannot generate an EC P-256 key");
        return false;
    }

    X509Ptr ca = startCertificate(caKey.get(), "Trelm emulator CA", 3650);
    if (!ca || X509_set_issuer_name(ca.get(), X509_get_subject_name(ca.get())) != 1 ||
        !addExtension(ca.get(), ca.get(), NID_basic_constraints, "critical,CA:TRUE,pathlen:0") ||
        !addExtension(ca.get(), ca.get(), NID_key_usage, "critical,keyCertSign,cRLSign") ||
        !addExtension(ca.get(), ca.get(), NID_subject_key_identifier, "hash") ||
        !addExtension(ca.get(), ca.get(), NID_authority_key_identifier, "keyid:always") ||
        X509_sign(ca.get(), caKey.get(), EVP_sha256()) <= 0) {
        error = takeOpenSslErrors("cannot make the CA certificate");
        return false;
    }

    std::string altNames;
    for (const std::string& host : hostNames) altNames += "DNS:" + host + ",";
    altNames += "IP:127.0.0.1";

    X509Ptr server = startCertificate(serverKey.get(), hostNames.front(), 825);
    if (!server || X509_set_issuer_name(server.get(), X509_get_subject_name(ca.get())) != 1 ||
        !addExtension(server.get(), ca.get(), NID_basic_constraints, "critical,CA:FALSE") ||
        !addExtension(server.get(), ca.get(), NID_key_usage, "critical,digitalSignature") ||
        !addExtension(server.get(), ca.get(), NID_ext_key_usage, "serverAuth") ||
        !addExtension(server.get(), ca.get(), NID_subject_alt_name, altNames) ||
        !addExtension(server.get(), ca.get(), NID_subject_key_identifier, "hash") ||
        !addExtension(server.get(), ca.get(), NID_authority_key_identifier, "keyid:always") ||
        X509_sign(server.get(), caKey.get(), EVP_sha256()) <= 0) {
        error = takeOpenSslErrors("cannot make the server certificate");
        return false;
    }

    TlsFiles files{dir + "/ca.pem", dir + "/server.pem", dir + "/server-key.pem"};
    if (!writePem(files.caCertPath, 0644, [&](BIO* b) { return PEM_write_bio_X509(b, ca.get()); }, error) ||
        !writePem(files.certPath, 0644, [&](BIO* b) { return PEM_write_bio_X509(b, server.get()); }, error) ||
        !writePem(files.keyPath, 0600,
                  [&](BIO* b) {
                      return PEM_write_bio_PrivateKey(b, serverKey.get(), nullptr, nullptr, 0, nullptr, nullptr);
                  },
                  error))
        return false;
    out = std::move(files);
    return true;
}

}  // namespace emu
