#include "tests/system/support/private_world.h"

#include <crypt.h>
#include <net/if.h>
#include <sched.h>
#include <sys/ioctl.h>
#include <sys/mount.h>
#include <sys/prctl.h>
#include <sys/socket.h>
#include <sys/stat.h>
#include <sys/wait.h>
#include <unistd.h>

#include <cerrno>
#include <csignal>
#include <cstring>
#include <fstream>
#include <stdexcept>

namespace velt::test {
namespace {

std::string reason;

void check(bool good, const std::string& what) {
    if (!good) {
        throw std::runtime_error(what + ": " + std::strerror(errno));
    }
}

void mountFresh(const char* folder) {
    check(mount("velt-test", folder, "tmpfs", MS_NOSUID, "mode=0755") == 0, folder);
}

// Replaces a file of the system for this world only.
void replace(const std::string& name, const std::string& contents, mode_t mode) {
    const std::string own = "/mnt/etc/" + name;
    std::ofstream(own) << contents;
    check(chmod(own.c_str(), mode) == 0, own);
    check(mount(own.c_str(), ("/etc/" + name).c_str(), nullptr, MS_BIND, nullptr) == 0, "/etc/" + name);
}

std::string hashOf(const std::string& password) {
    crypt_data data{};
    const char* hash = crypt_r(password.c_str(), "$5$rounds=1000$velttests$", &data);
    check(hash != nullptr && hash[0] == '$', "crypt");
    return hash;
}

void makeAccounts() {
    std::string users = "root:x:0:0:root:/root:/bin/sh\n"
                        "proftpd:x:103:65534::/run/proftpd:/usr/sbin/nologin\n"
                        "ftp:x:104:65534::/srv/ftp:/usr/sbin/nologin\n"
                        "sshd:x:105:65534::/run/sshd:/usr/sbin/nologin\n"
                        "nobody:x:65534:65534:nobody:/nonexistent:/usr/sbin/nologin\n";
    std::string shadow = "root:*:19000:0:99999:7:::\nproftpd:!:19000::::::\nftp:!:19000::::::\n"
                         "sshd:!:19000::::::\nnobody:*:19000:0:99999:7:::\n";
    unsigned id = aliceId;
    for (const std::string name : {"alice", "bob", "carol"}) {
        const std::string number = std::to_string(id);
        const std::string home = "/mnt/home/" + name;
        users += name + ":x:" + number + ":" + number + ":" + name + " of the tests:" + home +
                 ":/usr/sbin/nologin\n";
        shadow += name + ":" + hashOf(name + "-secret") + ":19000:0:99999:7:::\n";
        std::filesystem::create_directories(home);
        check(chmod(home.c_str(), 0700) == 0 && chown(home.c_str(), id, id) == 0, home);
        id++;
    }
    replace("passwd", users, 0644);
    replace("shadow", shadow, 0600);
    replace("group",
            "root:x:0:\nshadow:x:42:\nnogroup:x:65534:\nalice:x:1001:\nbob:x:1002:\ncarol:x:1003:\n"
            "staff:x:2001:alice,bob\nvelt-admin:x:2002:carol\n",
            0644);
    replace("nsswitch.conf", "passwd: files\ngroup: files\nshadow: files\nhosts: files\n", 0644);
}

void raiseLoopback() {
    const int device = socket(AF_INET, SOCK_DGRAM | SOCK_CLOEXEC, 0);
    check(device >= 0, "socket");
    ifreq request{};
    std::strcpy(request.ifr_name, "lo");
    check(ioctl(device, SIOCGIFFLAGS, &request) == 0, "lo");
    request.ifr_flags = static_cast<short>(request.ifr_flags | IFF_UP);
    check(ioctl(device, SIOCSIFFLAGS, &request) == 0, "lo");
    close(device);
}

void furnish() {
    check(mount(nullptr, "/", nullptr, MS_REC | MS_PRIVATE, nullptr) == 0, "/");
    check(mount("proc", "/proc", "proc", MS_NOSUID | MS_NODEV | MS_NOEXEC, nullptr) == 0, "/proc");
    for (const char* folder : {"/mnt", "/run", "/var/log"}) {
        mountFresh(folder);
    }
    std::filesystem::create_directories("/mnt/etc");
    std::filesystem::create_directories(worldRoot);
    makeAccounts();
    raiseLoopback();
}

} // namespace

bool enterPrivateWorld(int& exitCode) {
    if (geteuid() != 0) {
        reason = "only root can make name spaces";
        return true;
    }
    const pid_t tester = getpid();
    if (unshare(CLONE_NEWNS | CLONE_NEWNET | CLONE_NEWPID) < 0) {
        reason = std::string("no name spaces can be made: ") + std::strerror(errno);
        return true;
    }
    // The child is the first process of its name space: whatever it started ends with it, and it ends with
    // us.
    const pid_t child = fork();
    if (child == 0) {
        prctl(PR_SET_PDEATHSIG, SIGKILL);
        try {
            furnish();
        } catch (const std::exception& error) {
            reason = std::string("the private world cannot be furnished: ") + error.what();
        }
        return true;
    }
    if (child < 0) {
        throw std::runtime_error("process " + std::to_string(tester) + " cannot fork");
    }
    int status = 0;
    while (waitpid(child, &status, 0) < 0 && errno == EINTR) {
    }
    exitCode = WIFEXITED(status) ? WEXITSTATUS(status) : 128 + WTERMSIG(status);
    return false;
}

const std::string& whyNoWorld() {
    return reason;
}

} // namespace velt::test
