#include "fleet/https/front/server_identity.h"

#include <openssl/crypto.h>
#include <openssl/err.h>
#include <openssl/pem.h>
#include <openssl/ssl.h>
#include <sys/stat.h>

#include <utility>

#include "fleet/files/file_error.h"
#include "fleet/files/files.h"
#include "fleet/https/front/front_error.h"
#include "fleet/log/log.h"

namespace fleet {
namespace {

/// Of version 1.2; all of version 1.3 are of this kind.
constexpr const char* kCiphers = "ECDHE+AESGCM:ECDHE+CHACHA20";

struct FreePem {
    void operator()(BIO* text) const { BIO_free_all(text); }
    void operator()(X509* certificate) const { X509_free(certificate); }
    void operator()(EVP_PKEY* key) const { EVP_PKEY_free(key); }
};

/// Wiped when it goes.
struct PemText {
    explicit PemText(std::string content) : text(std::move(content)) {}
    ~PemText() { OPENSSL_cleanse(text.data(), text.size()); }
    PemText(const PemText&) = delete;
    PemText& operator=(const PemText&) = delete;

    std::string text;
};

[[noreturn]] void refuseFile(const std::string& file, const char* why) {
    throw FrontError(file + ": " + why);
}

std::unique_ptr<BIO, FreePem> reader(const PemText& pem) {
    return std::unique_ptr<BIO, FreePem>(
        BIO_new_mem_buf(pem.text.data(), static_cast<int>(pem.text.size())));
}

/// A key under a password would make OpenSSL ask for it at the terminal.
int noPassword(char*, int, int, void*) {
    return -1;
}

std::unique_ptr<EVP_PKEY, FreePem> keyIn(const PemText& pem) {
    const auto text = reader(pem);
    return std::unique_ptr<EVP_PKEY, FreePem>(
        text ? PEM_read_bio_PrivateKey(text.get(), nullptr, noPassword, nullptr) : nullptr);
}

/// The number of certificates that were taken over; the first one is the server's.
int useCertificates(SSL_CTX* context, const PemText& pem) {
    const auto text = reader(pem);
    int count = 0;
    while (text) {
        const std::unique_ptr<X509, FreePem> next(
            PEM_read_bio_X509(text.get(), nullptr, noPassword, nullptr));
        if (!next) break;
        const int isTaken = count == 0
                                ? SSL_CTX_use_certificate(context, next.get())
                                : static_cast<int>(SSL_CTX_add1_chain_cert(context, next.get()));
        if (isTaken != 1) return 0;
        ++count;
    }
    return count;
}

/// What every session is like.
bool setUp(SSL_CTX* context) {
    SSL_CTX_set_options(context, SSL_OP_NO_RENEGOTIATION | SSL_OP_NO_COMPRESSION |
                                     SSL_OP_NO_TICKET | SSL_OP_CIPHER_SERVER_PREFERENCE);
    SSL_CTX_set_session_cache_mode(context, SSL_SESS_CACHE_OFF);
    // A connection that is idle keeps no buffers, and what a write left over may be written from
    // another place.
    SSL_CTX_set_mode(context, SSL_MODE_RELEASE_BUFFERS | SSL_MODE_ENABLE_PARTIAL_WRITE |
                                  SSL_MODE_ACCEPT_MOVING_WRITE_BUFFER);
    // Otherwise one read would go on for as long as a client sends records without content.
    SSL_CTX_clear_mode(context, SSL_MODE_AUTO_RETRY);
    return SSL_CTX_set_num_tickets(context, 0) == 1 &&
           SSL_CTX_set_min_proto_version(context, TLS1_2_VERSION) == 1 &&
           SSL_CTX_set_cipher_list(context, kCiphers) == 1;
}

bool isSame(const timespec& left, const timespec& right) {
    return left.tv_sec == right.tv_sec && left.tv_nsec == right.tv_nsec;
}

}  // namespace

void FreeTls::operator()(ssl_st* session) const {
    SSL_free(session);
}

void FreeTls::operator()(ssl_ctx_st* context) const {
    SSL_CTX_free(context);
}

bool ServerIdentity::Version::operator==(const Version& other) const {
    return device == other.device && inode == other.inode && size == other.size &&
           isSame(changed, other.changed);
}

std::optional<ServerIdentity::Version> ServerIdentity::versionOf(const std::string& file) {
    struct stat found {};
    if (::stat(file.c_str(), &found) != 0) return std::nullopt;
    return Version{found.st_dev, found.st_ino, found.st_size, found.st_ctim};
}

ServerIdentity::Context ServerIdentity::read(const std::string& file) {
    try {
        const PemText pem(readFile(file, Secrecy::Secret));
        Context context(SSL_CTX_new(TLS_server_method()));
        if (!context || !setUp(context.get())) refuseFile(file, "OpenSSL cannot be set up");
        if (useCertificates(context.get(), pem) == 0) refuseFile(file, "holds no certificate");
        const auto key = keyIn(pem);
        if (!key) refuseFile(file, "holds no key, or one under a password");
        if (SSL_CTX_use_PrivateKey(context.get(), key.get()) != 1) {
            refuseFile(file, "the key is not that of the first certificate");
        }
        ERR_clear_error();
        return context;
    } catch (const FileError& error) {
        throw FrontError(error.what());
    }
}

ServerIdentity::ServerIdentity(std::string file)
    : file_(std::move(file)), version_(versionOf(file_)), context_(read(file_)) {}

void ServerIdentity::readAgainIfChanged() {
    const std::optional<Version> now = versionOf(file_);
    if (now == version_) return;
    version_ = now;
    try {
        context_ = read(file_);
        say(Priority::Notice, file_ + " has changed; new clients see the new certificate");
    } catch (const FrontError& error) {
        say(Priority::Error,
            std::string(error.what()) + "; clients still see the certificate before");
    }
}

TlsSession ServerIdentity::sessionOn(int connection) {
    readAgainIfChanged();
    TlsSession session(SSL_new(context_.get()));
    if (!session || SSL_set_fd(session.get(), connection) != 1) return nullptr;
    return session;
}

}  // namespace fleet
