// What other firewalls do to the ports of the services, by the rules that a real nft lists.
#include "standalone/firewall/foreign_tables.h"
#include "tests/standalone/firewall/private_network.h"
#include "tests/support/run_program.h"

#include <gtest/gtest.h>

#include <optional>
#include <string>
#include <vector>

namespace velt::test {
namespace {

class ForeignTables : public testing::Test {
protected:
    void SetUp() override {
        network_.emplace();
        if (!network_->isThere() || runProcess({"nft", "list", "tables"}).exitCode != 0) {
            GTEST_SKIP() << "no private network here";
        }
    }

    /// Loads these chains as the only table.
    static void load(const std::string& chains, const std::string& family = "inet") {
        const ProcessResult loaded =
            runProcess({"nft", "-f", "-"}, "flush ruleset\ntable " + family + " other {\n" + chains + "}\n");
        ASSERT_EQ(loaded.exitCode, 0) << loaded.errors << chains;
    }

    static std::string input(const std::string& policy, const std::string& rules) {
        return "chain input {\ntype filter hook input priority 0; policy " + policy + ";\n" + rules + "}\n";
    }

    /// "closes 2121, 5000-5010", "may close ..." or "" for FTP's ports.
    static std::string judged(bool fromHere = false) {
        const auto rules = listRules();
        if (!rules) {
            return "no rules";
        }
        const auto found = closingChains(*rules, {{2121, 2121}, {5000, 5010}}, fromHere);
        if (found.empty()) {
            return "";
        }
        const std::string sentence = found.front().sentence();
        const std::string begin = "The chain \"" + found.front().name + "\" of another firewall ";
        const std::string ports = " ports of the file services: ";
        EXPECT_TRUE(sentence.starts_with(begin)) << sentence;
        std::string text = sentence.substr(begin.size());
        text.replace(text.find(ports), ports.size(), " ");
        return text.substr(0, text.size() - 1);
    }

    std::optional<PrivateNetwork> network_;
};

const std::string usual = "iifname \"lo\" accept\nct state { established, related } accept\n"
                          "ct status dnat accept\nct state invalid drop\n";

TEST_F(ForeignTables, APolicyThatDropsClosesWhatNoRuleAccepts) {
    load(input("drop", ""));
    EXPECT_EQ(judged(), "closes 2121, 5000-5010");
    load(input("drop", usual + "tcp dport 2121 accept\n"));
    EXPECT_EQ(judged(), "closes 5000-5010");
    EXPECT_EQ(judged(true), "") << "over the loopback interface";
    load(input("drop", usual + "tcp dport { 22, 2121 } ct state new accept\ntcp dport 4000-5005 accept\n"));
    EXPECT_EQ(judged(), "closes 5000-5010");
}

TEST_F(ForeignTables, OneThatAcceptsThePortsIsWell) {
    load(input("drop", usual + "tcp dport { 22, 2121, 5000-5010 } accept\n"));
    EXPECT_EQ(judged(), "");
    load("set open {\ntype inet_service\nflags interval\nelements = { 2121, 5000-6000 }\n}\n" +
         input("drop", usual + "tcp dport @open accept\n"));
    EXPECT_EQ(judged(), "");
    load("chain files {\ntcp dport 2121 counter accept\ntcp dport >= 5000 accept\n}\n" +
         input("drop", usual + "meta l4proto tcp ct state { new, untracked } jump files\n"));
    EXPECT_EQ(judged(), "");
    load("chain files {\naccept\n}\n" + input("drop",
                                              "ct state vmap { established : accept, invalid : drop }\n"
                                              "tcp dport vmap { 2121 : jump files, 5000-5010 : accept }\n"));
    EXPECT_EQ(judged(), "");
    load(input("accept", ""));
    EXPECT_EQ(judged(), "");
}

TEST_F(ForeignTables, ARejectAtTheEndClosesAsAPolicyDoes) {
    const std::string zone = "chain allow {\ntcp dport 22 ct state { new, untracked } accept\n}\n"
                             "chain public {\njump allow\nmeta l4proto { icmp, ipv6-icmp } accept\n"
                             "reject with icmpx admin-prohibited\n}\n";
    load(zone + input("accept", usual + "goto public\n"));
    EXPECT_EQ(judged(), "closes 2121, 5000-5010");
    load(input("accept", usual + "tcp dport 2121 accept\ndrop\n"));
    EXPECT_EQ(judged(), "closes 5000-5010");
    load(input("accept", "tcp dport 2121 drop\n"));
    EXPECT_EQ(judged(), "closes 2121");
    load(input("accept", "udp dport 2121 drop\nip6 nexthdr tcp drop\nct state established drop\n"));
    EXPECT_EQ(judged(), "");
}

TEST_F(ForeignTables, WhatDependsOnTheClientMayClose) {
    load(input("drop", usual + "ip saddr 192.0.2.0/24 tcp dport { 2121, 5000-5010 } accept\n"));
    EXPECT_EQ(judged(), "may close 2121, 5000-5010");
    load(input("drop", usual + "ct state new limit rate 5/second accept\n"));
    EXPECT_EQ(judged(), "may close 2121, 5000-5010");
    load(input("drop", "iifname vmap { \"eth0\" : accept, \"eth1\" : drop }\n"));
    EXPECT_EQ(judged(), "may close 2121, 5000-5010");
    load(input("accept", "ip saddr 192.0.2.0/24 drop\niifname \"eth9\" reject\n"));
    EXPECT_EQ(judged(), "") << "a ban is no closed port";
}

TEST_F(ForeignTables, AFamilyCountsForItsOwn) {
    load(input("drop", ""), "ip");
    EXPECT_EQ(judged(), "closes 2121, 5000-5010");
    load(input("drop", ""), "ip6");
    EXPECT_EQ(judged(), "may close 2121, 5000-5010") << "clients may come by IPv4";
    load(input("drop", "meta nfproto ipv4 tcp dport { 2121, 5000-5010 } accept\n"));
    EXPECT_EQ(judged(), "");
}

TEST(ListedRules, ATextThatIsNoListIsNone) {
    for (const char* text : {"", "no list", "[]", "{}", R"({"nftables":{}})"}) {
        EXPECT_FALSE(ListedRules::read(text)) << text;
    }
    for (const char* text :
         {R"({"nftables":[1,{"chain":2},{"rule":{"expr":7}},{"set":{"elem":3}}]})",
          R"({"nftables":[{"chain":{"family":"inet","table":"t","name":"c","hook":"input"}},
              {"rule":{"family":"inet","table":"t","chain":"c","expr":[5,{"match":5},{"match":{"left":5}},
               {"match":{"op":"==","left":{"payload":7},"right":[]}},{"vmap":3},{"vmap":{"key":2,"data":{"set":4}}},
               {"jump":5},{"goto":{"target":"c"}},{"jump":{"target":"c"}}]}}]})"}) {
        const auto rules = ListedRules::read(text);
        ASSERT_TRUE(rules) << text;
        EXPECT_TRUE(closingChains(*rules, {{21, 21}}, false).empty()) << text;
    }
}

} // namespace
} // namespace velt::test
