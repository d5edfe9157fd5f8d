// The fake standalone's sessions, and what they did.
#include "base/number_text.h"
#include "base/text.h"
#include "tests/host/fake_standalone.h"

#include <algorithm>
#include <array>
#include <cstdio>
#include <mutex>
#include <utility>

namespace {

std::mutex mutex; ///< guards the sessions

constexpr std::array<std::string_view, 3> protocols{"ftp", "ftps", "sftp"};
constexpr std::array<std::string_view, 14> operations{
    "login-refused", "session-opened", "session-closed", "upload", "download", "delete", "rename",
    "make-folder",   "remove-folder",  "mode",           "owner",  "times",    "link",   "truncate"};
constexpr std::array<std::string_view, 3> results{"done", "incomplete", "refused"};

template<class Kind, class Names> std::optional<Kind> named(const Names& names, std::string_view name) {
    const auto* const found = std::ranges::find(names, name);
    return found == names.end() ? std::nullopt : std::optional(static_cast<Kind>(found - names.begin()));
}

} // namespace

namespace velt {

std::string_view protocolName(SessionProtocol protocol) {
    return protocols.at(static_cast<std::size_t>(protocol));
}

std::optional<SessionProtocol> protocolNamed(std::string_view name) {
    return named<SessionProtocol>(protocols, name);
}

std::string_view operationName(Operation operation) {
    return operations.at(static_cast<std::size_t>(operation));
}

std::optional<Operation> operationNamed(std::string_view name) {
    return named<Operation>(operations, name);
}

std::string_view operationResultName(OperationResult result) {
    return results.at(static_cast<std::size_t>(result));
}

std::optional<OperationResult> operationResultNamed(std::string_view name) {
    return named<OperationResult>(results, name);
}

std::string keyText(const OperationKey& key) {
    return std::to_string(key.time) + "-" + std::to_string(key.id);
}

std::optional<OperationKey> parseOperationKey(std::string_view text) {
    const auto time = parseNumber(cut(text, '-'));
    const auto id = parseNumber(text);
    return time && id ? std::optional(OperationKey{*time, *id}) : std::nullopt;
}

/// Only cuts it to pages: what is filtered is the store's business.
Result<OperationPage> searchOperations(const OperationFilter& filter) {
    FakeStandalone& fake = FakeStandalone::instance();
    fake.askedOperations = filter;
    if (fake.operationsFail) {
        return Error(fake.sentence);
    }
    OperationPage page;
    for (const OperationRecord& record : fake.operations) {
        if (filter.before && record.id >= filter.before->id) {
            continue;
        }
        if (page.records.size() == static_cast<std::size_t>(filter.limit)) {
            page.next = OperationKey{7, page.records.back().id};
            break;
        }
        page.records.push_back(record);
    }
    return page;
}

Result<std::vector<OpenSession>> openSessions() {
    const std::lock_guard lock(mutex);
    const FakeStandalone& fake = FakeStandalone::instance();
    return fake.sessionsFail ? Result<std::vector<OpenSession>>(Error(fake.sentence)) : fake.openSessions;
}

Result<bool> endSession(const std::string& id, const SessionEnd& end) {
    const std::lock_guard lock(mutex);
    FakeStandalone& fake = FakeStandalone::instance();
    if (std::ranges::find(fake.immortal, id) != fake.immortal.end()) {
        return Error(fake.sentence);
    }
    fake.endedSessions.push_back(id + " " + end.by + " " + end.reason);
    return std::erase_if(fake.openSessions, [&](const OpenSession& each) { return each.id == id; }) > 0;
}

ActivitySubscription subscribeActivity(ActivitySubscriber subscriber) {
    FakeStandalone::instance().activitySubscriber = std::move(subscriber);
    return 1;
}

void unsubscribeActivity(ActivitySubscription /*subscription*/) {
    FakeStandalone::instance().activitySubscriber = nullptr;
}

ActivityTotals activityTotals() {
    return FakeStandalone::instance().activity;
}

std::uint64_t lostRecords() {
    return FakeStandalone::instance().lostRecords;
}

} // namespace velt
