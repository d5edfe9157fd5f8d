#include "standalone/daemons/proftpd/proftpd_surroundings.h"

#include "base/unique_fd.h"
#include "standalone/accounts/user_directory.h"
#include "standalone/bans/ban_settings.h"
#include "standalone/core/error_number.h"
#include "standalone/core/installed_files.h"
#include "standalone/core/paths.h"
#include "standalone/core/state_root.h"
#include "standalone/daemons/daemon_configuration.h"
#include "standalone/daemons/tls/certificate.h"
#include "standalone/settings/settings.h"
#include "standalone/shares/share_store.h"

#include <netinet/in.h>
#include <sys/socket.h>
#include <unistd.h>

#include <cerrno>
#include <cstring>
#include <string>

namespace velt {
namespace {

const std::string anonymousAccount = "ftp";

// A daemon that was started without it would go on without it, so what cannot be told is not taken for a no.
Result<bool> hasIPv6() {
    const UniqueFd socket(::socket(AF_INET6, SOCK_STREAM | SOCK_CLOEXEC, 0));
    sockaddr_in6 any{};
    any.sin6_family = AF_INET6;
    if (socket && bind(socket.get(), reinterpret_cast<const sockaddr*>(&any), sizeof any) == 0) {
        return true;
    }
    if (errno == EAFNOSUPPORT || errno == EADDRNOTAVAIL) {
        return false;
    }
    return Error(std::string("Cannot tell whether this server has IPv6: ") + std::strerror(errno) + ".");
}

// The daemon would still grant the login, under an account of its own choice.
Result<> checkAnonymousAccount(const FtpSettings& settings) {
    if (settings.record.anonymous == 0) {
        return {};
    }
    const auto account = userByName(anonymousAccount);
    if (!account) {
        VELT_RETURN_IF_ERROR(usersAreKnown());
        return Error(ErrorNumber::invalid, "Anonymous FTP needs the account \"ftp\", which does not exist.");
    }
    if (account->uid == 0) {
        return Error(ErrorNumber::invalid, "Anonymous FTP cannot use the account \"ftp\": its user ID is 0.");
    }
    return {};
}

// Logins follow the shares that are stored then. That these cannot be read is better said at once.
Result<> checkShares(const FtpSettings& settings) {
    const auto& record = settings.record;
    if (record.anonymous == 0 && record.user_chroot != 0) {
        return {};
    }
    const auto shares = loadShares();
    return shares ? Result<>() : shares.error();
}

Result<> surveyCertificate(FtpSurroundings& found) {
    VELT_ASSIGN_OR_RETURN(const auto certificate, serverCertificate());
    found.places.certificate = certificate.certificate;
    found.places.certificateKey = certificate.key;
    found.places.certificateIsRsa = certificate.isRsa;
    found.certificateFingerprint = certificate.fingerprint;
    found.throwAway = certificate.throwAway;
    return {};
}

// Without root's rights the daemon stays who it is, and knows the accounts of its own files only.
Result<> surveyRights(ProftpdPlaces& places) {
    if (geteuid() == 0) {
        return {};
    }
    const auto self = userById(geteuid());
    const auto group = groupById(getegid());
    if (!self || !group || !isPlainName(self->name) || !isPlainName(group->name)) {
        return Error(ErrorNumber::invalid, "The FTP daemon cannot run as the user of this process.");
    }
    places.user = self->name;
    places.group = group->name;
    places.accountFiles = AccountFiles{statePath(paths::ftpPasswd), statePath(paths::ftpGroup)};
    return {};
}

Result<ProftpdPlaces> ownPlaces() {
    ProftpdPlaces places;
    places.moduleFolder = installedFile("mod_velt_login.so").parent_path();
    places.runFolder = statePath(paths::ftpRun);
    places.loginProgram = installedFile("velt-login-view");
    places.stateRoot = statePath("/");
    places.loginRoot = places.runFolder / "root";
    // As long as the place in the plan's own folder, whose name is known only when all of this is.
    places.anonymousShare = places.runFolder / "configurations" / std::string(64, '0') / "anonymous";
    VELT_ASSIGN_OR_RETURN(places.ipv6, hasIPv6());
    VELT_RETURN_IF_ERROR(checkRenderable(places.anonymousShare, places.stateRoot));
    VELT_RETURN_IF_ERROR(checkRenderable(places.loginProgram, places.moduleFolder));
    VELT_ASSIGN_OR_RETURN(const auto network, loadNetworkSettings());
    places.loopbackOnly = network.loopbackOnly;
    // Without a readable file nobody is banned by mistake either: the service starts, and spares nobody.
    if (auto bans = loadBanSettings()) {
        places.spared = std::move(bans->never);
    }
    return places;
}

} // namespace

Result<FtpSurroundings> surveyFtp(const FtpSettings& settings) {
    VELT_ASSIGN_OR_RETURN(auto places, ownPlaces());
    FtpSurroundings found{std::move(places), "", nullptr};
    const bool tls = (settings.record.service_flags & VELT_FTP_SERVICE_TLS) != 0;
    VELT_RETURN_IF_ERROR(surveyRights(found.places));
    VELT_RETURN_IF_ERROR(checkAnonymousAccount(settings));
    VELT_RETURN_IF_ERROR(checkShares(settings));
    VELT_RETURN_IF_ERROR(tls ? surveyCertificate(found) : Result<>());
    return found;
}

} // namespace velt
