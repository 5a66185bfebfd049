#include "CertificateAuthority.h"

#include <sys/stat.h>

#include <cstdio>
#include <cstdlib>
#include <filesystem>
#include <memory>
#include <string>

#include <gtest/gtest.h>
#include <openssl/evp.h>
#include <openssl/pem.h>
#include <openssl/x509.h>
#include <openssl/x509_vfy.h>
#include <openssl/x509v3.h>

namespace {

struct X509Free {
    void operator()(X509* p) const { X509_free(p); }
};
struct PkeyFree {
    void operator()(EVP_PKEY* p) const { EVP_PKEY_free(p); }
};
struct StoreFree {
    void operator()(X509_STORE* p) const { X509_STORE_free(p); }
};
struct StoreCtxFree {
    void operator()(X509_STORE_CTX* p) const { X509_STORE_CTX_free(p); }
};
using X509Ptr = std::unique_ptr<X509, X509Free>;

X509Ptr readCert(std::string const& path) {
    std::unique_ptr<FILE, int (*)(FILE*)> f(std::fopen(path.c_str(), "r"), &std::fclose);
    if (!f) return {};
    return X509Ptr(PEM_read_X509(f.get(), nullptr, nullptr, nullptr));
}

// Verifies `leaf` for TLS server use against `ca` alone, with every default check on plus the
// library's strict profile checks (key identifiers, CA key usage).
int verifyServerChain(X509* ca, X509* leaf) {
    std::unique_ptr<X509_STORE, StoreFree> store(X509_STORE_new());
    X509_STORE_add_cert(store.get(), ca);
    std::unique_ptr<X509_STORE_CTX, StoreCtxFree> ctx(X509_STORE_CTX_new());
    X509_STORE_CTX_init(ctx.get(), store.get(), leaf, nullptr);
    X509_STORE_CTX_set_purpose(ctx.get(), X509_PURPOSE_SSL_SERVER);
    X509_STORE_CTX_set_flags(ctx.get(), X509_V_FLAG_X509_STRICT);
    if (X509_verify_cert(ctx.get()) == 1) return X509_V_OK;
    return X509_STORE_CTX_get_error(ctx.get());
}

class CertificateAuthorityTest : public ::testing::Test {
protected:
    void SetUp() override {
        char pattern[] = "/tmp/emu-ca-test-XXXXXX";
        ASSERT_NE(mkdtemp(pattern), nullptr);
        dir_ = pattern;
    }
    void TearDown() override { std::filesystem::remove_all(dir_); }

    std::string dir_;
};

TEST_F(CertificateAuthorityTest, ServerCertificateVerifiesForEveryNameAndLoopbackIpWithAPrivateKey) {
    // A readable file of the same name from an earlier run must not keep its mode.
    std::FILE* old = std::fopen((dir_ + "/server-key.pem").c_str(), "w");
    ASSERT_NE(old, nullptr);
    std::fclose(old);
    ASSERT_EQ(chmod((dir_ + "/server-key.pem").c_str(), 0644), 0);

    emu::TlsFiles files;
    std::string error;
    ASSERT_TRUE(emu::makeTlsFiles(dir_, {"api.facebook.com", "localhost"}, files, error)) << error;

    X509Ptr ca = readCert(files.caCertPath);
    X509Ptr leaf = readCert(files.certPath);
    ASSERT_TRUE(ca && leaf);
    EXPECT_EQ(verifyServerChain(ca.get(), leaf.get()), X509_V_OK);

    struct Case {
        char const* host;
        bool matches;
    };
    for (Case const& c : {Case{"api.facebook.com", true}, Case{"localhost", true}, Case{"API.FACEBOOK.COM", true},
                          Case{"facebook.com", false}, Case{"www.facebook.com", false}, Case{"example.org", false}}) {
        EXPECT_EQ(X509_check_host(leaf.get(), c.host, 0, 0, nullptr), c.matches ? 1 : 0) << c.host;
    }
    EXPECT_EQ(X509_check_ip_asc(leaf.get(), "127.0.0.1", 0), 1);
    EXPECT_EQ(X509_check_ip_asc(leaf.get(), "127.0.0.2", 0), 0);

    // The CA must not be usable as a server certificate and the server one not as a CA.
    EXPECT_EQ(X509_check_ca(ca.get()), 1);
    EXPECT_EQ(X509_check_ca(leaf.get()), 0);

    struct stat st {};
    ASSERT_EQ(stat(files.keyPath.c_str(), &st), 0);
    EXPECT_EQ(st.st_mode & 0777, 0600u);
    std::unique_ptr<FILE, int (*)(FILE*)> keyFile(std::fopen(files.keyPath.c_str(), "r"), &std::fclose);
    ASSERT_TRUE(keyFile);
    std::unique_ptr<EVP_PKEY, PkeyFree> key(PEM_read_PrivateKey(keyFile.get(), nullptr, nullptr, nullptr));
    ASSERT_TRUE(key);
    EXPECT_EQ(X509_check_private_key(leaf.get(), key.get()), 1);
    EXPECT_EQ(EVP_PKEY_get_bits(key.get()), 256);
}

TEST_F(CertificateAuthorityTest, EachRunIsItsOwnAuthorityAndFailuresAreReportedNotThrown) {
    emu::TlsFiles first, second;
    std::string error;
    std::filesystem::create_directory(dir_ + "/a");
    std::filesystem::create_directory(dir_ + "/b");
    ASSERT_TRUE(emu::makeTlsFiles(dir_ + "/a", {"localhost"}, first, error)) << error;
    ASSERT_TRUE(emu::makeTlsFiles(dir_ + "/b", {"localhost"}, second, error)) << error;
    X509Ptr caA = readCert(first.caCertPath);
    X509Ptr leafB = readCert(second.certPath);
    ASSERT_TRUE(caA && leafB);
    EXPECT_NE(verifyServerChain(caA.get(), leafB.get()), X509_V_OK);

    EXPECT_FALSE(emu::makeTlsFiles(dir_ + "/missing", {"localhost"}, first, error));
    EXPECT_NE(error.find("cannot create"), std::string::npos) << error;
    error.clear();
    EXPECT_FALSE(emu::makeTlsFiles(dir_, {}, first, error));
    EXPECT_FALSE(error.empty());
}

}  // namespace
