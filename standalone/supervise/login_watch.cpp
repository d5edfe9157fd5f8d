#include "standalone/supervise/login_watch.h"

#include "standalone/bans/failed_login.h"
#include "standalone/bans/login_guard.h"
#include "standalone/core/paths.h"
#include "standalone/core/state_root.h"

#include <syslog.h>

#include <exception>

namespace velt {
namespace {

using Reader = std::optional<IpNetwork> (*)(std::string_view message);

DaemonProcess::Listener listenFor(const std::string& service, Reader read) {
    return [service, read](std::string_view message) {
        const auto address = read(message);
        if (!address) {
            return;
        }
        try {
            noteFailedLogin(service, *address);
        } catch (const std::exception& error) { // the daemon matters more
            ::syslog(LOG_ERR, "cannot count a failed login: %s", error.what());
        }
    };
}

} // namespace

DaemonProcess::Listener watchLogins(const std::filesystem::path& folder, const std::string& daemon) {
    const std::string text = folder.lexically_normal().string();
    if (!text.ends_with(paths::run)) {
        return {};
    }
    const std::string root = text.substr(0, text.size() - paths::run.size());
    setStateRoot(root.empty() ? "/" : root);
    if (daemon == "ftpd") {
        return listenFor("ftp", failedFtpLogin);
    }
    return daemon == "sftp" ? listenFor("sftp", failedSftpLogin) : DaemonProcess::Listener();
}

} // namespace velt
