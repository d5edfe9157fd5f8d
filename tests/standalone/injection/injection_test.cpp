// Hostile texts, handed to every setter that takes one: each is refused and changes nothing, or is stored and
// comes back the same, and nothing beside it changes.
#include "ftp/ftp_library.h"
#include "platform/service.h"
#include "platform/sftp.h"
#include "standalone/accounts/account_sources.h"
#include "standalone/contract/last_error.h"
#include "standalone/settings/settings.h"
#include "standalone/shares/share_store.h"
#include "tests/standalone/support/state_folder.h"
#include "tests/standalone/support/store_shares.h"

#include <gtest/gtest.h>

#include <algorithm>
#include <array>
#include <cstring>
#include <map>
#include <optional>

namespace velt::test {
namespace {

const std::string attempts[] = {
    "a\nport = \"1\"",
    "a\n",
    "\n",
    "a\r\nServerIdent on PWNED",
    "a\"\nport = 1",
    "\"",
    "\\",
    "a\\\"b",
    "'",
    "%{env:HOME}",
    "%u",
    "%s%n",
    "$(touch /tmp/x)",
    "`id`",
    "a;b|c&d",
    "*",
    "#",
    "=",
    ":",
    "u:0:/home",
    "../../../etc/passwd",
    "/../escape",
    "/share/../../escape",
    "..",
    ".",
    "/",
    "//share",
    "-x",
    "--help",
    " leading",
    "trailing ",
    "a\tb",
    "\x01 b",
    "\x7f",
    "\x1b[2J",
    "\xff\xfe",
    "\xc3",
    "\xc0\xaf",
    "\xed\xa0\x80",
    "\xe2\x80\xa8",
    "Öffentlich 共有",
    "homes",
    "null",
    std::string(480, 'x'),
    std::string(5000, 'x') + "\nServerIdent on PWNED",
    "/" + std::string(3000, 'x'),
};

using Text = std::optional<std::string>;

/// A setter that takes a text, and how the text is read back.
struct Setter {
    const char* name;
    int (*store)(const std::string& text); ///< 1: the text does not fit into what the setter takes
    Text (*read)(const std::string& text);
};

constexpr int notASetting = 1;

template<std::size_t size> int storeField(char (_tag_VELT_FTP_CONF_::*field)[size], const std::string& text) {
    _tag_VELT_FTP_CONF_ record{};
    if (text.size() >= size || VELTFTPConfGet(&record) < 0) {
        return notASetting;
    }
    std::memset(record.*field, 0, size);
    text.copy(record.*field, size);
    return VELTFTPConfSet(record);
}

template<std::size_t size> Text readField(char (_tag_VELT_FTP_CONF_::*field)[size]) {
    _tag_VELT_FTP_CONF_ record{};
    return VELTFTPConfGet(&record) < 0 ? Text() : Text(record.*field);
}

Text readKey(const std::string& key) {
    std::array<char, 8192> value{};
    const int found = VLIBCFileGetKeyValue("/etc/veltinfo.conf", key.c_str(), value.data(),
                                           static_cast<int>(value.size()), 0);
    return found > 0 ? Text(value.data()) : Text();
}

class List {
public:
    explicit List(const std::vector<std::string>& texts = {}) {
        for (const std::string& text : texts) {
            VLIBCSzListPush(&list_, text.c_str());
        }
    }
    ~List() { VLIBCSzListFree(list_); }
    List(const List&) = delete;
    List& operator=(const List&) = delete;
    VLIBCSzList*& get() { return list_; }

private:
    VLIBCSzList* list_ = VLIBCSzListAlloc(8);
};

constexpr const char* rule = "u:1001:/public";

int storeRulePath(const std::string& path) {
    std::array<char, 8192> line{};
    const int formatted =
        VELTFTPChrootRuleFormat(line.data(), static_cast<int>(line.size()), 1, 1000, path.c_str());
    return formatted < 0 ? formatted : VELTFTPChrootRuleSave(List({rule, line.data()}).get());
}

int storeRuleLine(const std::string& line) {
    return VELTFTPChrootRuleSave(List({rule, line}).get());
}

Text lastRule() {
    List rules;
    if (VELTFTPChrootRuleEnum(&rules.get()) < 0 || rules.get()->count < 1) {
        return {};
    }
    return VLIBCSzListGet(rules.get(), rules.get()->count - 1);
}

Text lastRulePath() {
    int isUser = 0;
    std::array<char, 64> name{};
    std::array<char, 8192> path{};
    const Text line = lastRule();
    const bool read =
        line && VELTFTPChrootRuleParseToName(line->c_str(), &isUser, name.data(), 64, path.data(), 8192) >= 0;
    return read ? Text(path.data()) : Text();
}

int storeShare(const std::string& name, const std::string& comment, const std::string& path,
               const std::string& user) {
    ShareEntry share;
    share.name = name;
    share.comment = comment;
    share.path = path;
    share.users[user] = Access::read;
    if (const auto good = checkShares({share}); !good) {
        return fail(good.error().number, "These shares cannot be: " + good.error().message + ".");
    }
    const auto stored = storeShares({share});
    return stored ? 0 : fail(stored.error());
}

template<class Part> Text readShare(Part part) {
    const auto shares = loadShares();
    return shares && shares->size() == 1 ? Text(part(shares->front())) : Text();
}

const Setter setters[] = {
    {"ThePort", [](const std::string& text) { return storeField(&_tag_VELT_FTP_CONF_::portnum, text); },
     [](const std::string&) { return readField(&_tag_VELT_FTP_CONF_::portnum); }},
    {"TheAnonymousShare",
     [](const std::string& text) { return storeField(&_tag_VELT_FTP_CONF_::anonymous_chroot_share, text); },
     [](const std::string&) { return readField(&_tag_VELT_FTP_CONF_::anonymous_chroot_share); }},
    {"TheExternalAddress",
     [](const std::string& text) { return VLIBCINFOSetKeyValue("ftp_ext_ip", text.c_str()); },
     [](const std::string&) { return readKey("ftp_ext_ip"); }},
    {"AValueOfTheSystem", [](const std::string& text) { return VLIBCINFOSetKeyValue("model", text.c_str()); },
     [](const std::string&) { return readKey("model"); }},
    {"AKeyOfTheSystem", [](const std::string& text) { return VLIBCINFOSetKeyValue(text.c_str(), "value"); },
     [](const std::string& text) { return readKey(text) == "value" ? Text(text) : Text(); }},
    {"ThePathOfARule", storeRulePath, [](const std::string&) { return lastRulePath(); }},
    {"TheLineOfARule", storeRuleLine, [](const std::string&) { return lastRule(); }},
    {"AnAddedChrootUser",
     [](const std::string& text) {
         return VELTFTPAddChrootUser(List({"ann", text}).get());
     },
     [](const std::string&) { return Text(); }},
    {"ADeletedChrootUser",
     [](const std::string& text) {
         return VELTFTPDeleteChrootUser(List({"ben", text}).get());
     },
     [](const std::string&) { return Text(); }},
    {"ARunKey", [](const std::string& text) { return VLIBServicecfgRunKeySet(text.c_str(), 1); },
     [](const std::string&) { return Text(); }},
    {"TheNameOfAShare",
     [](const std::string& text) { return storeShare(text, "comment", "/srv/public", "ftp"); },
     [](const std::string&) { return readShare([](const ShareEntry& share) { return share.name; }); }},
    {"TheCommentOfAShare",
     [](const std::string& text) { return storeShare("public", text, "/srv/public", "ftp"); },
     [](const std::string&) { return readShare([](const ShareEntry& share) { return share.comment; }); }},
    {"ThePathOfAShare", [](const std::string& text) { return storeShare("public", "comment", text, "ftp"); },
     [](const std::string&) { return readShare([](const ShareEntry& share) { return share.path; }); }},
    {"TheAccountOfAShare",
     [](const std::string& text) { return storeShare("public", "comment", "/srv/public", text); },
     [](const std::string&) {
         return readShare([](const ShareEntry& share) { return share.users.begin()->first; });
     }},
};

void PrintTo(const Setter& setter, std::ostream* out) {
    *out << setter.name;
}

/// The files below a folder, with what is in them.
using Files = std::map<std::string, std::string>;

class SetterInjection : public testing::TestWithParam<Setter> {
protected:
    void SetUp() override {
        setStateRoot(outer_.path() / "root");
        useAccounts();
        ASSERT_GE(VELTFTPTimeOutSet(77), 0) << lastErrorSentence();
        ASSERT_GE(VELTSFTPConfigSet(0, 2345), 0) << lastErrorSentence();
        ASSERT_GE(VLIBCINFOSetKeyValue("neighbour", "1"), 0) << lastErrorSentence();
        ASSERT_GE(VLIBCINFOSetKeyValue("ftp_ext_ip", ""), 0) << lastErrorSentence();
        ASSERT_GE(VLIBCINFOSetKeyValue("model", "x"), 0) << lastErrorSentence();
        ASSERT_GE(VLIBServicecfgRunKeySet("ftpd", 1), 0) << lastErrorSentence();
        ASSERT_GE(storeShare("public", "comment", "/srv/public", "ftp"), 0) << lastErrorSentence();
        ASSERT_GE(storeRuleLine("u:1000:/home"), 0) << lastErrorSentence();
    }
    void TearDown() override { setAccountSources({}); }

