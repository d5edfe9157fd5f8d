// Who may use the host.
//
// The kernel names the peer of a Unix socket: root, the host's own user and the members of the
// administrators' group are admins. Everybody else needs a bearer token. What a page of another origin makes
// a browser send is refused in any case, and so is, over TCP, an address from which too many logins failed.
#ifndef VELT_HOST_API_ACCESS_CONTROL_H
#define VELT_HOST_API_ACCESS_CONTROL_H

#include "host/api/token_store.h"
#include "host/api/wrong_tokens.h"
#include "host/base/host_log.h"
#include "host/http/message.h"
#include "standalone/standalone.h"

#include <optional>
#include <string>
#include <vector>

namespace velt::host {

struct AccessSettings {
    std::string adminGroup = "velt-admin";
    std::vector<std::string>
        hostNames; ///< that clients may use for this host, besides its addresses and "localhost"
};

/// Thread-safe.
class AccessControl {
public:
    /// All but the settings outlive it.
    AccessControl(AccessSettings settings, const TokenStore& tokens, WrongTokens& wrongTokens, HostLog& log);

    /// Fills `principal` and returns nothing when access is granted.
    std::optional<Refusal> check(const HttpRequest& head, const Peer& peer, Principal& principal) const;

private:
    std::optional<Refusal> authenticate(const HttpRequest& head, const Peer& peer,
                                        Principal& principal) const;
    bool isAdmin(const Peer& peer) const;
    bool knowsHost(const std::string& host, const Peer& peer) const;
    Refusal refuseBanned(const Ban& ban, const Peer& peer) const;
    Refusal refuse(int status, const std::string& detail, const Peer& peer, bool delayed) const;

    AccessSettings settings_;
    const TokenStore& tokens_;
    WrongTokens& wrongTokens_;
    HostLog& log_;
};

} // namespace velt::host

#endif
