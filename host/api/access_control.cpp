#include "host/api/access_control.h"

#include "base/text.h"
#include "host/api/problem.h"
#include "host/base/account_names.h"
#include "host/base/random_text.h"

#include <unistd.h>

#include <algorithm>
#include <chrono>
#include <cstdint>
#include <utility>

namespace velt::host {

namespace {

/// Splits "[::1]:8080" into "::1" and "8080".
std::pair<std::string, std::string> splitHost(const std::string& host) {
    if (host.starts_with('[')) {
        const std::size_t end = host.find(']');
        if (end == std::string::npos) {
            return {"", ""};
        }
        return {host.substr(1, end - 1), host.substr(std::min(host.size(), end + 2))};
    }
    const std::size_t colon = host.find(':');
    return {host.substr(0, colon), colon == std::string::npos ? "" : host.substr(colon + 1)};
}

/// Whether a browser says that a page of another origin made it send the request.
bool isForeignPage(const HttpRequest& head, const Peer& peer) {
    if (!head.fetchSite.empty() && head.fetchSite != "same-origin" && head.fetchSite != "none") {
        return true;
    }
    const std::string own = (peer.isTls ? "https://" : "http://") + lowerCase(head.host);
    return !head.origin.empty() && lowerCase(head.origin) != own;
}

} // namespace

AccessControl::AccessControl(AccessSettings settings, const TokenStore& tokens, WrongTokens& wrongTokens,
                             HostLog& log)
    : settings_(std::move(settings)), tokens_(tokens), wrongTokens_(wrongTokens), log_(log) {}

std::optional<Refusal> AccessControl::check(const HttpRequest& head, const Peer& peer,
                                            Principal& principal) const {
    // Also with a valid token: whoever else has the address is not let on guessing.
    if (const auto ban = peer.isUnixSocket ? std::nullopt : currentBanOf(peer.address)) {
        return refuseBanned(*ban, peer);
    }
    if (auto refusal = authenticate(head, peer, principal)) {
        return refusal;
    }
    if (!head.wellFormed) {
        return std::nullopt;
    }
    if (!peer.isUnixSocket && !knowsHost(head.host, peer)) {
        return refuse(403,
                      "The Host header names \"" + head.host +
                          "\", which is not this host. If it is, add it with --host-name.",
                      peer, false);
    }
    if (isForeignPage(head, peer)) {
        return refuse(403, "Requests from web pages of another origin are refused.", peer, false);
    }
    return std::nullopt;
}

std::optional<Refusal> AccessControl::authenticate(const HttpRequest& head, const Peer& peer,
                                                   Principal& principal) const {
    principal.address = peer.address;
    if (head.authorization.empty()) {
        if (!peer.isUnixSocket) {
            return refuse(401, "A token is required: \"Authorization: Bearer TOKEN\".", peer, false);
        }
        if (!isAdmin(peer)) {
            return refuse(403,
                          "The user " + userName(peer.uid) + " is neither root nor in the group " +
                              settings_.adminGroup + ".",
                          peer, true);
        }
        principal.role = Role::admin;
        principal.actor = userName(peer.uid);
        principal.holder = isOwn(peer) ? "" : "user " + std::to_string(peer.uid);
        return std::nullopt;
    }
    constexpr std::size_t schemeLength = 7;
    const bool bearer = lowerCase(head.authorization.substr(0, schemeLength)) == "bearer ";
    const auto token = bearer ? tokens_.find(head.authorization.substr(schemeLength)) : std::nullopt;
    if (!token) {
        if (!peer.isUnixSocket) {
            wrongTokens_.note(peer.address);
        }
        return refuse(401, "The token is not valid.", peer, true);
    }
    principal.role = token->role;
    principal.actor = token->name;
    principal.holder = "token " + token->id;
    principal.tokenId = token->id;
    return std::nullopt;
}

bool AccessControl::isAdmin(const Peer& peer) const {
    if (isOwn(peer)) {
        return true;
    }
    const auto admins = groupNamed(settings_.adminGroup);
    return admins && std::ranges::find(peer.groups, *admins) != peer.groups.end();
}

bool AccessControl::knowsHost(const std::string& host, const Peer& peer) const {
    const auto [name, port] = splitHost(lowerCase(host));
    if (!port.empty() && port != std::to_string(peer.localPort)) {
        return false;
    }
    const auto isName = [&name = name](const std::string& each) { return lowerCase(each) == name; };
    return name == "localhost" || name == "127.0.0.1" || name == "::1" || name == peer.localAddress ||
           std::ranges::any_of(settings_.hostNames, isName);
}

Refusal AccessControl::refuseBanned(const Ban& ban, const Peer& peer) const {
    const auto left = std::chrono::ceil<std::chrono::seconds>(ban.until - std::chrono::system_clock::now());
    Refusal refusal =
        refuse(429, "Too many logins from this address have failed. Try again later.", peer, false);
    refusal.response.headers.emplace_back("Retry-After",
                                          std::to_string(std::max<std::int64_t>(1, left.count())));
    return refusal;
}

Refusal AccessControl::refuse(int status, const std::string& detail, const Peer& peer, bool delayed) const {
    const std::string id = nextRequestId();
    log_.writeRefusal(id,
                      "access refused (" + std::to_string(status) + ") to " + peer.address + ": " + detail);
    Refusal refusal{problem(status, detail, id), delayed};
    if (status == 401) {
        refusal.response.headers.emplace_back("WWW-Authenticate", "Bearer");
    }
    return refusal;
}

} // namespace velt::host
