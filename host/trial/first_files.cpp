#include "host/trial/first_files.h"

#include "base/file.h"
#include "host/base/account_names.h"
#include "host/base/json.h"
#include "host/base/random_text.h"
#include "host/trial/trial_error.h"

#include <crypt.h>
#include <grp.h>
#include <pwd.h>
#include <unistd.h>

#include <system_error>

namespace velt::host {

namespace {

constexpr const char* demo = "demo";
constexpr const char* sharesFile = "etc/velt/shares.json";

void makeFolder(const char* name) {
    std::error_code error;
    std::filesystem::create_directories(name, error);
    if (error) {
        throw TrialError(std::string("Cannot make the folder ") + name + ": " + error.message() + ".");
    }
}

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

std::string sharesText(const std::filesystem::path& place, const std::string& user) {
    Json::Value share(Json::objectValue);
    share["name"] = demo;
    share["comment"] = "A share to try";
    share["path"] = (place / demo).string();
    share["ftp"] = true;
    share["users"][user] = "write";
    Json::Value root(Json::objectValue);
    root["version"] = 1;
    root["shares"].append(share);
    return toJson(root) + "\n";
}

} // namespace

void makeFirstFiles(const std::filesystem::path& place) {
    if (std::filesystem::exists(sharesFile)) {
        return;
    }
    const bool root = ::geteuid() == 0;
    makeFolder(demo);
    check(replaceFile("etc/velt/network.conf",
                      "# A trial: nobody else can connect.\nversion = 1\nloopback_only = 1\n", 0644));
    if (root) {
        giveDemoToAnonymousUsers();
    } else {
        makeDemoUser(place);
    }
    // Last: it shows that all of them exist.
    check(replaceFile(sharesFile, sharesText(place, root ? "ftp" : userName(::geteuid())), 0644));
}

} // namespace velt::host