    void useAccounts() const {
        AccountSources sources;
        sources.passwd = outer_.write("accounts/passwd", "ann:x:1000:100::/home/ann:/bin/sh\n"
                                                         "ben:x:1001:100::/home/ben:/bin/sh\n");
        sources.group = outer_.write("accounts/group", "users:x:100:\n");
        sources.loginDefs = outer_.write("accounts/login.defs", "UID_MIN 1000\nUID_MAX 200000\n");
        sources.nsswitch = outer_.write("accounts/nsswitch.conf", "passwd: files\ngroup: files\n");
        sources.moduleFolder = outer_.path();
        setAccountSources(sources);
    }

    Files files() const {
        Files found;
        for (const auto& entry : std::filesystem::recursive_directory_iterator(outer_.path())) {
            const std::string name = std::filesystem::relative(entry.path(), outer_.path()).string();
            found[name] = entry.is_regular_file() ? outer_.read(name) : "a folder";
        }
        return found;
    }

    static std::vector<std::string> namesOf(const Files& files) {
        std::vector<std::string> names;
        names.reserve(files.size());
        for (const auto& [name, contents] : files) {
            names.push_back(name);
        }
        return names;
    }

    /// That what stands beside the text is as it was.
    static void expectNeighbours() {
        EXPECT_EQ(VELTFTPTimeOutGet(), 77) << lastErrorSentence();
        EXPECT_TRUE(loadFtpSettings());
        _tag_VELT_SFTP_CONFIG_ sftp{};
        EXPECT_GE(VELTSFTPConfigGet(1, &sftp), 0);
        EXPECT_EQ(sftp.port, 2345);
        EXPECT_EQ(readKey("neighbour"), "1");
        List rules;
        ASSERT_GE(VELTFTPChrootRuleEnum(&rules.get()), 0) << lastErrorSentence();
        ASSERT_EQ(rules.get()->count, 2);
        EXPECT_STREQ(VLIBCSzListGet(rules.get(), 0), rule);
        const auto shares = loadShares();
        ASSERT_TRUE(shares) << shares.error().message;
        EXPECT_EQ(shares->size(), 1U);
    }

    TemporaryFolder outer_;
};

TEST_P(SetterInjection, RefusesATextOrStoresNothingElse) {
    for (const std::string& text : attempts) {
        SCOPED_TRACE(testing::PrintToString(text.substr(0, 60)));
        const Files before = files();
        clearLastError();
        const int result = GetParam().store(text);
        if (result == notASetting) {
            continue;
        }
        const Files after = files();
        if (result < 0) {
            EXPECT_EQ(after, before) << "a refusal changes nothing";
            const std::string& why = lastErrorSentence();
            EXPECT_TRUE(why.ends_with('.')) << why;
            continue;
        }
        EXPECT_EQ(GetParam().read(text), text);
        EXPECT_EQ(namesOf(after), namesOf(before)) << "no text names a file";
        expectNeighbours();
    }
}

INSTANTIATE_TEST_SUITE_P(All, SetterInjection, testing::ValuesIn(setters),
                         [](const auto& setter) { return setter.param.name; });

} // namespace
} // namespace velt::test
