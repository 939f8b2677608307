#include "fleet/server/keys/tls/certificate_authority.h"

#include <openssl/evp.h>
#include <openssl/pem.h>
#include <openssl/x509v3.h>
#include <sodium.h>

#include <array>
#include <ctime>
#include <utility>

#include "fleet/server/keys/files/keys_error.h"
#include "fleet/server/keys/tls/server_names.h"

namespace fleet {
namespace {

constexpr int kSerialBits = 127;
constexpr int kBase64Line = sodium_base64_VARIANT_ORIGINAL;
/// Clocks of hosts that are a little behind shall take a new certificate.
constexpr std::time_t kBackdated = 3600;

struct FreeTlsObject {
    void operator()(X509_EXTENSION* extension) const { X509_EXTENSION_free(extension); }
    void operator()(BIO* text) const { BIO_free_all(text); }
    void operator()(BIGNUM* number) const { BN_free(number); }
    void operator()(X509* certificate) const { X509_free(certificate); }
};
using Text = std::unique_ptr<BIO, FreeTlsObject>;

void insist(bool isDone, const char* what) {
    if (!isDone) throw KeysError(std::string("OpenSSL cannot ") + what);
}

/// What a function of OpenSSL writes. Its own memory is wiped by OpenSSL.
template <typename Write>
SecretText writtenBy(Write write) {
    const Text text(BIO_new(BIO_s_mem()));
    insist(text && write(text.get()) == 1, "write a key or a certificate");
    char* data = nullptr;
    const long length = BIO_get_mem_data(text.get(), &data);
    SecretText copy;
    copy.append({data, static_cast<std::size_t>(length)});
    return copy;
}

std::string pemOf(X509* certificate) {
    return std::string(
        writtenBy([&](BIO* to) { return PEM_write_bio_X509(to, certificate); }).view());
}

std::unique_ptr<X509, FreeTlsObject> certificateIn(std::string_view pem) {
    const Text text(BIO_new_mem_buf(pem.data(), static_cast<int>(pem.size())));
    insist(text != nullptr, "read a certificate");
    std::unique_ptr<X509, FreeTlsObject> read(
        PEM_read_bio_X509(text.get(), nullptr, nullptr, nullptr));
    if (!read) throw KeysError("what should be a certificate is none");
    return read;
}

std::time_t secondsOf(Moment moment) {
    return static_cast<std::time_t>(
        std::chrono::duration_cast<std::chrono::seconds>(moment).count());
}

void setSerial(X509* certificate) {
    const std::unique_ptr<BIGNUM, FreeTlsObject> number(BN_new());
    insist(number && BN_rand(number.get(), kSerialBits, BN_RAND_TOP_ONE, BN_RAND_BOTTOM_ANY) == 1 &&
               BN_to_ASN1_INTEGER(number.get(), X509_get_serialNumber(certificate)) != nullptr,
           "make a serial number");
}

void extend(X509* certificate, X509* issuer, int what, const std::string& value) {
    X509V3_CTX context;
    X509V3_set_ctx_nodb(&context);
    X509V3_set_ctx(&context, issuer, certificate, nullptr, nullptr, 0);
    const std::unique_ptr<X509_EXTENSION, FreeTlsObject> extension(
        X509V3_EXT_conf_nid(nullptr, &context, what, value.c_str()));
    insist(extension && X509_add_ext(certificate, extension.get(), -1) == 1,
           "describe a certificate");
}

std::string alternativeNames(const std::vector<std::string>& names) {
    std::string text;
    for (const std::string& name : names) {
        if (!text.empty()) text += ',';
        text += (isIpAddress(name) ? "IP:" : "DNS:") + name;
    }
    return text;
}

void sign(X509* certificate, EVP_PKEY* key) {
    insist(X509_sign(certificate, key, EVP_sha256()) > 0, "sign a certificate");
}

}  // namespace

void CertificateAuthority::Free::operator()(evp_pkey_st* key) const {
    EVP_PKEY_free(key);
}

void CertificateAuthority::Free::operator()(x509_st* certificate) const {
    X509_free(certificate);
}

CertificateAuthority::CertificateAuthority(Key key, Certificate certificate)
    : key_(std::move(key)), certificate_(std::move(certificate)) {}
CertificateAuthority::CertificateAuthority(CertificateAuthority&&) noexcept = default;
CertificateAuthority& CertificateAuthority::operator=(CertificateAuthority&&) noexcept = default;
CertificateAuthority::~CertificateAuthority() = default;

CertificateAuthority::Key CertificateAuthority::newKey() {
    Key key(EVP_EC_gen("P-256"));
    insist(key != nullptr, "make a key");
    return key;
}

CertificateAuthority::Certificate CertificateAuthority::unsignedCertificate(const std::string& name,
                                                                            evp_pkey_st* key,
                                                                            Moment now,
                                                                            Moment until) {
    Certificate made(X509_new());
    insist(made && X509_set_version(made.get(), X509_VERSION_3) == 1 &&
               ASN1_TIME_set(X509_getm_notBefore(made.get()), secondsOf(now) - kBackdated) &&
               ASN1_TIME_set(X509_getm_notAfter(made.get()), secondsOf(until)) &&
               X509_set_pubkey(made.get(), key) == 1 &&
               X509_NAME_add_entry_by_txt(X509_get_subject_name(made.get()), "CN", MBSTRING_UTF8,
                                          reinterpret_cast<const unsigned char*>(name.data()),
                                          static_cast<int>(name.size()), -1, 0) == 1,
           "make a certificate");
    setSerial(made.get());
    return made;
}

CertificateAuthority CertificateAuthority::make(const std::string& fleet, Moment now,
                                                Moment until) {
    Key key = newKey();
    Certificate made = unsignedCertificate("fleet " + fleet, key.get(), now, until);
    X509* const certificate = made.get();
    insist(X509_set_issuer_name(certificate, X509_get_subject_name(certificate)) == 1,
           "name an issuer");
    extend(certificate, certificate, NID_basic_constraints, "critical,CA:TRUE,pathlen:0");
    extend(certificate, certificate, NID_key_usage, "critical,keyCertSign,cRLSign");
    extend(certificate, certificate, NID_subject_key_identifier, "hash");
    sign(certificate, key.get());
    return {std::move(key), std::move(made)};
}

CertificateAuthority CertificateAuthority::of(const std::string& certificate,
                                              std::string_view keyText) {
    Certificate read(certificateIn(certificate).release());
    std::string bytes(keyText.size(), '\0');
    std::size_t length = 0;
    const bool isText = sodium_base642bin(reinterpret_cast<unsigned char*>(bytes.data()),
                                          bytes.size(), keyText.data(), keyText.size(), nullptr,
                                          &length, nullptr, kBase64Line) == 0 &&
                        length > 0;
    const auto* at = reinterpret_cast<const unsigned char*>(bytes.data());
    Key key(isText ? d2i_AutoPrivateKey(nullptr, &at, static_cast<long>(length)) : nullptr);
    wipe(bytes);
    if (!key || X509_check_private_key(read.get(), key.get()) != 1) {
        throw KeysError("the key of the TLS authority is not that of its certificate");
    }
    return {std::move(key), std::move(read)};
}

std::string CertificateAuthority::certificate() const {
    return pemOf(certificate_.get());
}

SecretText CertificateAuthority::keyText() const {
    const SecretText der = writtenBy([&](BIO* to) {
        return i2d_PKCS8PrivateKey_bio(to, key_.get(), nullptr, nullptr, 0, nullptr, nullptr);
    });
    std::string text(sodium_base64_encoded_len(der.view().size(), kBase64Line), '\0');
    sodium_bin2base64(text.data(), text.size(),
                      reinterpret_cast<const unsigned char*>(der.view().data()), der.view().size(),
                      kBase64Line);
    text.pop_back();  // the zero byte at its end
    return SecretText(std::move(text));
}

ServerCertificate CertificateAuthority::issue(const std::vector<std::string>& names, Moment now,
                                              Moment until) const {
    checkServerNames(names);
    const Key key = newKey();
    // The common name is short by its definition, and nobody looks at it beside the others.
    const Certificate made = unsignedCertificate("fleet server", key.get(), now, until);
    X509* const issuer = certificate_.get();
    insist(X509_set_issuer_name(made.get(), X509_get_subject_name(issuer)) == 1, "name an issuer");
    extend(made.get(), issuer, NID_basic_constraints, "critical,CA:FALSE");
    extend(made.get(), issuer, NID_key_usage, "critical,digitalSignature");
    // The servers of a cluster are each other's clients.
    extend(made.get(), issuer, NID_ext_key_usage, "serverAuth,clientAuth");
    extend(made.get(), issuer, NID_subject_alt_name, alternativeNames(names));
    extend(made.get(), issuer, NID_authority_key_identifier, "keyid:always");
    sign(made.get(), key_.get());
    return {pemOf(made.get()) + certificate(), writtenBy([&](BIO* to) {
                return PEM_write_bio_PKCS8PrivateKey(to, key.get(), nullptr, nullptr, 0, nullptr,
                                                     nullptr);
            })};
}

std::string fingerprintOfCertificate(std::string_view pem) {
    const auto certificate = certificateIn(pem);
    std::array<unsigned char, EVP_MAX_MD_SIZE> digest{};
    unsigned length = 0;
    insist(X509_digest(certificate.get(), EVP_sha256(), digest.data(), &length) == 1,
           "compute a fingerprint");
    std::string text(2 * std::size_t{length} + 1, '\0');
    sodium_bin2hex(text.data(), text.size(), digest.data(), length);
    text.pop_back();  // the zero byte at its end
    return text;
}

Moment endOfCertificate(std::string_view pem) {
    const auto certificate = certificateIn(pem);
    std::tm end{};
    insist(ASN1_TIME_to_tm(X509_get0_notAfter(certificate.get()), &end) == 1,
           "read the end of a certificate");
    return std::chrono::seconds(::timegm(&end));
}

}  // namespace fleet
