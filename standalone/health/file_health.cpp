#include "base/file.h"
#include "base/trusted_file.h"
#include "standalone/accounts/user_directory.h"
#include "standalone/core/paths.h"
#include "standalone/core/state_root.h"
#include "standalone/health/checks.h"
#include "standalone/health/mends.h"
#include "standalone/health/named_accounts.h"
#include "standalone/rules/rule_store.h"
#include "standalone/shares/share_file.h"

#include <algorithm>
#include <map>
#include <set>

namespace velt {
namespace {

constexpr std::chrono::seconds accountLimit{2};
constexpr const char* readableAccounts = "chmod 644 /etc/passwd /etc/group";

/// The accounts that the files name, with where each stands, in words.
using Mentions = std::map<NamedAccount, std::string>;

/// What decides who may do what, as each login reads it. A finding when logins fail because of it.
struct File {
    std::string subject;
    std::string name; ///< how sentences begin
    std::filesystem::path path;
    std::string idBegin;

    Finding problem(const char* what, const std::string& sentence, const std::string& mend) const {
        return {idBegin + what, Severity::error, subject,
                sentence + " Nobody can log in over FTP until that is mended.", mend};
    }
};

std::string quoted(const std::filesystem::path& path) {
    return path.string();
}

/// Not so of a file that cannot be looked at, which reading it tells in its own words.
bool isMissing(const File& file) {
    const auto there = isThere(file.path);
    return there && !*there;
}

/// The file's text; nothing, with a finding, where logins would refuse it.
std::optional<std::string> readAsLoginsDo(const File& file, Findings& findings) {
    auto text = readTrusted(file.path);
    if (text) {
        return std::move(*text);
    }
    findings.push_back(
        file.problem("-untrusted", file.name + " cannot be used: " + text.error().message,
                     "chown root " + quoted(file.path) + " && chmod go-w " + quoted(file.path)));
    return std::nullopt;
}

void judgeShares(Findings& findings, Mentions& mentions) {
    const File file{"shares", "The file of the shares", statePath(paths::shares), "shares"};
    if (isMissing(file)) { // there are none
        return;
    }
    const auto text = readAsLoginsDo(file, findings);
    if (!text) {
        return;
    }
    const auto shares = parseShares(*text);
    if (!shares) {
        findings.push_back(file.problem("-damaged", shares.error().message, correct(file.path)));
        return;
    }
    for (const ShareEntry& share : *shares) {
        const std::string place = "the share \"" + share.name + "\"";
        for (const auto& [name, access] : share.users) {
            // Of anonymous users, who need no account of this name where they are not let in.
            if (name != "ftp") {
                mentions.emplace(NamedAccount{true, name}, place);
            }
        }
        for (const auto& [name, access] : share.groups) {
            mentions.emplace(NamedAccount{false, name}, place);
        }
    }
}

void judgeRules(Findings& findings, Mentions& mentions) {
    const File file{"chroot", "The file of the chroot rules", statePath(paths::chrootRules), "rules"};
    if (isMissing(file)) {
        const auto expected = areRulesExpected();
        if (!expected || *expected) {
            findings.push_back(
                file.problem("-missing", file.name + ", " + quoted(file.path) + ", is missing.",
                             "Put your copy back, or, if there were no rules, run: " + makeRulesCommand()));
        }
        return;
    }
    const auto text = readAsLoginsDo(file, findings);
    if (!text) {
        return;
    }
    const auto rules = parseRules(*text);
    if (!rules) {
        findings.push_back(file.problem("-damaged", rules.error().message, correct(file.path)));
        return;
    }
    for (const ChrootRule& rule : *rules) {
        mentions.emplace(NamedAccount{rule.isUser, "", rule.id}, "a chroot rule");
    }
}

Finding unknownAccount(const NamedAccount& account, const std::string& place) {
    const bool inRule = account.name.empty();
    const std::string who = account.isUser ? "user" : "group";
    const std::string what =
        inRule ? who + " with the number " + std::to_string(account.id) : who + " \"" + account.name + "\"";
    return {inRule ? "rules-unknown-account" : "shares-unknown-account", Severity::warning,
            inRule ? "chroot" : "shares", "There is no " + what + ", which " + place + " names.",
            inRule
                ? "Make the account again, or, if it is gone for good, run: veltctl chroot rules remove " +
                      who + " '#" + std::to_string(account.id) + "'"
                : "Correct the name in " + quoted(statePath(paths::shares)) + ", then run: veltctl doctor"};
}

void judgeAccounts(const Mentions& mentions, Findings& findings) {
    std::vector<NamedAccount> accounts;
    for (const auto& [account, place] : mentions) {
        accounts.push_back(account);
    }
    const auto unknown = unknownAccounts(std::move(accounts), accountLimit);
    if (!unknown) {
        findings.push_back({"accounts-slow", Severity::warning, "host",
                            "The sources of users and groups take longer than two seconds to answer.",
                            "getent passwd"});
        return;
    }
    for (const Result<>& known : {usersAreKnown(), groupsAreKnown()}) {
        if (!unknown->empty() && !known) { // they may be there
            findings.push_back(
                {"accounts-unreadable", Severity::error, "host", known.error().message, readableAccounts});
            return;
        }
    }
    for (const NamedAccount& account : *unknown) {
        findings.push_back(unknownAccount(account, mentions.at(account)));
    }
}

} // namespace

Findings fileFindings() {
    Findings findings;
    Mentions mentions;
    judgeShares(findings, mentions);
    judgeRules(findings, mentions);
    judgeAccounts(mentions, findings);
    return findings;
}

} // namespace velt
