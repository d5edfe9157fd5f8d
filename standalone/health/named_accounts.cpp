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

bool isOwnUser(const NamedAccount& account) {
    const auto users = parsePasswd(readFile(statePath(paths::ftpPasswd)).valueOr(""));
    return std::ranges::any_of(users, [&](const UserEntry& user) {
        return account.name.empty() ? user.uid == account.id : user.name == account.name;
    });
}

bool isOwnGroup(const NamedAccount& account) {
    const auto groups = parseGroup(readFile(statePath(paths::ftpGroup)).valueOr(""));
    return std::ranges::any_of(groups, [&](const LocalGroup& group) {
        return account.name.empty() ? group.entry.gid == account.id : group.entry.name == account.name;
    });
}

bool isKnown(const NamedAccount& account) {
    if (account.isUser) {
        return isOwnUser(account) ||
               (account.name.empty() ? userById(account.id) : userByName(account.name)).has_value();
    }
    return isOwnGroup(account) ||
           (account.name.empty() ? groupById(account.id) : groupByName(account.name)).has_value();
}

} // namespace

std::optional<std::vector<NamedAccount>> unknownAccounts(std::vector<NamedAccount> accounts,
                                                         std::chrono::milliseconds limit) {
    if (accounts.empty()) {
        return std::vector<NamedAccount>();
    }
    if (waiting() > 0) {
        return std::nullopt;
    }
    using Answer = std::vector<NamedAccount>;
    auto answer = std::make_shared<std::promise<Answer>>();
    auto future = answer->get_future();
    auto mark = std::make_shared<WaitingMark>();
    // A source that hangs cannot be interrupted, only left behind.
    std::thread([answer, mark = std::move(mark), accounts = std::move(accounts)]() mutable {
        std::erase_if(accounts, isKnown);
        mark.reset();
        answer->set_value(std::move(accounts));
    }).detach();
    if (future.wait_for(limit) != std::future_status::ready) {
        return std::nullopt;
    }
    return future.get();
}

} // namespace velt
