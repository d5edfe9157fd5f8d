#include "tests/model/runner.h"

#include <algorithm>
#include <stdexcept>

namespace velt::model {
namespace {

Access accessNamed(const std::string& word) {
    return word == "write" ? Access::write : word == "read" ? Access::read : Access::none;
}

test::Listing listingNamed(const std::string& verb) {
    using test::Listing;
    return verb == "list" ? Listing::list : verb == "names" ? Listing::names : Listing::facts;
}

unsigned modeIn(const std::string& word) {
    return static_cast<unsigned>(std::stoul(word, nullptr, 8));
}

constexpr std::uint32_t longAgo = 1000000000;

bool isDone(test::FileClient& client, const Step& step, const std::string& data) {
    using Opening = test::FileClient::Opening;
    const std::string& verb = step[0];
    const std::string& path = step.at(1 + std::min<std::size_t>(step.size() - 2, 1));
    return verb == "enter"           ? client.enter(path)
           : verb == "write"         ? client.write(path, data)
           : verb == "append"        ? client.append(path, data)
           : verb == "make"          ? client.makeFolder(path)
           : verb == "remove"        ? client.remove(path)
           : verb == "remove-folder" ? client.removeFolder(path)
           : verb == "rename"        ? client.rename(path, step.at(3))
           : verb == "replace"       ? client.replace(path, step.at(3))
           : verb == "twin"          ? client.hardLink(path, step.at(3))
           : verb == "symlink"       ? client.symbolicLink(step.at(3), path)
           : verb == "cut"           ? client.cut(path)
           : verb == "times"         ? client.setTimes(path, longAgo)
           : verb == "open-to-read"  ? client.open(path, Opening::toRead)
           : verb == "open-to-write" ? client.open(path, Opening::toWrite)
           : verb == "write-open"    ? client.writeOpen(data)
           : verb == "chmod-open"    ? client.setModeOfOpen(modeIn(path))
                                     : client.setMode(path, modeIn(step.at(3)));
}

Outcome doStep(test::FileClient& client, const Step& step, const std::string& data) {
    const std::string& verb = step[0];
    Outcome outcome;
    if (verb == "list" || verb == "names" || verb == "facts") {
        outcome.names = client.list(step.at(2), listingNamed(verb));
        outcome.allowed = outcome.names.has_value();
    } else if (verb == "read" || verb == "read-open") {
        outcome.content = verb == "read" ? client.read(step.at(2)) : client.readOpen();
        outcome.allowed = outcome.content.has_value();
    } else {
        outcome.allowed = isDone(client, step, data);
    }
    return outcome;
}

} // namespace

void Runner::begin() {
    sessions_.clear();
    ended_.clear();
    real_.clear();
    world_ = {};
    world_.switches = possibleSwitches().front();
    world_.tree = real_.look();
}

std::string Runner::perform(const Step& step) {
    const std::string& verb = step.at(0);
    counts_.steps++;
    if (verb == "login") {
        return logIn(step);
    }
    if (verb == "logout") {
        logOut(step.at(1));
        return "";
    }
    if (!isAsked(step)) {
        administer(step);
        return "";
    }
    const auto session = sessions_.find(step.at(1));
    return session != sessions_.end() ? ask(step, session->second) : "";
}

void Runner::administer(const Step& step) {
    const std::string& verb = step[0];
    const std::string data = "#" + std::to_string(++written_) + ";";
    if (verb == "folder" || verb == "file" || verb == "link") {
        real_.layDown(step, data);
    } else if (verb == "shell") {
        real_.inShell(step, data);
    } else if (verb == "share") {
        setShare(step);
    } else if (verb == "unshare") {
        std::erase_if(world_.shares, [&](const Share& share) { return share.name == step.at(1); });
        world_.changes++;
        real_.storeShares(world_.shares);
    } else if (verb == "rules") {
        setRules(step);
    } else if (verb == "switches") {
        const auto [guests, share] = splitPair(step.at(2));
        world_.switches = {step.at(1) == "home", guests == "guests", share};
    } else {
        throw std::invalid_argument("there is no step like " + formatStep(step));
    }
    world_.tree = real_.look();
}

void Runner::setShare(const Step& step) {
    Share share{step.at(1), step.at(2), true, {}, {}};
    for (std::size_t i = 3; i < step.size(); i++) {
        const auto [who, access] = splitPair(step[i]);
        if (step[i] == "hidden") {
            share.offered = false;
        } else if (who.starts_with('@')) {
            share.groups[who.substr(1)] = accessNamed(access);
        } else {
            share.users[who] = accessNamed(access);
        }
    }
    std::erase_if(world_.shares, [&](const Share& one) { return one.name == share.name; });
    world_.shares.push_back(std::move(share));
    world_.changes++;
    real_.storeShares(world_.shares);
}

void Runner::setRules(const Step& step) {
    world_.rules.clear();
    for (std::size_t i = 1; i < step.size(); i++) {
        const auto [who, path] = splitPair(step[i]);
        world_.rules.push_back({who, path});
    }
    world_.changes++;
    real_.storeRules(world_.rules);
}

std::string Runner::logIn(const Step& step) {
    const Account& account = accountOf(step.at(2));
    const Protocol protocol = step.size() > 3 && step[3] == "sftp" ? Protocol::sftp : Protocol::ftp;
    counts_.logins++;
    logOut(step[1]);
    auto view = viewOf(world_, account);
    auto client = real_.logIn(world_.switches, account, protocol);
    if (view.has_value() != client->isLoggedIn()) {
        return view ? "was refused, and must be allowed" : "was allowed, and must be refused";
    }
    if (view) {
        sessions_.emplace(
            step[1], Session{account, std::move(*view), world_.changes, protocol, std::move(client), {}});
    } else {
        ended_.push_back(std::move(client));
    }
    return "";
}

void Runner::logOut(const std::string& session) {
    if (const auto found = sessions_.find(session); found != sessions_.end()) {
        ended_.push_back(std::move(found->second.client));
        sessions_.erase(found);
    }
}

std::string Runner::ask(const Step& step, Session& session) {
    if (isOfOpenFile(step) && (!session.opened || world_.tree.placeOf(session.opened->file).empty())) {
        return "";
    }
    const std::string data = "#" + std::to_string(++written_) + ";";
    const bool mayEnd = session.changes != world_.changes && changesNames(step);
    const Asker asker{session.account, session.view, session.protocol, session.opened};
    const Expectation expected = mayEnd ? Expectation() : expect(world_.tree, asker, step, data);
    Outcome outcome = doStep(*session.client, step, data);
    outcome.after = real_.look();
    counts_.asked++;
    counts_.overSftp += session.protocol == Protocol::sftp ? 1 : 0;
    counts_.decided += expected.verdict != Verdict::undecided ? 1 : 0;
    counts_.allowed += outcome.allowed ? 1 : 0;
    std::string what = compare(step, session, expected, outcome);
    world_.tree = std::move(outcome.after);
    if (session.client->hasEnded()) {
        what = mayEnd || !what.empty() ? what : "ended the session";
        logOut(step[1]);
    }
    return what;
}

std::string Runner::compare(const Step& step, Session& session, const Expectation& expected,
                            Outcome& outcome) {
    const std::uint64_t open = isOfOpenFile(step) ? session.opened->file : 0;
    std::string what = breach(world_.tree, session.view, open, outcome);
    if (what.empty()) {
        what = disagreement(world_.tree, expected, outcome);
    }
    if (step[0].starts_with("open-to-")) {
        session.opened = outcome.allowed ? expected.opened : std::nullopt;
        if (session.opened && session.opened->file == 0) {
            const Node* made = outcome.after.at(session.opened->place);
            session.opened->file = made != nullptr ? made->id : 0;
        }
    }
    return what;
}

std::optional<Failure> replay(Runner& runner, const Steps& steps) {
    runner.begin();
    for (std::size_t i = 0; i < steps.size(); i++) {
        if (std::string what = runner.perform(steps[i]); !what.empty()) {
            return Failure{i, std::move(what)};
        }
    }
    return std::nullopt;
}

Steps shrink(Runner& runner, Steps steps) {
    for (std::size_t size = steps.size() / 2; size > 0;) {
        bool shrunk = false;
        for (std::size_t start = 0; start < steps.size();) {
            Steps fewer = steps;
            const auto first = fewer.begin() + static_cast<std::ptrdiff_t>(start);
            fewer.erase(first, first + static_cast<std::ptrdiff_t>(std::min(size, steps.size() - start)));
            if (const auto failure = replay(runner, fewer)) {
                fewer.resize(failure->step + 1);
                steps = std::move(fewer);
                shrunk = true;
            } else {
                start += size;
            }
        }
        size = shrunk && size == 1 ? 1 : size / 2;
    }
    return steps;
}

} // namespace velt::model
