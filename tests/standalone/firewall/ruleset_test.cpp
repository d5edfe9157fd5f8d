// The firewall's settings and rules as text.

#include "standalone/firewall/banned_sources.h"
#include "standalone/firewall/ruleset.h"
#include "tests/standalone/support/state_folder.h"
#include "tests/support/result.h"

#include <gtest/gtest.h>

namespace velt {
namespace {

using Ranges = std::vector<VELT_FTP_PORT_RANGE>;

TEST(FirewallRules, OfModeOffRemoveTheTable) {
    EXPECT_EQ(renderRuleset({FirewallMode::off, {}}, Ranges{{21, 21}}, Ranges{{21, 21}}),
              "add table inet velt_fileserv\n"
              "delete table inet velt_fileserv\n");
}

TEST(FirewallRules, OfModeAcceptDropNothing) {
    EXPECT_EQ(renderRuleset({FirewallMode::accept, {{8080, 8080}}},
                            Ranges{{21, 21}, {55536, 55899}, {222, 222}}, Ranges{{21, 21}, {222, 222}}),
              R"(add table inet velt_fileserv
delete table inet velt_fileserv
table inet velt_fileserv {
    set tcp_open {
        type inet_service
        flags interval
        auto-merge
        elements = { 21, 55536-55899, 222 }
    }
    set tcp_login {
        type inet_service
        flags interval
        auto-merge
        elements = { 21, 222 }
    }
    set banned4 {
        type ipv4_addr
        flags timeout
    }
    set banned6 {
        type ipv6_addr
        flags timeout
    }
    chain logins {
        ip saddr @banned4 drop
        ip6 saddr @banned6 drop
        ip6 saddr & ffff:ffff:ffff:ffff:: @banned6 drop
    }
    chain input {
        type filter hook input priority filter - 1; policy accept;
        tcp dport @tcp_login tcp flags & (fin | syn | rst | ack) == syn jump logins
        tcp dport @tcp_open accept
    }
}
)");
}

TEST(FirewallRules, OfModeDropOpenTheFurtherPortsToo) {
    EXPECT_EQ(renderRuleset({FirewallMode::drop, {{22, 22}, {8000, 8010}}}, Ranges{{2121, 2121}}, {}),
              R"(add table inet velt_fileserv
delete table inet velt_fileserv
table inet velt_fileserv {
    set tcp_open {
        type inet_service
        flags interval
        auto-merge
        elements = { 2121, 22, 8000-8010 }
    }
    set tcp_login {
        type inet_service
        flags interval
        auto-merge
    }
    set banned4 {
        type ipv4_addr
        flags timeout
    }
    set banned6 {
        type ipv6_addr
        flags timeout
    }
    chain logins {
        ip saddr @banned4 drop
        ip6 saddr @banned6 drop
        ip6 saddr & ffff:ffff:ffff:ffff:: @banned6 drop
    }
    chain input {
        type filter hook input priority filter - 1; policy drop;
        tcp dport @tcp_login tcp flags & (fin | syn | rst | ack) == syn jump logins
        ct state vmap { established : accept, related : accept, invalid : drop }
        iif "lo" accept
        meta l4proto { icmp, ipv6-icmp } accept
        tcp dport @tcp_open accept
    }
}
)");
}

TEST(FirewallRules, WithoutAServiceHaveAnEmptySet) {
    const std::string text = renderRuleset({}, {}, {});
    EXPECT_EQ(text.find("elements"), std::string::npos);
    EXPECT_NE(text.find("set tcp_open"), std::string::npos);
}

TEST(FirewallRules, HoldEachBanForItsTime) {
    EXPECT_EQ(renderBannedSources({}), "");
    EXPECT_EQ(renderBannedSources({{*parseIpNetwork("192.0.2.7"), std::chrono::seconds(600)},
                                   {*parseIpNetwork("2001:db8:1:2::/64"), std::chrono::seconds(0)}}),
              "add element inet velt_fileserv banned4 { 192.0.2.7 timeout 600s }\n"
              "add element inet velt_fileserv banned6 { 2001:db8:1:2:: timeout 1s }\n");
}

std::string describe(const Ranges& ranges) {
    std::string text;
    for (const VELT_FTP_PORT_RANGE& range : ranges) {
        text += std::to_string(range.first) + "-" + std::to_string(range.last) + " ";
    }
    return text;
}

class FirewallSettingsFile : public testing::Test {
protected:
    Result<FirewallSettings> load(const std::string& text) {
        root_.write("etc/velt/firewall.conf", text);
        return loadFirewallSettings();
    }

    test::StateFolder root_;
};

TEST_F(FirewallSettingsFile, IsReadAsWritten) {
    EXPECT_EQ(loadFirewallSettings()->mode, FirewallMode::accept) << "without a file";
    const auto settings = load("# mine\nversion = 1\n\nmode=drop # careful\nports = 22 8000-8010\r\n");
    ASSERT_TRUE(settings) << settings.error().message;
    EXPECT_EQ(settings->mode, FirewallMode::drop);
    EXPECT_EQ(describe(settings->furtherPorts), "22-22 8000-8010 ");
    EXPECT_EQ(load("version = 1\n")->mode, FirewallMode::accept);
    EXPECT_EQ(load("version = 1\nmode = off\n")->mode, FirewallMode::off);
}

TEST_F(FirewallSettingsFile, ThatIsDamagedIsNamedWithItsLine) {
    const std::string portsExpected =
        "ports: expected ports and port ranges separated by spaces, such as 22 8000-8010";
    const std::pair<const char*, std::string> damaged[] = {
        {"", ": missing key \"version\""},
        {"mode = drop\n", ": missing key \"version\""},
        {"version = 2\n",
         ", line 1: version 2 is newer than this program, which knows files up to version 1"},
        {"version = 1\nmode = open\n", ", line 2: mode: expected off, accept or drop"},
        {"version = 1\nmode\n", ", line 2: expected \"key = value\""},
        {"version = 1\nports = 22 0\n", ", line 2: " + portsExpected},
        {"version = 1\nports = 22; flush ruleset\n", ", line 2: " + portsExpected},
        {"version = 1\n\nmode = off\nmode = drop\n", ", line 4: duplicate key \"mode\""},
        {"version = 1\ncolour = red\n", ", line 2: unknown key \"colour\""},
    };
    for (const auto& [text, complaint] : damaged) {
        EXPECT_EQ(test::messageOf(load(text)),
                  "Cannot read " + (root_.path() / "etc/velt/firewall.conf").string() + complaint + ".");
    }
}

} // namespace
} // namespace velt
