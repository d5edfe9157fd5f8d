// What is a public key, and what is none.
#include "standalone/keys/public_key.h"

#include "base/text.h"
#include "standalone/keys/key_blob.h"
#include "tests/standalone/support/example_keys.h"
#include "tests/standalone/support/text_breaker.h"
#include "tests/support/result.h"
#include "tests/support/run_program.h"
#include "tests/support/temporary_folder.h"
#include "tests/support/text.h"

#include <gtest/gtest.h>

namespace velt::test {
namespace {

struct Example {
    const char* type;
    const char* base64;
    const char* fingerprint; ///< as ssh-keygen told
    int bits;

    std::string line() const { return std::string(type) + ' ' + base64; }
};

const Example examples[] = {
    {"ssh-ed25519", "AAAAC3NzaC1lZDI1NTE5AAAAIG6o8kw9HXo7MMRTNqpwImZIpCtgXHP+yTaiesMotiqn",
     "SHA256:c7wij9jSPaWxr0rn8PdTcjybaczY12MU+OVKvcddZjc", 256},
    {"ecdsa-sha2-nistp256",
     "AAAAE2VjZHNhLXNoYTItbmlzdHAyNTYAAAAIbmlzdHAyNTYAAABBBHx2IkktIkrPbH4UTw8GmlCD8A10txdPLuy2"
     "o6QVyUq8UZEds534rkw+AGbQctY2rDu330UG6Lo+BwMdys28ca4=",
     "SHA256:iPDOAAnSAKsXkIwrVnmslkrk850r2cCTvREe5vc8T8E", 256},
    {"ecdsa-sha2-nistp384",
     "AAAAE2VjZHNhLXNoYTItbmlzdHAzODQAAAAIbmlzdHAzODQAAABhBEeN71imvqhneTwsskAY8TLYl+/SgQI6gi8o"
     "z7BjZPrASPFH6FCcK0SEiGcFFdbzodgEzfYAAfeOPuusnix8o05z+0bX3dpS4pQTdl/HZbD5IWZs3UnQQzsJ4E+Y"
     "nWQHFg==",
     "SHA256:hrnZZHos6iyI+QVPYqUOzX3Nzo+SIZ7TRjrAi4iKd7I", 384},
    {"ecdsa-sha2-nistp521",
     "AAAAE2VjZHNhLXNoYTItbmlzdHA1MjEAAAAIbmlzdHA1MjEAAACFBACq1z0juutVEVET8L8inEOXYWmn3SORhzFi"
     "f9PtBUraHDKlZSPLXE8PXkByHuxo/DVs832srWp/VkYQ9GunopK8tQFhKm+ul7awlzy45Laun3XkKNgLF/4UTIWH"
     "8DWV27UJSYuj/Ymf229Y1BEaWelLA5QRwCn/pwW3Gm3N3K6QUrZtQQ==",
     "SHA256:3ZZ+owmI+SvlEzRloz6vlaE4BwgcSU24okrjbX9mkBc", 521},
    {"ssh-rsa",
     "AAAAB3NzaC1yc2EAAAADAQABAAABAQDFiGFtcSyCnbLEyXpZ24bCKH1lddY6RDabvos3s+VU2gN7rD93L536XXav"
     "HqJk1cT1v4ejEONucpxGDIK04WjLHohBIlfGexI2ufsqf9TMGMWt+WeGcl4RiIaR0gpK9hnsGkvQflgGXMerI8Ji"
     "UBpn96gCRc3AH2Kb7Qroql7egPWVzdBGJT8C7nAIM/YF8OdbZN5zfjcCAQ3B8Xtxhgj5kIoa35e4VUU0sDWg+jnE"
     "xp2HfmqhGSnP/Cdb7VtRSpAsvgYUJG0g92VsptIlgSRE/IAgR3Jk5DKz/+F0QztBjgR0wztGilhiwP5EtGb3HM6m"
     "Th7VC1mBzL6A6rON9V67",
     "SHA256:UKkDfhrKVb3M6oT8QqBDG0XZ5z7alAr4OtftTdu7xF8", 2048},
    {"sk-ssh-ed25519@openssh.com",
     "AAAAGnNrLXNzaC1lZDI1NTE5QG9wZW5zc2guY29tAAAAIG6o8kw9HXo7MMRTNqpwImZIpCtgXHP+yTaiesMotiqn"
     "AAAABHNzaDo=",
     "SHA256:OlTWYcCt3V1vwptVKrR9KiLs9IWFHnXsFfSJo2/3tH8", 256},
    {"sk-ecdsa-sha2-nistp256@openssh.com",
     "AAAAInNrLWVjZHNhLXNoYTItbmlzdHAyNTZAb3BlbnNzaC5jb20AAAAIbmlzdHAyNTYAAABBBHx2IkktIkrPbH4U"
     "Tw8GmlCD8A10txdPLuy2o6QVyUq8UZEds534rkw+AGbQctY2rDu330UG6Lo+BwMdys28ca4AAAAEc3NoOg==",
     "SHA256:jleVZVeqac/+2mY2EEV/Wr/rJRmq55uKEgq/HJHQqb8", 256},
};

const std::string tooSmall =
    "ssh-rsa AAAAB3NzaC1yc2EAAAADAQABAAAAgQDBhnk3B/fpz2Y05QmMVlkwXHttk4W90+ejlYf+B4hPeRnzHDlh"
    "/qKB75rmGRPauA6ZlAaAVwgLwF6dTTlvDSM5zjH0fHGPwrvijYKKfyd6f/KSYLnV5jxzunpMtNY4LfPrEtKEQXrW"
    "OdxVTcJfADc85E4QYM4800ZDYCz75YZGBw==";
const std::string ofDsa = "ssh-dss AAAAB3NzaC1kc3MAAAAB";

/// A field of a key, with its length before it.
std::string field(const std::string& bytes) {
    std::string text;
    for (int shift = 24; shift >= 0; shift -= 8) {
        text += static_cast<char>(bytes.size() >> shift);
    }
    return text + bytes;
}

std::string reason(const std::string& line) {
    const auto key = parsePublicKey(line);
    return key ? "" : key.error().message;
}

TEST(PublicKeys, AreReadAsSshKeygenReadsThem) {
    for (const Example& each : examples) {
        const auto key = parsePublicKey("  " + each.line() + "\tanna at the desk \r");
        ASSERT_EQ(messageOf(key), "") << each.type;
        EXPECT_EQ(key->type, each.type);
        EXPECT_EQ(key->base64, each.base64);
        EXPECT_EQ(key->fingerprint, each.fingerprint);
        EXPECT_EQ(key->bits, each.bits);
        EXPECT_EQ(key->comment, "anna at the desk");
        EXPECT_EQ(toText(*key), each.line() + " anna at the desk");
        EXPECT_EQ(lineForDaemon(*key), "restrict " + each.line() + "\n");
        EXPECT_EQ(parsePublicKey(toText(*key)), *key);
    }
}

TEST(PublicKeys, KeepTheirRestrictions) {
    const auto key = parsePublicKey("from=\"192.0.2.0/24\",expiry-time=\"20271231Z\" " + aKey + " a");
    ASSERT_EQ(messageOf(key), "");
    EXPECT_EQ(key->fingerprint, aFingerprint);
    EXPECT_EQ(toText(*key), "from=\"192.0.2.0/24\",expiry-time=\"20271231000000Z\" " + aKey + " a");
    EXPECT_EQ(lineForDaemon(*key),
              "restrict,from=\"192.0.2.0/24\",expiry-time=\"20271231000000Z\" " + aKey + "\n");
    EXPECT_EQ(parsePublicKey(toText(*key)), *key);
}

TEST(PublicKeys, AreNeitherWeakNorOfAnotherKind) {
    EXPECT_EQ(reason(tooSmall), "an RSA key of 2048 to 16384 bits, not of 1024");
    EXPECT_EQ(reason(ofDsa), "a key of another type than DSA, which is not safe");
    EXPECT_EQ(reason("ssh-ed25519-cert-v01@openssh.com AAAA"), "the public key itself and no certificate");
    for (const char* const line : {"ssh-rsa1 AAAA", "ssh-ed448 AAAA", "SSH-ED25519 AAAA"}) {
        EXPECT_NE(reason(line), "") << line;
    }
}

TEST(PublicKeys, HaveOnlyOptionsThatRestrictWhenAndWhence) {
    for (const char* const option :
         {"command=\"/bin/sh\"", "Command=\"internal-sftp\"", "environment=\"A=b\"", "cert-authority",
          "principals=\"a\"", "permitopen=\"a:1\"", "tunnel=\"1\"", "pty", "restrict", "no-pty",
          "port-forwarding", "verify-required", "from=\"192.0.2.1\",command=\"x\""}) {
        const std::string name = lowerCase(option);
        const std::string why = reason(std::string(option) + ' ' + aKey);
        EXPECT_TRUE(why.starts_with("no other option than from and expiry-time, but there is ")) << why;
        const std::string named = why.substr(why.rfind(' ') + 1);
        EXPECT_TRUE(contains(name, named)) << why;
    }
}

TEST(PublicKeys, AreOneWholeLine) {
    const std::string base64 = aKey.substr(aKey.find(' ') + 1);
    for (const std::string& line : {
             std::string(),
             std::string("# ") + aKey,
             std::string("ssh-ed25519"),
             base64,
             std::string("ssh-ed25519 "),
             "ssh-ed25519 " + base64.substr(0, base64.size() - 4),
             "ssh-ed25519 " + base64 + "AAAA",
             "ssh-ed25519 " + base64.substr(0, 20) + " " + base64.substr(20),
             "ssh-ed25519 " + base64.substr(0, base64.size() - 1) + "=",
             "ssh-ed25519 " + base64 + "=",
             std::string("ssh-ed25519 ===="),
             "ssh-ed25519 -" + base64.substr(1),
             "ssh-rsa " + base64,
             "sk-ssh-ed25519@openssh.com " + base64,
             "ssh-ed25519 " + anotherKey.substr(anotherKey.find(' ') + 1),
             "ecdsa-sha2-nistp384 " + anotherKey.substr(anotherKey.find(' ') + 1),
             aKey + " a\nssh-rsa B",
             aKey + "\n" + aKey,
             aKey + " a\x01z",
             aKey + " a\xff",
             aKey + std::string(" a\0b", 4),
             "from=\"192.0.2.1 " + aKey,
             std::string("from=\"192.0.2.1\""),
             "from=\"192.0.2.1\" from=\"192.0.2.1\" " + aKey,
             "\x1b[2J " + aKey,
             aKey + " " + std::string(longestKeyLine, 'a'),
         }) {
        EXPECT_NE(reason(line), "") << line;
    }
    EXPECT_EQ(reason(aKey + " " + std::string(longestKeyLine - aKey.size() - 1, 'a')), "");
}

TEST(PublicKeys, HaveOneForm) {
    const auto check = [](const std::string& type, const std::string& rest) {
        return messageOf(checkKeyBlob(type, field(type) + rest));
    };
    const std::string modulus = '\xc1' + std::string(254, '\x5a') + '\x01';
    const std::string zero(1, '\0');
    const std::string exponent = "\x01" + zero + "\x01";
    EXPECT_EQ(check("ssh-rsa", field(exponent) + field(zero + modulus)), "");
    const std::string bad = "base64 that is one whole key of the type ssh-rsa";
    for (const std::string& rest :
         {field(exponent) + field(modulus), field(exponent) + field(zero + zero + modulus),
          field(zero + exponent) + field(zero + modulus), field(exponent) + field(zero + modulus) + "x",
          field(exponent) + field(zero + modulus) + field(""), field(exponent), field(""),
          field("") + field(zero + modulus), field("\x01") + field(zero + modulus),
          field("\x02") + field(zero + modulus), field(exponent) + field(""), field(exponent) + field(zero),
          field(exponent) + field(zero + modulus.substr(0, 255) + "\x02"), std::string("\xff\xff\xff\xff", 4),
          std::string("\x00\x00", 2)}) {
        EXPECT_EQ(check("ssh-rsa", rest), bad);
    }
    EXPECT_NE(check("ssh-ed25519", field(std::string(31, 'a'))), "");
    EXPECT_NE(check("ssh-ed25519", field(std::string(33, 'a'))), "");
    EXPECT_EQ(check("ssh-ed25519", field(std::string(32, 'a'))), "");
    EXPECT_NE(check("sk-ssh-ed25519@openssh.com", field(std::string(32, 'a'))), "") << "no application";
    EXPECT_EQ(check("sk-ssh-ed25519@openssh.com", field(std::string(32, 'a')) + field("ssh:")), "");
}

TEST(PublicKeys, AreOnTheirCurve) {
    const std::string blob = *decodedBase64(anotherKey.substr(anotherKey.find(' ') + 1));
    EXPECT_EQ(messageOf(checkKeyBlob("ecdsa-sha2-nistp256", blob)), "");
    std::string elsewhere = blob;
    elsewhere.back() = static_cast<char>(elsewhere.back() ^ 1);
    EXPECT_NE(messageOf(checkKeyBlob("ecdsa-sha2-nistp256", elsewhere)), "");
    std::string compressed = blob;
    compressed[compressed.size() - 65] = 2;
    EXPECT_NE(messageOf(checkKeyBlob("ecdsa-sha2-nistp256", compressed)), "");
}

// Whatever is taken, the system's own program takes for the same key.
TEST(PublicKeys, AreKeysForSshKeygenToo) {
    const TemporaryFolder folder;
    TextBreaker breaker;
    int taken = 0;
    for (int i = 0; i < 30000; ++i) {
        const Example& example = examples[static_cast<std::size_t>(i) % std::size(examples)];
        const std::string line = breaker.broken(example.line() + " c");
        const auto key = parsePublicKey(line);
        if (!key || (key->fingerprint == example.fingerprint && taken > 20)) {
            continue;
        }
        const auto shown =
            runProcess({"ssh-keygen", "-lf", folder.write("key.pub", lineForDaemon(*key)).string()});
        EXPECT_TRUE(shown.output.starts_with(std::to_string(key->bits) + ' ' + key->fingerprint + ' '))
            << line << shown.output << shown.errors;
        ++taken;
    }
    EXPECT_GT(taken, 20);
}

} // namespace
} // namespace velt::test
