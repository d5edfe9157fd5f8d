#include "tests/system/support/health_service.h"

#include "base/unique_fd.h"
#include "tests/support/files.h"

#include <arpa/inet.h>
#include <netinet/in.h>
#include <sys/mount.h>
#include <sys/prctl.h>
#include <sys/socket.h>
#include <sys/stat.h>
#include <sys/wait.h>
#include <unistd.h>

#include <array>
#include <csignal>
#include <sstream>

namespace velt::test {
namespace fs = std::filesystem;
namespace {

int boundTo(int port, bool shares) {
    const int descriptor = ::socket(AF_INET, SOCK_STREAM | SOCK_CLOEXEC, 0);
    const int on = shares ? 1 : 0; // one that only has the port for itself is in the way of all
    ::setsockopt(descriptor, SOL_SOCKET, SO_REUSEADDR, &on, sizeof on);
    sockaddr_in address{};
    address.sin_family = AF_INET;
    address.sin_port = htons(static_cast<in_port_t>(port));
    EXPECT_EQ(::bind(descriptor, reinterpret_cast<const sockaddr*>(&address), sizeof address), 0) << port;
    return descriptor;
}

} // namespace

TakenPort::TakenPort(int port, As as) : descriptor_(boundTo(port, as == As::listener)) {
    if (as == As::listener) {
        EXPECT_EQ(::listen(descriptor_, 1), 0);
    }
}

TakenPort::~TakenPort() {
    ::close(descriptor_);
}

NamedListener::NamedListener(const char* program, int port) {
    std::array<int, 2> ready{};
    EXPECT_EQ(::pipe2(ready.data(), O_CLOEXEC), 0);
    process_ = ::fork();
    if (process_ == 0) {
        ::prctl(PR_SET_PDEATHSIG, SIGKILL);
        ::prctl(PR_SET_NAME, program);
        const TakenPort taken(port);
        (void)!::write(ready[1], "", 1);
        ::pause();
        ::_exit(0);
    }
    char byte = 0;
    EXPECT_EQ(::read(ready[0], &byte, 1), 1);
    ::close(ready[0]);
    ::close(ready[1]);
}

NamedListener::~NamedListener() {
    ::kill(process_, SIGKILL);
    ::waitpid(process_, nullptr, 0);
}

std::string HealthService::diagnosis() {
    std::string text;
    const Json::Value health = jsonOf(veltctl({"doctor", "--json"}).output);
    for (const Json::Value& each : health["findings"]) {
        if (each["severity"] != "notice" && each["subject"] != "host") {
            text += each["id"].asString() + ": " + each["mend"].asString() + "\n";
        }
    }
    return text;
}

void HealthService::mend(const std::string& diagnosis, const std::string& id) {
    std::istringstream lines(diagnosis);
    bool named = false;
    for (std::string line; std::getline(lines, line);) {
        if (line.starts_with(id + ": ")) {
            named = true;
            obey(line.substr(id.size() + 2));
        }
    }
    EXPECT_TRUE(named) << id << " is not in:\n" << diagnosis;
}

void HealthService::obey(std::string command) {
    if (const auto after = command.rfind("run: "); after != std::string::npos) {
        command.erase(0, after + 5);
    }
    if (command.ends_with("estart veltd.")) { // there is no systemd in this world
        EXPECT_EQ(stopHost(), 0);
        startHost();
        return;
    }
    const ProcessResult done =
        runProcess({"env", "PATH=/mnt:/usr/sbin:/usr/bin:/sbin:/bin",
                    "VELT_SOCKET=" + (worldRoot / "run/velt/veltd.sock").string(), "bash", "-c", command});
    EXPECT_EQ(done.exitCode, 0) << command << "\n" << done.output << done.errors;
}

HealthService::Certificate HealthService::makeCertificate() {
    const ProcessResult made =
        runProcess({"openssl", "req", "-x509", "-newkey", "ec", "-pkeyopt", "ec_paramgen_curve:P-256",
                    "-nodes", "-keyout", "/mnt/made.key", "-out", "/mnt/made.crt", "-days", "100", "-subj",
                    "/CN=files.example", "-addext", "subjectAltName=DNS:files.example"});
    EXPECT_EQ(made.exitCode, 0) << made.errors;
    Certificate certificate{contentsOf("/mnt/made.crt"), contentsOf("/mnt/made.key")};
    fs::remove("/mnt/made.crt");
    fs::remove("/mnt/made.key");
    return certificate;
}

void HealthService::putInPlace(const std::string& certificate, const std::string& key) {
    const fs::path folder = worldRoot / "etc/velt/tls";
    fs::create_directories(folder);
    writeFile(folder / "server.crt", certificate);
    writeFile(folder / "server.key", key);
    ASSERT_EQ(::chmod((folder / "server.key").c_str(), 0600), 0);
}

void HealthService::setFirewall(const std::string& lines) {
    writeFile(worldRoot / "etc/velt/firewall.conf", "version = 1\n" + lines);
}

ReplaceablePrograms::ReplaceablePrograms(fs::path folder) : folder_(std::move(folder)) {
    for (const char* each : {"/mnt/replaceable", "/mnt/replaceable/upper", "/mnt/replaceable/work"}) {
        fs::create_directories(each);
    }
    const std::string options =
        "lowerdir=" + folder_.string() + ",upperdir=/mnt/replaceable/upper,workdir=/mnt/replaceable/work";
    EXPECT_EQ(::mount("overlay", folder_.c_str(), "overlay", 0, options.c_str()), 0) << std::strerror(errno);
}

ReplaceablePrograms::~ReplaceablePrograms() {
    EXPECT_EQ(::umount(folder_.c_str()), 0) << std::strerror(errno);
    fs::remove_all("/mnt/replaceable");
}

void ReplaceablePrograms::replace(const std::string& program) const {
    fs::copy_file(folder_ / program, folder_ / (program + ".new"));
    fs::rename(folder_ / (program + ".new"), folder_ / program);
}

} // namespace velt::test
