#include "base/sha256.h"
#include "standalone/core/effects.h"
#include "standalone/core/state_root.h"
#include "standalone/daemons/tls/certificate.h"
#include "standalone/daemons/tls/self_signed.h"
#include "tests/support/result.h"
#include "tests/support/run_program.h"
#include "tests/support/temporary_folder.h"
#include "tests/support/text.h"

#include <gtest/gtest.h>
#include <sys/stat.h>

namespace velt::test {
namespace {

std::string described(const std::string& certificate) {
    // Versions differ in how they write a name unless they are told.
    return runProcess({"openssl", "x509", "-noout", "-text", "-nameopt", "RFC2253"}, certificate).output;
}

TEST(SelfSigned, standsForTheHostAndItsAddresses) {
    const auto made = makeSelfSigned({"files.example", {"192.0.2.7", "2001:db8::7", "nonsense"}});
    ASSERT_TRUE(made);
    const std::string text = described(made->certificate);
    EXPECT_TRUE(contains(text, "Subject: CN=files.example"));
    EXPECT_TRUE(contains(text, "DNS:files.example, IP Address:192.0.2.7, IP Address:2001:DB8:0:0:0:0:0:7\n"))
        << text;
    EXPECT_TRUE(contains(text, "ASN1 OID: prime256v1"));
    EXPECT_TRUE(contains(text, "CA:FALSE"));
    EXPECT_TRUE(contains(text, "TLS Web Server Authentication"));
}

TEST(SelfSigned, leavesOutAHostNameThatIsNone) {
    for (const std::string& name : {std::string(), std::string("a,IP:1.2.3.4"), std::string("a\nb"),
                                    std::string("\xff"), std::string(300, 'a')}) {
        const auto made = makeSelfSigned({name, {"192.0.2.7"}});
        ASSERT_TRUE(made);
        const std::string text = described(made->certificate);
        EXPECT_TRUE(contains(text, "Subject: CN=localhost")) << text;
        EXPECT_FALSE(contains(text, "DNS:")) << text;
    }
}

TEST(SelfSigned, differsEachTime) {
    const auto one = makeSelfSigned({"h", {}});
    const auto other = makeSelfSigned({"h", {}});
    ASSERT_TRUE(one && other);
    EXPECT_NE(one->key, other->key);
    EXPECT_NE(one->certificate, other->certificate);
}

TEST(Digest, isTheOneThatOthersCompute) {
    EXPECT_EQ(sha256("abc"), "ba7816bf8f01cfea414140de5dae2223b00361a396177a9cb410ff61f20015ad");
}

class ServerCertificates : public testing::Test {
protected:
    void SetUp() override { setStateRoot(root_.path()); }
    void TearDown() override { setStateRoot("/"); }

    void give(const SelfSigned& pair) {
        root_.write("etc/velt/tls/server.crt", pair.certificate);
        const auto key = root_.write("etc/velt/tls/server.key", pair.key);
        EXPECT_EQ(chmod(key.c_str(), 0600), 0);
    }
    static void expectRefusal(const std::string& part) {
        const std::string refusal = messageOf(serverCertificate());
        EXPECT_TRUE(contains(refusal, part)) << refusal;
    }

