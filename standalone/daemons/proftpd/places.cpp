#include "standalone/daemons/proftpd/places.h"

#include "base/unique_fd.h"
#include "standalone/accounts/user_directory.h"
#include "standalone/core/installed_files.h"
#include "standalone/core/last_error.h"
#include "standalone/core/paths.h"
#include "standalone/core/state_root.h"
#include "standalone/daemons/tls/certificate.h"
#include "standalone/settings/network_settings.h"
#include "standalone/shares/share_store.h"

#include <netinet/in.h>
#include <sys/socket.h>
#include <unistd.h>

namespace velt {
namespace {

const std::string anonymousAccount = "ftp";

bool hasIPv6() {
    const UniqueFd socket(::socket(AF_INET6, SOCK_STREAM | SOCK_CLOEXEC, 0));
    sockaddr_in6 any{};
    any.sin6_family = AF_INET6;
    return socket && bind(socket.get(), reinterpret_cast<const sockaddr*>(&any), sizeof any) == 0;
}

// The daemon would grant the login all the same, under an account of its own choice.
int checkAnonymousAccount() {
    const auto account = userByName(anonymousAccount);
    if (!account) {
        return fail(ErrorNumber::invalid, "Anonymous FTP needs the account \"ftp\", which does not exist.");
    }
    if (account->uid == 0) {
        return fail(ErrorNumber::invalid, "Anonymous FTP cannot use the account \"ftp\", which is root's.");
    }
    return 0;
}

// Logins follow the shares that are stored then. That these cannot be read is better said at once.
int surveyShares(const FtpSettings& settings) {
    const auto& record = settings.record;
    if (record.anonymous == 0 && record.user_chroot != 0) {
        return 0;
    }
    const auto shares = loadShares();
    return shares ? 0 : fail(shares.error());
}

int surveyCertificate(FtpSurroundings& found) {
    const auto certificate = serverCertificate();
    if (!certificate) {
        return -1;
    }
    found.places.certificate = certificate->certificate;
    found.places.certificateKey = certificate->key;
    found.places.certificateIsRsa = certificate->isRsa;
    found.certificateFingerprint = certificate->fingerprint;
    found.throwAway = certificate->throwAway;
    return 0;
}

// Without root's rights the daemon stays who it is, and knows the accounts of its own files only.
int surveyRights(ProftpdPlaces& places) {
    if (geteuid() == 0) {
        return 0;
    }
    const auto self = userById(geteuid());
    const auto group = groupById(getegid());
    constexpr std::string_view plain = "abcdefghijklmnopqrstuvwxyzABCDEFGHIJKLMNOPQRSTUVWXYZ0123456789._-";
    if (!self || !group || self->name.find_first_not_of(plain) != std::string::npos ||
        group->name.find_first_not_of(plain) != std::string::npos) {
        return fail(ErrorNumber::invalid, "The FTP daemon cannot run as the user of this process.");
    }
    places.user = self->name;
    places.group = group->name;
    places.accountFiles = AccountFiles{statePath(paths::ftpPasswd), statePath(paths::ftpGroup)};
    return 0;
}

} // namespace

std::filesystem::path ftpRunFolder() {
    return statePath(paths::ftpRun);
}

std::optional<FtpSurroundings> surveyFtp(const FtpSettings& settings) {
    FtpSurroundings found;
    auto& places = found.places;
    places.moduleFolder = installedFile("mod_velt_login.so").parent_path();
    places.runFolder = ftpRunFolder();
    places.loginProgram = installedFile("velt-login-view");
    places.stateRoot = statePath("/");
    places.loginRoot = ftpRunFolder() / "root";
    // As long as the place in the plan's own folder, whose name is known only when all of this is.
    places.anonymousShare = ftpRunFolder() / "configurations" / std::string(64, '0') / "anonymous";
    places.ipv6 = hasIPv6();
    if (!isRenderable(places.anonymousShare) || !isRenderable(places.loginProgram)) {
        fail(ErrorNumber::invalid, "The folder " + statePath("/").string() + " or " +
                                       places.moduleFolder.string() +
                                       " has a name that the FTP daemon's configuration cannot hold.");
        return std::nullopt;
    }
    const bool tls = (settings.record.service_flags & VELT_FTP_SERVICE_TLS) != 0;
    const auto network = orLastError(loadNetworkSettings());
    if (!network) {
        return std::nullopt;
    }
    places.loopbackOnly = network->loopbackOnly;
    if (surveyRights(places) < 0 || (settings.record.anonymous != 0 && checkAnonymousAccount() < 0) ||
        surveyShares(settings) < 0 || (tls && surveyCertificate(found) < 0)) {
        return std::nullopt;
    }
    return found;
}

} // namespace velt
