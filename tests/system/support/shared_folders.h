// Tests with shares on which accounts have different grants, over FTP and SFTP.
#ifndef VELT_TESTS_SYSTEM_SUPPORT_SHARED_FOLDERS_H
#define VELT_TESTS_SYSTEM_SUPPORT_SHARED_FOLDERS_H

#include "tests/system/support/ftp_service.h"

#include "standalone/contract/last_error.h"
#include "standalone/daemons/sshd/sshd_plan.h"
#include "standalone/settings/confinement_settings.h"
#include "standalone/settings/settings_store.h"
#include "tests/standalone/support/store_shares.h"
#include "tests/support/result.h"
#include "tests/system/support/sftp_session.h"

#include <sys/stat.h>

#include <algorithm>
#include <filesystem>
#include <map>
#include <optional>
#include <string>
#include <vector>

namespace velt::test {

using Grants = std::map<std::string, Access>;

/// A fixture with no shares at first. The Unix modes of the shares' folders allow everybody everything.
class SharedFolders : public FtpService {
protected:
    static constexpr int sftpPort = 2222;

    void SetUp() override {
        FtpService::SetUp();
        record.user_chroot = 0;
    }
    void TearDown() override {
        sshd_.stop();
        FtpService::TearDown();
    }

    /// Starts both services; the functions below then expect of both that they show and allow the same.
    void start() {
        startSftp();
        FtpService::start(); // and with it a new log, for both
    }
    void stop() {
        stopSftp();
        FtpService::stop();
    }
    void startSftp(bool confined = true) {
        sshd_.stop();
        ASSERT_EQ(VELTFTPConfSet(record), 0) << lastErrorSentence();
        ASSERT_EQ(messageOf(storeConfinementSettings({confined})), "");
        ASSERT_EQ(messageOf(storeSftpSettings({true, sftpPort})), "");
        const auto plan = planSftpDaemon();
        ASSERT_EQ(messageOf(plan), "");
        ASSERT_TRUE(sshd_.start((*plan)->order));
    }
    void stopSftp() { sshd_.stop(); }

    /// Stores a further share with the folder "/mnt/srv/NAME", or that at `path`, and a file "file" in it
    /// that holds the share's name.
    std::filesystem::path share(const std::string& name, const Grants& users, const Grants& groups = {},
                                const std::string& path = {}) {
        std::filesystem::path folder = path.empty() ? "/mnt/srv/" + name : path;
        std::filesystem::create_directories(folder);
        EXPECT_EQ(chmod(folder.c_str(), 0777), 0);
        writeFile(folder / "file", name, aliceId);
        EXPECT_EQ(chmod((folder / "file").c_str(), 0666), 0);
        shares_.push_back({name, "", folder, true, users, groups});
        store();
        return folder;
    }
    ShareEntry& entry(const std::string& name) {
        return *std::ranges::find(shares_, name, &ShareEntry::name);
    }
    void store() { EXPECT_EQ(messageOf(storeShares(shares_)), ""); }

    /// The names that a session of the user's sees in the folder, sorted; "530" when the login is refused.
    std::string seenBy(const std::string& user, const std::string& folder = "/") const {
        FtpSession session(port);
        const int code = session.logIn(user);
        std::string seen = code == 230 ? seenIn(session, folder) : std::to_string(code);
        if (sshd_.runs()) {
            EXPECT_EQ(seenOverSftp(user, folder), seen) << "over SFTP";
        }
        return seen;
    }
    static std::string seenOverSftp(const std::string& user, const std::string& folder) {
        SftpSession session(sftpPort, user);
        return session.isOpen() ? joined(session.list(folder)) : "530";
    }
    static std::string joined(const std::optional<std::vector<std::string>>& names) {
        std::string all;
        for (const auto& name : names.value_or(std::vector<std::string>{"(closed)"})) {
            all += (all.empty() ? "" : " ") + name;
        }
        return all;
    }
    static std::string seenIn(FtpSession& session, const std::string& folder) {
        if (session.command("CWD " + folder).code != 250) {
            return "(closed)";
        }
        const std::string listing = session.receive("NLST").value_or("(refused)");
        std::vector<std::string> names;
        for (std::size_t start = 0; start < listing.size();) {
            const auto end = std::min(listing.find("\r\n", start), listing.size());
            names.push_back(listing.substr(start, end - start));
            start = end + 2;
        }
        std::ranges::sort(names);
        return joined(names);
    }

    /// "write", "read" or "none": what the user may do with the file of this folder.
    std::string accessOf(const std::string& user, const std::string& folder) const {
        FtpSession session(port);
        EXPECT_EQ(session.logIn(user), 230);
        std::string access = "none";
        if (session.receive("RETR " + folder + "/file")) {
            access = session.send("STOR " + folder + "/probe", "x") == 226 ? "write" : "read";
        }
        if (access == "write") {
            EXPECT_EQ(session.command("DELE " + folder + "/probe").code, 250);
        }
        if (sshd_.runs()) {
            EXPECT_EQ(accessOverSftp(user, folder), access) << "over SFTP";
        }
        return access;
    }
    static std::string accessOverSftp(const std::string& user, const std::string& folder) {
        SftpSession session(sftpPort, user);
        EXPECT_TRUE(session.isOpen());
        if (!session.receive(folder + "/file")) {
            return "none";
        }
        if (session.send(folder + "/probe", "x") != sftpGood) {
            return "read";
        }
        EXPECT_EQ(session.remove(folder + "/probe"), sftpGood);
        return "write";
    }

private:
    DaemonProcess sshd_;
    std::vector<ShareEntry> shares_;
};

} // namespace velt::test

#endif
