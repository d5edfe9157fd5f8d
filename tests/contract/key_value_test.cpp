// Key-value files, and the last error.
#include "platform/account.h"
#include "platform/share.h"
#include "tests/contract/contract_test.h"

#include <array>
#include <optional>

namespace contract {
namespace {

constexpr const char* infoFile = "/etc/veltinfo.conf";

class KeyValueContract : public ContractTest {
protected:
    /// The key's value in the system information file, in a buffer of `size` bytes; nothing when there is no
    /// such key.
    static std::optional<std::string> read(const char* key, int size = 64) {
        std::array<char, 64> buffer{};
        buffer.fill('?');
        const int result = VLIBCFileGetKeyValue(infoFile, key, buffer.data(), size, 0);
        EXPECT_GE(result, 0) << lastError();
        for (auto at = static_cast<std::size_t>(size); at < buffer.size(); ++at) {
            EXPECT_EQ(buffer[at], '?') << "byte " << at << " lies behind the buffer";
        }
        return result > 0 ? std::optional<std::string>(buffer.data()) : std::nullopt;
    }
    static void write(const char* key, const char* value) {
        ASSERT_GE(VLIBCINFOSetKeyValue(key, value), 0) << lastError();
    }
};

TEST_F(KeyValueContract, AKeyIsFoundOnceItIsWritten) {
    write("model", "first");
    EXPECT_EQ(read("model"), "first");
    EXPECT_EQ(read("other"), std::nullopt);
    EXPECT_EQ(read("mode"), std::nullopt);
    write("model", "second one");
    EXPECT_EQ(read("model"), "second one");
}

TEST_F(KeyValueContract, AnEmptyValueIsAValue) {
    write("model", "");
    EXPECT_EQ(read("model"), "");
}

TEST_F(KeyValueContract, TheOtherKeysStay) {
    write("model", "one");
    write("ftp_ext_ip", "203.0.113.7");
    write("unique", "two words");
    write("ftp_ext_ip", "198.51.100.9");
    EXPECT_EQ(read("model"), "one");
    EXPECT_EQ(read("unique"), "two words");
    EXPECT_EQ(read("ftp_ext_ip"), "198.51.100.9");
    write("ftp_ext_ip", "");
    EXPECT_EQ(read("model"), "one");
    EXPECT_EQ(read("ftp_ext_ip"), "");
}

TEST_F(KeyValueContract, ALongerValueIsCut) {
    write("ftp_ext_ip", "203.0.113.123");
    EXPECT_EQ(read("ftp_ext_ip", 14), "203.0.113.123");
    EXPECT_EQ(read("ftp_ext_ip", 13), "203.0.113.12");
    EXPECT_EQ(read("ftp_ext_ip", 2), "2");
    EXPECT_EQ(read("ftp_ext_ip", 1), "");
}

TEST_F(KeyValueContract, AFileThatIsNotThereHasNoKeys) {
    std::array<char, 8> buffer{};
    EXPECT_EQ(read("model"), std::nullopt) << "nothing was written yet";
    EXPECT_EQ(VLIBCFileGetKeyValue("/etc/no-such-file.conf", "model", buffer.data(), 8, 0), 0);
    EXPECT_EQ(VLIBCFileGetKeyValue("/no-such-folder/file.conf", "model", buffer.data(), 8, 0), 0);
}

TEST_F(KeyValueContract, WhatCannotBeReadOrWrittenFails) {
    write("model", "one");
    std::array<char, 8> buffer{};
    EXPECT_LT(VLIBCFileGetKeyValue("/etc", "model", buffer.data(), 8, 0), 0) << "a folder";
    EXPECT_LT(VLIBCFileGetKeyValue(nullptr, "model", buffer.data(), 8, 0), 0);
    EXPECT_LT(VLIBCFileGetKeyValue(infoFile, nullptr, buffer.data(), 8, 0), 0);
    EXPECT_LT(VLIBCINFOSetKeyValue(nullptr, "x"), 0);
    EXPECT_LT(VLIBCINFOSetKeyValue("model", nullptr), 0);
    EXPECT_EQ(read("model"), "one");
}

class LastErrorContract : public ContractTest {};

TEST_F(LastErrorContract, IsNoneAtFirst) {
    EXPECT_EQ(VLIBCErrGet(), 0);
    EXPECT_STREQ(VLIBCErrorGetFile(), "");
    EXPECT_EQ(VLIBCErrorGetLine(), 0);
}

TEST_F(LastErrorContract, IsSetByAFailedLookUp) {
    VELT_SHARE* share = nullptr;
    VELT_USER* user = nullptr;
    VELT_GROUP* group = nullptr;
    int isUser = 0;
    std::array<char, 16> text{};
    const auto fails = [&](int lookUp) {
        switch (lookUp) {
        case 0:
            return VELTShareGet("nowhere", &share);
        case 1:
            return VELTUserGet("nobody", &user);
        case 2:
            return VELTGroupGet("nobody", &group);
        default:
            return VELTFTPChrootRuleParseToName("nonsense", &isUser, text.data(), 16, text.data(), 16);
        }
    };
    for (int lookUp = 0; lookUp < 4; ++lookUp) {
        TearDown();
        SetUp();
        ASSERT_LT(fails(lookUp), 0) << lookUp;
        EXPECT_NE(VLIBCErrGet(), 0) << lookUp;
        ASSERT_NE(VLIBCErrorGetFile(), nullptr);
        EXPECT_STRNE(VLIBCErrorGetFile(), "") << lookUp;
        EXPECT_GT(VLIBCErrorGetLine(), 0) << lookUp;
    }
}

} // namespace
} // namespace contract
