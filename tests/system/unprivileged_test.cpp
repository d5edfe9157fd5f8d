// The FTP service without root's rights: accounts of its own files, one user's rights for all of them.
#include "tests/system/support/ftp_service.h"

#include "standalone/contract/last_error.h"
#include "standalone/core/state_root.h"
#include "standalone/daemons/proftpd/proftpd_plan.h"
#include "standalone/rules/rule_store.h"
#include "tests/support/files.h"
#include "tests/support/result.h"

#include <crypt.h>
#include <grp.h>
#include <sys/wait.h>
#include <unistd.h>

#include <csignal>
#include <filesystem>
#include <iostream>

namespace velt::test {
namespace {
namespace fs = std::filesystem;

class UnprivilegedFtp : public FtpService {
protected:
    const fs::path root_ = "/mnt/srv/unprivileged";

    void SetUp() override {
        FtpService::SetUp();
        if (IsSkipped() || HasFatalFailure()) {
            return;
        }
        fs::create_directories(root_ / "etc/velt");
        crypt_data data{};
        const std::string hash = crypt_r("guest-secret", "$5$rounds=1000$velttests$", &data);
        writeFile(root_ / "etc/velt/ftp.passwd", "guest:" + hash + ":1003:1003::/mnt/home/carol:/bin/sh\n");
        writeFile(root_ / "etc/velt/ftp.group", "carol:x:1003:\n");
        for (const auto& path : {root_, root_ / "etc", root_ / "etc/velt", root_ / "etc/velt/ftp.passwd",
                                 root_ / "etc/velt/ftp.group"}) {
            ASSERT_EQ(chown(path.c_str(), carolId, carolId), 0);
        }
        for (const char* file : {"ftp.passwd", "ftp.group"}) {
            fs::permissions(root_ / "etc/velt" / file, fs::perms(0600));
        }
    }
    void TearDown() override {
        if (daemon_ > 0) {
            kill(daemon_, SIGTERM);
            waitpid(daemon_, nullptr, 0);
        }
        FtpService::TearDown();
    }

    // Becomes carol, plans, and becomes the daemon.
    [[noreturn]] void beDaemon() {
        setStateRoot(root_);
        if (setgroups(0, nullptr) < 0 || setgid(carolId) < 0 || setuid(carolId) < 0 ||
            VELTFTPConfSet(record) < 0) {
            std::cerr << lastErrorSentence() << '\n';
            _exit(1);
        }
        if (!makeRulesFile()) {
            _exit(1);
        }
        const auto plan = planFtpDaemon();
        if (!plan || !*plan) {
            std::cerr << messageOf(plan) << '\n';
            _exit(1);
        }
        std::vector<char*> arguments;
        for (const auto& argument : (*plan)->order.arguments) {
            arguments.push_back(const_cast<char*>(argument.c_str()));
        }
        arguments.push_back(nullptr);
        execv(arguments[0], arguments.data());
        _exit(1);
    }

    void startUnprivileged() {
        daemon_ = fork();
        if (daemon_ == 0) {
            beDaemon();
        }
        for (int i = 0; i < 500 && !isListening(port); i++) {
            usleep(10000);
        }
        ASSERT_TRUE(isListening(port));
    }

    pid_t daemon_ = -1;
};

TEST_F(UnprivilegedFtp, servesTheAccountsOfItsOwnFiles) {
    record.user_chroot = 0;
    offerTls(true);
    startUnprivileged();
    FtpSession session(port);
    EXPECT_EQ(session.logIn("guest"), 230);
    EXPECT_EQ(session.receive("RETR home-of"), "carol");
    EXPECT_EQ(session.send("STOR sent", "x"), 226);
    EXPECT_EQ(modeOf(root_ / "run/velt/ftp/daemon"), 0700U);
    EXPECT_EQ(FtpSession(port).logIn("guest", "wrong"), 530);
    EXPECT_EQ(FtpSession(port).logIn("alice"), 530) << "an account of the server";
    const auto file = curl({"--ssl-reqd", "--cacert", (root_ / "var/lib/velt/tls/server.crt").string(),
                            "--user", "guest:guest-secret", "ftp://127.0.0.1:2121/home-of"});
    EXPECT_EQ(file.output, "carol") << file.errors;
}

TEST_F(UnprivilegedFtp, letsNobodyWriteWhatItsOwnUserObeys) {
    const fs::path file = root_ / "etc/velt/ftp.passwd";
    std::string accounts = contentsOf(file);
    accounts.replace(accounts.find("/mnt/home/carol"), 15, "/mnt/srv");
    writeFile(file, accounts, carolId);
    record.user_chroot = 0;
    startUnprivileged();
    FtpSession session(port);
    ASSERT_EQ(session.logIn("guest"), 230);
    EXPECT_EQ(session.send("STOR /mnt/home/carol/.profile", "x"), 550);
    EXPECT_EQ(session.command("MKD /mnt/home/carol/.ssh").code, 550);
    EXPECT_EQ(session.command("MKD /mnt/srv/.ssh").code, 550) << "of the account's home";
    EXPECT_EQ(session.send("STOR /mnt/home/carol/file", "x"), 226);
}

TEST_F(UnprivilegedFtp, refusesLoginsThatItCannotConfine) {
    record.user_chroot = 1;
    startUnprivileged();
    EXPECT_EQ(FtpSession(port).logIn("guest"), 530);
}

TEST_F(UnprivilegedFtp, refusesLoginsWithARule) {
    record.user_chroot = 0;
    startUnprivileged();
    const fs::path rules = root_ / "etc/velt/chroot_rules";
    for (const char* rule : {"u:1003:/home", "u:1003:/music", "g:1003:/home"}) {
        writeFile(rules, "velt-chroot-rules 1\n" + std::string(rule) + "\n", carolId);
        EXPECT_EQ(FtpSession(port).logIn("guest"), 530) << rule;
    }
    writeFile(rules, "velt-chroot-rules 1\nu:1002:/home\n", carolId);
    EXPECT_EQ(FtpSession(port).logIn("guest"), 230);
    fs::remove(rules);
    EXPECT_EQ(FtpSession(port).logIn("guest"), 530);
}

} // namespace
} // namespace velt::test
