// Tests with shares on which accounts have different grants.
#ifndef VELT_TESTS_SYSTEM_SUPPORT_SHARED_FOLDERS_H
#define VELT_TESTS_SYSTEM_SUPPORT_SHARED_FOLDERS_H

#include "tests/system/support/ftp_service.h"

#include "standalone/contract/last_error.h"
#include "tests/standalone/support/store_shares.h"
#include "tests/support/result.h"

#include <sys/stat.h>

#include <algorithm>
#include <filesystem>
#include <map>
#include <string>
#include <vector>

namespace velt::test {

using Grants = std::map<std::string, Access>;

/// A fixture with no shares at first. The Unix modes of the shares' folders allow everybody everything.
class SharedFolders : public FtpService {
protected:
    void SetUp() override {
        FtpService::SetUp();
        record.user_chroot = 0;
    }

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
    static std::string seenBy(const std::string& user, const std::string& folder = "/") {
        FtpSession session(port);
        if (const int code = session.logIn(user); code != 230) {
            return std::to_string(code);
        }
        return seenIn(session, folder);
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
        std::string joined;
        for (const auto& name : names) {
            joined += (joined.empty() ? "" : " ") + name;
        }
        return joined;
    }

    /// "write", "read" or "none": what the user may do with the file of this folder.
    static std::string accessOf(const std::string& user, const std::string& folder) {
        FtpSession session(port);
        EXPECT_EQ(session.logIn(user), 230);
        if (!session.receive("RETR " + folder + "/file")) {
            return "none";
        }
        if (session.send("STOR " + folder + "/probe", "x") != 226) {
            return "read";
        }
        EXPECT_EQ(session.command("DELE " + folder + "/probe").code, 250);
        return "write";
    }

private:
    std::vector<ShareEntry> shares_;
};

} // namespace velt::test

#endif
