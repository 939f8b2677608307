#include "fleet/server/keys/tls/certificate_authority.h"

#include <gtest/gtest.h>

#include <cctype>
#include <chrono>
#include <string>
#include <vector>

#include "fleet/server/keys/files/keys_error.h"
#include "support/host/program.h"
#include "tests/support/scratch_dir.h"

namespace {

using fleet::CertificateAuthority;
using fleet::Moment;
using fleet::ServerCertificate;

constexpr Moment kDay = std::chrono::hours(24);

Moment today() {
    return std::chrono::duration_cast<Moment>(std::chrono::system_clock::now().time_since_epoch());
}

class TlsAuthority : public testing::Test {
protected:
    /// What the openssl program says of the server's certificate.
    ProgramResult verified(const ServerCertificate& server, const std::string& authority,
                           const std::vector<std::string>& more = {}) const {
        std::vector<std::string> words = {"/usr/bin/openssl",
                                          "verify",
                                          "-x509_strict",
                                          "-purpose",
                                          "sslserver",
                                          "-CAfile",
                                          scratch_.write("ca.pem", authority)};
        words.insert(words.end(), more.begin(), more.end());
        words.push_back(scratch_.write("server.pem", server.chain));
        return runProgram(words);
    }

    const ScratchDir scratch_;
    const Moment now_ = today();
    const CertificateAuthority authority_ =
        CertificateAuthority::make("demo", now_, now_ + 10 * kDay);
    const ServerCertificate server_ =
        authority_.issue({"bus.example", "10.0.0.1"}, now_, now_ + 5 * kDay);
};

TEST_F(TlsAuthority, VouchesForItsServersByTheirNames) {
    const std::string ca = authority_.certificate();
    EXPECT_EQ(verified(server_, ca).status, 0) << verified(server_, ca).err;
    EXPECT_EQ(verified(server_, ca, {"-verify_hostname", "bus.example"}).status, 0);
    EXPECT_EQ(verified(server_, ca, {"-verify_ip", "10.0.0.1"}).status, 0);
    EXPECT_NE(verified(server_, ca, {"-verify_hostname", "other.example"}).status, 0);
}

TEST_F(TlsAuthority, VouchesForNoServerOfAnother) {
    const auto other = CertificateAuthority::make("demo", now_, now_ + 10 * kDay);
    EXPECT_NE(verified(server_, other.certificate()).status, 0);
}

TEST_F(TlsAuthority, MakesNoAuthorityOfAServer) {
    const ScratchDir dir;
    EXPECT_EQ(runProgram({"/usr/bin/openssl", "x509", "-noout", "-ext", "basicConstraints", "-in",
                          dir.write("server.pem", server_.chain)})
                  .out.find("CA:TRUE"),
              std::string::npos);
}

TEST_F(TlsAuthority, GivesTheServerTheKeyOfItsCertificate) {
    const std::string file = scratch_.write("server.key", std::string(server_.key.view()));
    const auto ofKey = runProgram({"/usr/bin/openssl", "pkey", "-pubout", "-in", file});
    const auto ofCertificate = runProgram({"/usr/bin/openssl", "x509", "-noout", "-pubkey", "-in",
                                           scratch_.write("server.pem", server_.chain)});
    ASSERT_EQ(ofKey.status, 0) << ofKey.err;
    EXPECT_EQ(ofKey.out, ofCertificate.out);
}

TEST_F(TlsAuthority, EndsWhenItWasToldTo) {
    const auto seconds = [](Moment moment) {
        return std::chrono::duration_cast<std::chrono::seconds>(moment).count();
    };
    EXPECT_EQ(seconds(fleet::endOfCertificate(server_.chain)), seconds(now_ + 5 * kDay));
    EXPECT_EQ(seconds(fleet::endOfCertificate(authority_.certificate())),
              seconds(now_ + 10 * kDay));
    const Moment far = std::chrono::hours(24 * 365 * 100);  // beyond 2050 times have another form
    EXPECT_EQ(seconds(fleet::endOfCertificate(authority_.issue({"a"}, now_, far).chain)),
              seconds(far));
}

TEST_F(TlsAuthority, IsMadeAgainOfItsCertificateAndKey) {
    const auto again =
        CertificateAuthority::of(authority_.certificate(), authority_.keyText().view());
    EXPECT_EQ(again.keyText().view().find('\n'), std::string::npos);
    const ServerCertificate server = again.issue({"bus.example"}, now_, now_ + kDay);
    EXPECT_EQ(verified(server, authority_.certificate()).status, 0);
}

TEST_F(TlsAuthority, IsNotMadeOfWhatDoesNotBelongTogether) {
    const auto other = CertificateAuthority::make("demo", now_, now_ + kDay);
    EXPECT_THROW(CertificateAuthority::of(authority_.certificate(), other.keyText().view()),
                 fleet::KeysError);
    for (const char* const key : {"", "nonsense", "!"})
        EXPECT_THROW(CertificateAuthority::of(authority_.certificate(), key), fleet::KeysError);
    EXPECT_THROW(CertificateAuthority::of("", authority_.keyText().view()), fleet::KeysError);
    EXPECT_THROW(authority_.issue({"a,DNS:b"}, now_, now_ + kDay), fleet::KeysError);
}

TEST_F(TlsAuthority, HasTheFingerprintThatOtherProgramsShow) {
    std::string shown = runProgram({"/usr/bin/openssl", "x509", "-noout", "-fingerprint", "-sha256",
                                    "-in", scratch_.write("ca.pem", authority_.certificate())})
                            .out;
    shown.erase(0, shown.find('=') + 1);
    std::string expected;
    for (const char c : shown) {
        if (c != ':' && c != '\n') expected += static_cast<char>(std::tolower(c));
    }
    EXPECT_EQ(fleet::fingerprintOfCertificate(authority_.certificate()), expected);
    EXPECT_EQ(expected.size(), 64U);
}

}  // namespace
