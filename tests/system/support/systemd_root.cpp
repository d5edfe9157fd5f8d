#include "tests/system/support/systemd_root.h"

#include "tests/support/files.h"
#include "tests/system/support/systemd_world.h"

#include <crypt.h>
#include <linux/capability.h>
#include <sched.h>
#include <sys/mount.h>
#include <sys/prctl.h>
#include <sys/stat.h>
#include <sys/syscall.h>
#include <unistd.h>

#include <cerrno>
#include <cstdlib>
#include <cstring>
#include <filesystem>
#include <fstream>
#include <set>
#include <sstream>

namespace velt::test {
namespace {
namespace fs = std::filesystem;

constexpr unsigned aliceId = SystemdWorld::aliceId;
const fs::path disk = "/mnt";
const fs::path root = disk / "root";

void check(bool good, const std::string& what) {
    if (!good) {
        throw std::runtime_error(what + ": " + std::strerror(errno));
    }
}

void mountNew(const char* type, const fs::path& place, unsigned long flags, const char* options) {
    check(::mount(type, place.c_str(), type, flags, options) == 0, place);
}

void bind(const fs::path& what, const fs::path& place) {
    check(::mount(what.c_str(), place.c_str(), nullptr, MS_BIND | MS_REC, nullptr) == 0, place);
}

void makeReadOnly(const fs::path& place) {
    bind(place, place);
    check(::mount(nullptr, place.c_str(), nullptr, MS_REMOUNT | MS_BIND | MS_RDONLY, nullptr) == 0, place);
}

void write(const fs::path& file, const std::string& text) {
    fs::create_directories(file.parent_path());
    std::ofstream(file) << text;
}

void append(const fs::path& file, const std::string& text) {
    std::ofstream(file, std::ios::app) << text;
}

/// The lines of a file of accounts or groups whose third field, the number, is one of the system's own; no
/// person on the real machine has an account here, so that "alice" is ours. The names of those that stay.
std::set<std::string> keepSystemAccounts(const fs::path& file) {
    std::istringstream lines(contentsOf(file));
    std::set<std::string> names;
    std::string kept;
    for (std::string line; std::getline(lines, line);) {
        std::istringstream fields(line);
        std::string name, password, number;
        std::getline(std::getline(std::getline(fields, name, ':'), password, ':'), number, ':');
        const unsigned long id = std::strtoul(number.c_str(), nullptr, 10);
        if (id < 1000 || id == 65534) {
            names.insert(name);
            kept += line + "\n";
        }
    }
    write(file, kept);
    return names;
}

void removePeople() {
    const auto users = keepSystemAccounts(root / "etc/passwd");
    keepSystemAccounts(root / "etc/group");
    std::istringstream lines(contentsOf(root / "etc/shadow"));
    std::string kept;
    for (std::string line; std::getline(lines, line);) {
        kept += users.contains(line.substr(0, line.find(':'))) ? line + "\n" : "";
    }
    write(root / "etc/shadow", kept);
    for (const char* folder : {"home", "root", "srv"}) {
        mountNew("tmpfs", root / folder, MS_NOSUID | MS_NODEV, "mode=0755");
    }
}

/// What an installation on the real machine has stored.
void removeState() {
    for (const char* folder : {"etc/velt", "var/lib/velt", "var/log/velt"}) {
        fs::remove_all(root / folder);
    }
}

void makeAlice() {
    crypt_data data{};
    const char* hash = ::crypt_r("alice-secret", "$5$rounds=1000$velttests$", &data);
    append(root / "etc/passwd", "alice:x:1001:1001::/home/alice:/bin/sh\n");
    append(root / "etc/group", "alice:x:1001:\n");
    append(root / "etc/shadow", std::string("alice:") + hash + ":19000:0:99999:7:::\n");
    const fs::path home = root / "home/alice";
    fs::create_directories(home);
    check(::chown(home.c_str(), aliceId, aliceId) == 0 && ::chmod(home.c_str(), 0700) == 0, home);
}

/// What the administrator of the real machine has enabled is not to start here, nor what sets up hardware.
void thinOut() {
    const fs::path units = root / "etc/systemd/system";
    fs::remove_all(units);
    fs::create_directories(units);
    for (const auto& entry : fs::directory_iterator(root / "etc")) {
        const std::string name = entry.path().filename();
        if (name.size() == 5 && name.starts_with("rc") && name.ends_with(".d")) {
            fs::remove_all(entry.path()); // the links that enable old init scripts
        }
    }
    for (const char* unit :
         {"systemd-sysctl", "systemd-binfmt", "systemd-modules-load", "systemd-random-seed", "systemd-repart",
          "systemd-update-utmp", "systemd-update-utmp-runlevel", "kmod-static-nodes", "systemd-firstboot",
          "systemd-tmpfiles-setup-dev", "systemd-timesyncd", "systemd-networkd", "systemd-resolved",
          "systemd-udevd", "getty-static"}) {
        fs::create_symlink("/dev/null", units / (std::string(unit) + ".service"));
    }
    write(root / "etc/fstab", "");
    write(root / "etc/machine-id", "5a1e0c0ffee04e57a11c0dedc0ffee00\n");
    write(root / "etc/environment", "");
}

void makeDevices() {
    const fs::path devices = root / "dev";
    mountNew("tmpfs", devices, MS_NOSUID, "mode=0755");
    for (const char* name : {"null", "zero", "full", "random", "urandom", "tty"}) {
        write(devices / name, "");
        bind(fs::path("/dev") / name, devices / name);
    }
    fs::create_directories(devices / "shm");
    mountNew("tmpfs", devices / "shm", MS_NOSUID | MS_NODEV, "mode=1777");
    fs::create_directories(devices / "pts");
    mountNew("devpts", devices / "pts", MS_NOSUID | MS_NOEXEC, "newinstance,ptmxmode=0666,mode=620");
    fs::create_symlink("pts/ptmx", devices / "ptmx");
    fs::create_symlink("/proc/self/fd", devices / "fd");
}

void mountKernel() {
    mountNew("proc", root / "proc", MS_NOSUID | MS_NODEV | MS_NOEXEC, nullptr);
    makeReadOnly(root / "proc/sys");
    if (fs::exists(root / "proc/sysrq-trigger")) {
        makeReadOnly(root / "proc/sysrq-trigger");
    }
    mountNew("sysfs", root / "sys", MS_NOSUID | MS_NODEV | MS_NOEXEC | MS_RDONLY, nullptr);
    mountNew("cgroup2", root / "sys/fs/cgroup", MS_NOSUID | MS_NODEV | MS_NOEXEC, nullptr);
    mountNew("tmpfs", root / "run", MS_NOSUID | MS_NODEV, "mode=0755");
    mountNew("tmpfs", root / "tmp", MS_NOSUID | MS_NODEV, "mode=1777");
}

/// A folder of the real machine that may lie on a file system of its own, which the layer does not show, or
/// below one of those that are new here. As a layer, too: what tidies up at a boot must not reach the real
/// one.
void show(const std::string& folder, const std::string& layer) {
    const fs::path place = root / fs::path(folder).relative_path();
    fs::create_directories(place);
    const std::string options =
        "lowerdir=" + folder + ",upperdir=/mnt/" + layer + "/written,workdir=/mnt/" + layer + "/work";
    mountNew("overlay", place, 0, options.c_str());
}

void giveUpTheMachine() {
    for (const int capability :
         {CAP_SYS_BOOT, CAP_SYS_TIME, CAP_SYS_MODULE, CAP_SYS_RAWIO, CAP_SYS_PACCT, CAP_SYSLOG, CAP_MKNOD,
          CAP_WAKE_ALARM, CAP_BLOCK_SUSPEND, CAP_MAC_ADMIN, CAP_MAC_OVERRIDE, CAP_PERFMON, CAP_BPF}) {
        check(::prctl(PR_CAPBSET_DROP, static_cast<unsigned long>(capability), 0, 0, 0) == 0, "capabilities");
    }
}

} // namespace

void makeSystemdRoot() {
    try {
        check(::unshare(CLONE_NEWNS) == 0, "no name space for mounts can be made");
        check(::mount(nullptr, "/", nullptr, MS_REC | MS_PRIVATE, nullptr) == 0, "/");
        mountNew("tmpfs", disk, MS_NOSUID, "mode=0755");
        for (const char* folder :
             {"root", "written", "work", "source/written", "source/work", "built/written", "built/work"}) {
            fs::create_directories(disk / folder);
        }
        mountNew("overlay", root, 0, "lowerdir=/,upperdir=/mnt/written,workdir=/mnt/work");
        thinOut();
        removePeople();
        removeState();
        makeAlice();
    } catch (const std::runtime_error& error) {
        throw NoSystemd(std::string("the machine's disk cannot be made: ") + error.what());
    }
}

void removeSystemdRoot() {
    ::umount2(root.c_str(), MNT_DETACH);
    ::umount2(disk.c_str(), MNT_DETACH);
}

void enterSystemdRoot(const std::string& group) {
    std::ofstream members(group + "/cgroup.procs");
    members << "0\n" << std::flush;
    check(members.good() && ::unshare(CLONE_NEWCGROUP) == 0, group);
    check(::mount(nullptr, "/", nullptr, MS_REC | MS_PRIVATE, nullptr) == 0, "/");
    mountKernel();
    makeDevices();
    show(VELT_SOURCE_FOLDER, "source"); // an installation takes some files from it
    show(VELT_BUILT_FOLDER, "built");
    fs::create_directories(root / "former");
    check(::chdir(root.c_str()) == 0 && ::syscall(SYS_pivot_root, ".", "former") == 0 && ::chdir("/") == 0 &&
              ::umount2("/former", MNT_DETACH) == 0,
          "the root cannot be changed");
    giveUpTheMachine();
}

} // namespace velt::test
