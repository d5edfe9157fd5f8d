#include "host/trial/first_state.h"

#include "base/file.h"
#include "base/json_value.h"
#include "ftp/ftp_library.h"
#include "host/base/account_names.h"
#include "host/base/json.h"
#include "host/base/random_text.h"
#include "host/trial/trial_error.h"
#include "platform/sftp.h"
#include "platform/webapi.h"
#include "standalone/standalone.h"

#include <crypt.h>
#include <grp.h>
#include <pwd.h>
#include <unistd.h>

#include <cstdio>

namespace velt::host {

namespace {

constexpr const char* demo = "demo";
constexpr const char* sharesFile = "etc/velt/shares.json";

/// Without root's rights the FTP daemon knows only the accounts of its own files.
void makeDemoUser(const std::filesystem::path& place) {
    const std::string password = randomHexadecimal(6);
    crypt_data data{};
    const std::string hash = ::crypt_r(password.c_str(), ("$5$" + randomHexadecimal(8)).c_str(), &data);
    const std::string ids = std::to_string(::getuid()) + ":" + std::to_string(::getgid());
    check(replaceFile("demo-password", password + "\n", 0600));
    check(replaceFile("etc/velt/ftp.passwd",
                      "demo:" + hash + ":" + ids + "::" + (place / demo).string() + ":/bin/sh\n", 0600));
    check(replaceFile("etc/velt/ftp.group",
                      groupName(::getgid()) + ":x:" + std::to_string(::getgid()) + ":\n", 0600));
}

void giveDemoToAnonymousUsers() {
    const passwd* const account = ::getpwnam("ftp"); // NOLINT(concurrency-mt-unsafe)
    if (account == nullptr || ::chown(demo, account->pw_uid, static_cast<gid_t>(-1)) != 0) {
        throw TrialError("Cannot give the folder demo to the account ftp.");
    }
}

void makeDemoShare(const std::filesystem::path& place) {
    const bool root = ::geteuid() == 0;
    check(makeFolder(demo));
    if (root) {
        giveDemoToAnonymousUsers();
    } else {
        makeDemoUser(place);
    }
    const std::string user = root ? "ftp" : userName(::geteuid());
    Json::Value shares = jsonObject({{"version", 1}});
    shares["shares"].append(jsonObject({{"name", demo},
                                        {"comment", "A share to try"},
                                        {"path", (place / demo).string()},
                                        {"ftp", true},
                                        {"users", jsonObject({{user.c_str(), "write"}})}}));
    check(replaceFile(sharesFile, toJson(shares) + "\n", 0644));
}

/// The first port, from this one on, that the service can have.
int freePort(const char* service, int first) {
    constexpr int tried = 20;
    for (int port = first; port < first + tried; ++port) {
        if (WebUtils::IsPortConflict(service, port, port) == 0) {
            return port;
        }
    }
    throw TrialError(lastErrorSentence());
}

void checkCall(int result) {
    if (result < 0) {
        throw TrialError(lastErrorSentence());
    }
}

void makeSettings() {
    _tag_VELT_FTP_CONF_ settings{};
    checkCall(VELTFTPConfGet(&settings));
    std::snprintf(settings.portnum, sizeof settings.portnum, "%d", freePort("ftp", 2121));
    if (::geteuid() == 0) {
        settings.user_chroot = 1;
        settings.anonymous = 1;
        settings.anonymous_chroot = 1;
        std::snprintf(settings.anonymous_chroot_share, sizeof settings.anonymous_chroot_share, "%s", demo);
    }
    checkCall(VELTFTPConfSet(settings));
    checkCall(VELTSFTPConfigSet(0, freePort("ssh", 2222)));
}

} // namespace

void makeFirstState(const std::filesystem::path& place) {
    check(replaceFile("etc/velt/network.conf",
                      "# A trial: nobody else can connect.\nversion = 1\nloopback_only = 1\n", 0644));
    // Written last, the shares show that all of the demo is there. They may have become the user's own since.
    if (!valueOf(isThere(sharesFile))) {
        makeDemoShare(place);
    }
    makeSettings();
}

} // namespace velt::host
