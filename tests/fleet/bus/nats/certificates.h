/// Certificates of a test's own authority.
#pragma once

#include <openssl/evp.h>
#include <openssl/pem.h>
#include <openssl/x509v3.h>

#include <memory>
#include <stdexcept>
#include <string>

namespace certificates {

struct Free {
    void operator()(EVP_PKEY* key) const { EVP_PKEY_free(key); }
    void operator()(X509* certificate) const { X509_free(certificate); }
    void operator()(X509_EXTENSION* extension) const { X509_EXTENSION_free(extension); }
    void operator()(BIO* text) const { BIO_free(text); }
};
using Key = std::unique_ptr<EVP_PKEY, Free>;
using Certificate = std::unique_ptr<X509, Free>;

/// What a write function of OpenSSL writes.
template <typename Write>
std::string written(Write write) {
    const std::unique_ptr<BIO, Free> text(BIO_new(BIO_s_mem()));
    if (!text || write(text.get()) != 1) throw std::runtime_error("nothing can be written");
    char* data = nullptr;
    const long length = BIO_get_mem_data(text.get(), &data);
    return std::string(data, static_cast<std::size_t>(length));
}

struct Pair {
    std::string certificate;  ///< PEM
    std::string key;          ///< PEM
};

/// Signs certificates of servers.
class Authority {
public:
    Authority() : key_(newKey()), certificate_(make("authority", key_.get(), nullptr)) {}

    std::string pem() const {
        return written([&](BIO* to) { return PEM_write_bio_X509(to, certificate_.get()); });
    }

    /// For a server of that DNS name.
    Pair issue(const std::string& name) const {
        const Key key = newKey();
        const Certificate made = make(name, key.get(), this);
        return {written([&](BIO* to) { return PEM_write_bio_X509(to, made.get()); }),
                written([&](BIO* to) {
                    return PEM_write_bio_PrivateKey(to, key.get(), nullptr, nullptr, 0, nullptr,
                                                    nullptr);
                })};
    }

private:
    static Key newKey() { return Key(EVP_EC_gen("P-256")); }

    static void extend(X509* certificate, int what, const std::string& value) {
        const std::unique_ptr<X509_EXTENSION, Free> extension(
            X509V3_EXT_conf_nid(nullptr, nullptr, what, value.c_str()));
        if (!extension || X509_add_ext(certificate, extension.get(), -1) != 1) {
            throw std::runtime_error("no such extension: " + value);
        }
    }

    static Certificate make(const std::string& name, EVP_PKEY* key, const Authority* by) {
        constexpr long kDay = 86400;
        Certificate made(X509_new());
        X509_set_version(made.get(), X509_VERSION_3);
        ASN1_INTEGER_set(X509_get_serialNumber(made.get()), by == nullptr ? 1 : 2);
        X509_gmtime_adj(X509_getm_notBefore(made.get()), -kDay);
        X509_gmtime_adj(X509_getm_notAfter(made.get()), kDay);
        X509_set_pubkey(made.get(), key);
        X509_NAME* subject = X509_get_subject_name(made.get());
        X509_NAME_add_entry_by_txt(subject, "CN", MBSTRING_ASC,
                                   reinterpret_cast<const unsigned char*>(name.c_str()), -1, -1, 0);
        X509* issuer = by == nullptr ? made.get() : by->certificate_.get();
        X509_set_issuer_name(made.get(), X509_get_subject_name(issuer));
        if (by == nullptr) {
            extend(made.get(), NID_basic_constraints, "critical,CA:TRUE");
        } else {
            extend(made.get(), NID_subject_alt_name, "DNS:" + name);
        }
        if (X509_sign(made.get(), by == nullptr ? key : by->key_.get(), EVP_sha256()) == 0) {
            throw std::runtime_error("nothing can be signed");
        }
        return made;
    }

    Key key_;
    Certificate certificate_;
};

}  // namespace certificates
