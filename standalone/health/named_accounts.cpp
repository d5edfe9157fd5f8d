#include "standalone/health/named_accounts.h"

#include "base/file.h"
#include "standalone/accounts/account_files.h"
#include "standalone/accounts/user_directory.h"
#include "standalone/core/paths.h"
#include "standalone/core/state_root.h"

#include <algorithm>
#include <atomic>
#include <future>
#include <thread>

namespace velt {
namespace {

/// How many threads wait for an answer.
std::atomic<int>& waiting() {
    static std::atomic<int> count{0};
    return count;
}

/// One of them, as long as it lives.
struct WaitingMark {
    WaitingMark() { ++waiting(); }
    ~WaitingMark() { --waiting(); }
    WaitingMark(const WaitingMark&) = delete;
    WaitingMark& operator=(const WaitingMark&) = delete;
};

/// The name of one that the files of this system have, or "" for none.
std::string ownUser(const NamedAccount& account) {
    const auto users = parsePasswd(readFile(statePath(paths::ftpPasswd)).valueOr(""));
    const auto found = std::ranges::find_if(users, [&](const UserEntry& user) {
        return account.name.empty() ? user.uid == account.id : user.name == account.name;
    });
    return found == users.end() ? "" : found->name;
}

std::string ownGroup(const NamedAccount& account) {
    const auto groups = parseGroup(readFile(statePath(paths::ftpGroup)).valueOr(""));
    const auto found = std::ranges::find_if(groups, [&](const LocalGroup& group) {
        return account.name.empty() ? group.entry.gid == account.id : group.entry.name == account.name;
    });
    return found == groups.end() ? "" : found->entry.name;
}

template<class Entry> std::string nameIn(const std::optional<Entry>& entry) {
    return entry ? entry->name : "";
}

/// "" for one that no source knows.
std::string nameOf(const NamedAccount& account) {
    std::string own = account.isUser ? ownUser(account) : ownGroup(account);
    if (!own.empty()) {
        return own;
    }
    if (account.isUser) {
        return nameIn(account.name.empty() ? userById(account.id) : userByName(account.name));
    }
    return nameIn(account.name.empty() ? groupById(account.id) : groupByName(account.name));
}

using Accounts = std::vector<NamedAccount>;

/// What the work makes of the accounts by asking the sources; nothing when it takes longer than the limit, or
/// somebody waits for them already.
std::optional<Accounts> askSources(Accounts accounts, std::chrono::milliseconds limit,
                                   void (*work)(Accounts&)) {
    if (accounts.empty()) {
        return accounts;
    }
    if (waiting() > 0) {
        return std::nullopt;
    }
    auto answer = std::make_shared<std::promise<Accounts>>();
    auto future = answer->get_future();
    auto mark = std::make_shared<WaitingMark>();
    // A source that hangs cannot be interrupted, only left behind.
    std::thread([answer, mark = std::move(mark), accounts = std::move(accounts), work]() mutable {
        work(accounts);
        mark.reset();
        answer->set_value(std::move(accounts));
    }).detach();
    if (future.wait_for(limit) != std::future_status::ready) {
        return std::nullopt;
    }
    return future.get();
}

} // namespace

std::optional<std::vector<NamedAccount>> unknownAccounts(std::vector<NamedAccount> accounts,
                                                         std::chrono::milliseconds limit) {
    return askSources(std::move(accounts), limit, [](Accounts& all) {
        std::erase_if(all, [](const NamedAccount& each) { return !nameOf(each).empty(); });
    });
}

std::vector<NamedAccount> withNames(std::vector<NamedAccount> accounts, std::chrono::milliseconds limit) {
    const auto named = askSources(accounts, limit, [](Accounts& all) {
        for (NamedAccount& each : all) {
            each.name = nameOf(each);
        }
    });
    return named.value_or(std::move(accounts));
}

} // namespace velt
