// Requests to veltd over its Unix socket.
#ifndef VELT_HOST_TRIAL_VELTD_CLIENT_H
#define VELT_HOST_TRIAL_VELTD_CLIENT_H

#include "base/unique_fd.h"

#include <json/value.h>

#include <string>

namespace velt::host {

struct Reply {
    int status = 0;
    Json::Value body; ///< null when there is none

    bool good() const { return status >= 200 && status < 300; }
};

class VeltdClient {
public:
    explicit VeltdClient(std::string socketPath) : socketPath_(std::move(socketPath)) {}

    /// Sends this token from now on; "" for none.
    void setToken(std::string token) { token_ = std::move(token); }

    /// Throws TrialError when there is no answer.
    Reply get(const std::string& target) const { return ask("GET", target, ""); }
    Reply post(const std::string& target, const Json::Value& body) const;

private:
    UniqueFd connected() const;
    Reply ask(const std::string& method, const std::string& target, const std::string& body) const;

    std::string socketPath_;
    std::string token_;
};

} // namespace velt::host

#endif
