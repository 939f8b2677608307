#include "fleet/https/client/tls_checks.h"

#include <arpa/inet.h>
#include <openssl/pem.h>
#include <openssl/x509v3.h>

#include <array>
#include <memory>

#include "fleet/https/client/https_error.h"

namespace fleet {
namespace {

struct FreeTlsPart {
    void operator()(BIO* text) const { BIO_free_all(text); }
    void operator()(X509* certificate) const { X509_free(certificate); }
    /// The certificates in it are the connection's.
    void operator()(STACK_OF(X509) * certificates) const { sk_X509_free(certificates); }
};

HttpsError distrust(const std::string& text) {
    return {HttpsError::Kind::NotTrusted, text};
}

std::string sha256Of(const X509* certificate) {
    std::array<unsigned char, EVP_MAX_MD_SIZE> digest{};
    unsigned length = 0;
    if (X509_digest(certificate, EVP_sha256(), digest.data(), &length) != 1) return {};
    constexpr const char* kDigits = "0123456789abcdef";
    std::string text;
    for (unsigned i = 0; i < length; ++i) {
        text += kDigits[digest[i] >> 4U];
        text += kDigits[digest[i] & 0xFU];
    }
    return text;
}

/// Among what the server has sent; null if it is not there.
X509* certificateWith(const std::string& fingerprint, STACK_OF(X509) * sent) {
    for (int i = 0; i < sk_X509_num(sent); ++i) {
        X509* const certificate = sk_X509_value(sent, i);
        if (sha256Of(certificate) == fingerprint) return certificate;
    }
    return nullptr;
}

/// In the place of OpenSSL's own look at the chain: the one with the fingerprint is the only
/// anchor.
int verifyByFingerprint(X509_STORE_CTX* chain, void* fingerprint) {
    X509* const authority = certificateWith(*static_cast<const std::string*>(fingerprint),
                                            X509_STORE_CTX_get0_untrusted(chain));
    if (authority == nullptr) {
        X509_STORE_CTX_set_error(chain, X509_V_ERR_SELF_SIGNED_CERT_IN_CHAIN);
        return 0;
    }
    const std::unique_ptr<STACK_OF(X509), FreeTlsPart> anchors(sk_X509_new_null());
    if (!anchors || sk_X509_push(anchors.get(), authority) == 0) {
        X509_STORE_CTX_set_error(chain, X509_V_ERR_OUT_OF_MEM);
        return 0;
    }
    X509_STORE_CTX_set0_trusted_stack(chain, anchors.get());
    const int result = X509_verify_cert(chain);
    X509_STORE_CTX_set0_trusted_stack(chain, nullptr);
    return result;
}

void trustAuthority(SSL_CTX* context, const std::string& pem) {
    const std::unique_ptr<BIO, FreeTlsPart> text(
        BIO_new_mem_buf(pem.data(), static_cast<int>(pem.size())));
    const std::unique_ptr<X509, FreeTlsPart> certificate(
        text ? PEM_read_bio_X509(text.get(), nullptr, nullptr, nullptr) : nullptr);
    if (!certificate ||
        X509_STORE_add_cert(SSL_CTX_get_cert_store(context), certificate.get()) != 1) {
        throw distrust("the certificate of the authority to be trusted is none");
    }
}

}  // namespace

void insistOnTrust(SSL_CTX* context, const ServerTrust& trust) {
    SSL_CTX_set_min_proto_version(context, TLS1_2_VERSION);
    SSL_CTX_set_verify(context, SSL_VERIFY_PEER, nullptr);
    if (!trust.authority.empty()) return trustAuthority(context, trust.authority);
    if (trust.fingerprint.empty()) throw distrust("there is no authority to be trusted");
    SSL_CTX_set_cert_verify_callback(context, verifyByFingerprint,
                                     const_cast<std::string*>(&trust.fingerprint));
}

void insistOnHost(SSL* connection, const std::string& host) {
    X509_VERIFY_PARAM* const checks = SSL_get0_param(connection);
    std::array<unsigned char, sizeof(in6_addr)> address{};
    const bool isAddress = ::inet_pton(AF_INET, host.c_str(), address.data()) == 1 ||
                           ::inet_pton(AF_INET6, host.c_str(), address.data()) == 1;
    X509_VERIFY_PARAM_set_hostflags(checks, X509_CHECK_FLAG_NO_PARTIAL_WILDCARDS);
    const bool isSet = isAddress ? X509_VERIFY_PARAM_set1_ip_asc(checks, host.c_str()) == 1
                                 : X509_VERIFY_PARAM_set1_host(checks, host.c_str(), 0) == 1 &&
                                       SSL_set_tlsext_host_name(connection, host.c_str()) == 1;
    if (!isSet) throw distrust("no certificate can be for " + host);
}

std::string reasonOfDistrust(const SSL* connection) {
    const long result = SSL_get_verify_result(connection);
    if (result == X509_V_OK) return {};
    if (result == X509_V_ERR_SELF_SIGNED_CERT_IN_CHAIN) {
        return "another authority vouches for it than the one that is trusted";
    }
    return X509_verify_cert_error_string(result);
}

std::string authorityOf(const SSL* connection) {
    STACK_OF(X509)* const chain = SSL_get0_verified_chain(connection);
    const std::unique_ptr<BIO, FreeTlsPart> text(BIO_new(BIO_s_mem()));
    if (chain == nullptr || sk_X509_num(chain) == 0 || !text ||
        PEM_write_bio_X509(text.get(), sk_X509_value(chain, sk_X509_num(chain) - 1)) != 1) {
        throw distrust("the authority's certificate cannot be told");
    }
    char* data = nullptr;
    const long length = BIO_get_mem_data(text.get(), &data);
    return {data, static_cast<std::size_t>(length)};
}

}  // namespace fleet