    TemporaryFolder root_;
};

TEST_F(ServerCertificates, areMadeOnceAndKeptPrivate) {
    const auto first = serverCertificate();
    ASSERT_EQ(messageOf(first), "");
    EXPECT_FALSE(first->isRsa);
    struct stat facts {};
    ASSERT_EQ(stat(first->key.c_str(), &facts), 0);
    EXPECT_EQ(facts.st_mode & 07777, 0600U);
    const auto second = serverCertificate();
    ASSERT_TRUE(second);
    EXPECT_EQ(second->fingerprint, first->fingerprint);
}

TEST_F(ServerCertificates, areForATestOnlyWhereNothingMayBeStored) {
    std::vector<std::string> effects;
    setEffectHook([&](Effect effect, std::string_view subject) {
        effects.push_back(std::string(effectName(effect)) + " " + std::string(subject));
        return EffectDecision(Result<>());
    });
    std::filesystem::path key;
    {
        const auto certificate = serverCertificate();
        ASSERT_EQ(messageOf(certificate), "");
        key = certificate->key;
        EXPECT_TRUE(std::filesystem::exists(key));
    }
    setEffectHook({});
    EXPECT_FALSE(std::filesystem::exists(key));
    EXPECT_EQ(effects, std::vector<std::string>{"store certificate"});
    EXPECT_FALSE(std::filesystem::exists(root_.path() / "var/lib/velt/tls"));
}

TEST_F(ServerCertificates, areMadeAnewWhenKeyAndCertificateDoNotMatch) {
    const auto first = serverCertificate();
    ASSERT_TRUE(first);
    root_.write("var/lib/velt/tls/server.key", makeSelfSigned({"h", {}})->key);
    const auto second = serverCertificate();
    ASSERT_EQ(messageOf(second), "");
    EXPECT_NE(second->fingerprint, first->fingerprint);
}

TEST_F(ServerCertificates, ofTheAdministratorComeFirst) {
    ASSERT_TRUE(serverCertificate());
    give(*makeSelfSigned({"given", {}}));
    const auto found = serverCertificate();
    ASSERT_EQ(messageOf(found), "");
    EXPECT_EQ(found->certificate, root_.path() / "etc/velt/tls/server.crt");
}

TEST_F(ServerCertificates, ofTheAdministratorAreNeverReplacedByOwnOnes) {
    root_.write("etc/velt/tls/server.crt", makeSelfSigned({"given", {}})->certificate);
    expectRefusal("server.key cannot be read");
    root_.write("etc/velt/tls/server.key", "nonsense");
    expectRefusal("server.key does not contain an unencrypted PEM private key");
    root_.write("etc/velt/tls/server.key", makeSelfSigned({"other", {}})->key);
    expectRefusal("server.key does not match the certificate");
    root_.write("etc/velt/tls/server.crt", "nonsense");
    expectRefusal("server.crt does not contain a PEM certificate");
}

TEST_F(ServerCertificates, withAKeyThatOthersMayReadAreRefused) {
    give(*makeSelfSigned({"given", {}}));
    const std::string key = root_.path() / "etc/velt/tls/server.key";
    for (const unsigned mode : {0600U, 0400U, 0640U, 0440U}) {
        EXPECT_EQ(chmod(key.c_str(), mode), 0);
        EXPECT_EQ(messageOf(serverCertificate()), "") << std::oct << mode;
    }
    for (const unsigned mode : {0644U, 0604U, 0602U, 0601U, 0660U, 0620U}) {
        EXPECT_EQ(chmod(key.c_str(), mode), 0);
        expectRefusal(key + " is open to other users; mend it with: chmod 640 " + key + ".");
    }
    EXPECT_EQ(chmod(key.c_str(), 0600), 0);
    if (geteuid() == 0) {
        EXPECT_EQ(chown(key.c_str(), 65534, 0), 0);
        expectRefusal("belongs to another user; mend it with: chown root " + key);
    }
}

TEST_F(ServerCertificates, ofThisServerWithAKeyThatOthersMayReadAreRefused) {
    const auto made = serverCertificate();
    ASSERT_EQ(messageOf(made), "");
    ASSERT_EQ(chmod(made->key.c_str(), 0644), 0);
    expectRefusal("is open to other users; mend it with: chmod 640 " + made->key.string());
    EXPECT_FALSE(storedCertificate());
    ASSERT_EQ(chmod(made->key.c_str(), 0600), 0);
    EXPECT_EQ(serverCertificate()->fingerprint, made->fingerprint);
}

TEST_F(ServerCertificates, withAKeyThatAsksForAPassphraseAreRefused) {
    const auto pair = makeSelfSigned({"given", {}});
    give(*pair);
    const auto locked = runProcess({"openssl", "ec", "-aes128", "-passout", "pass:secret"}, pair->key);
    ASSERT_EQ(locked.exitCode, 0) << locked.errors;
    root_.write("etc/velt/tls/server.key", locked.output);
    expectRefusal("server.key does not contain an unencrypted PEM private key");
}

TEST_F(ServerCertificates, mayHaveAnRsaKey) {
    const auto key = (root_.path() / "etc/velt/tls/server.key").string();
    const auto certificate = (root_.path() / "etc/velt/tls/server.crt").string();
    std::filesystem::create_directories(root_.path() / "etc/velt/tls");
    ASSERT_EQ(runProcess({"openssl", "req", "-x509", "-newkey", "rsa:2048", "-nodes", "-subj", "/CN=x",
                          "-keyout", key, "-out", certificate})
                  .exitCode,
              0);
    const auto found = serverCertificate();
    ASSERT_EQ(messageOf(found), "");
    EXPECT_TRUE(found->isRsa);
    ASSERT_EQ(runProcess({"openssl", "req", "-x509", "-newkey", "ed25519", "-nodes", "-subj", "/CN=x",
                          "-keyout", key, "-out", certificate})
                  .exitCode,
              0);
    expectRefusal("expected an RSA or elliptic-curve key");
}

} // namespace
} // namespace velt::test
