// The files of a server at work, and the table in docs/security.md.
#include "standalone/core/state_root.h"
#include "tests/support/files.h"
#include "tests/system/support/systemd_host.h"
#include "tests/system/support/systemd_services.h"

#include <fnmatch.h>

#include <algorithm>
#include <filesystem>
#include <fstream>
#include <sstream>
#include <string>
#include <vector>

namespace velt::test {
namespace {
namespace fs = std::filesystem;

struct Row {
    std::string pattern; ///< of a path, for fnmatch
    std::string mode;    ///< "0644"
    bool found = false;
};

/// What stands between back quotes.
std::vector<std::string> quotedIn(const std::string& cell) {
    std::vector<std::string> texts;
    std::istringstream parts(cell);
    std::string text;
    for (bool quoted = false; std::getline(parts, text, '`'); quoted = !quoted) {
        if (quoted) {
            texts.push_back(text);
        }
    }
    return texts;
}

/// The rows below the heading "| path | mode | ...". A name without a folder lies beside the one before it.
std::vector<Row> tableOfFiles() {
    std::ifstream page(VELT_SOURCE_FOLDER "/docs/security.md");
    std::vector<Row> rows;
    bool inTable = false;
    for (std::string line; std::getline(page, line);) {
        inTable = line.starts_with("| path | mode |") || (inTable && line.starts_with("|"));
        std::istringstream cells(line);
        std::string paths, mode;
        if (!inTable || !line.starts_with("| `") ||
            !std::getline(std::getline(std::getline(cells, paths, '|'), paths, '|'), mode, '|')) {
            continue;
        }
        fs::path folder;
        for (const fs::path path : quotedIn(paths)) {
            folder = path.is_absolute() ? path.parent_path() : folder;
            rows.push_back({(folder / path.filename()).string(), mode.substr(1, mode.size() - 2)});
        }
    }
    return rows;
}

/// "0644 root root /etc/velt/ftp.conf" for each file, folder and socket.
std::vector<std::string> filesOfTheServer() {
    std::istringstream found(runProcess({"find", "/etc/velt", "/etc/veltinfo.conf", "/var/lib/velt",
                                         "/var/log/velt", "/run/velt", "-printf", "%#m %u %g %p\n"})
                                 .output);
    std::vector<std::string> files;
    for (std::string line; std::getline(found, line);) {
        files.push_back(line);
    }
    return files;
}

TEST_F(UnderSystemd, theFilesOfTheServerAreThoseOfTheTable) {
    inside([] {
        setStateRoot("/");
        fs::create_directories("/srv/public");
        installAndEnableHost();
        ASSERT_TRUE(hostAnswers());
        const ProcessResult changed = runProcess({"sh", "-ec", R"(cd /usr/local/bin
echo '{"version": 1, "shares": [{"name": "public", "comment": "", "path": "/srv/public", "ftp": true,
    "users": {"ftp": "read"}, "groups": {}}]}' >/etc/velt/shares.json
./veltctl ftp set enable_ftp=on enable_ftps=on ext_ip=192.0.2.1
./veltctl security set anonymous=on anonymous_chroot=on anonymous_chroot_share=public
./veltctl sftp set enable=on portnum=2222
./veltctl chroot rules add user alice /home
./veltctl keys add alice ssh-ed25519 AAAAC3NzaC1lZDI1NTE5AAAAIG6o8kw9HXo7MMRTNqpwImZIpCtgXHP+yTaiesMotiqn
./veltctl tokens create watcher --role viewer
curl -sS ftp://127.0.0.1/)"},
                                                 {}, std::chrono::seconds(60));
        ASSERT_EQ(changed.exitCode, 0) << changed.errors;
        std::vector<Row> rows = tableOfFiles();
        EXPECT_GT(rows.size(), 10U);
        const std::vector<std::string> files = filesOfTheServer();
        EXPECT_GT(files.size(), 25U);
        for (const std::string& file : files) {
            std::istringstream fields(file);
            std::string mode, user, group, path;
            fields >> mode >> user >> group >> path;
            const auto row = std::find_if(rows.begin(), rows.end(), [&](const Row& each) {
                return ::fnmatch(each.pattern.c_str(), path.c_str(), FNM_PATHNAME) == 0;
            });
            if (row == rows.end()) {
                ADD_FAILURE() << "not in the table: " << file;
                continue;
            }
            row->found = true;
            EXPECT_EQ(mode, row->mode) << file;
            EXPECT_EQ(user, "root") << file;
            EXPECT_EQ(group, path == "/run/velt/veltd.sock" ? "velt-admin" : "root") << file;
        }
        for (const Row& row : rows) {
            EXPECT_TRUE(row.found) << "in the table, but not on the server: " << row.pattern;
        }
    });
}

// Where nearly all is read-only for the host, it has to ask elsewhere what users may write.
TEST_F(UnderSystemd, whatUsersMayDoIsToldAsTheServicesSeeIt) {
    inside([] {
        startHost();
        const std::string share = done({"access", "alice", "/srv/public"});
        EXPECT_TRUE(
            share.starts_with("FTP: read and write, as /public. alice may read and change /srv/public"))
            << share;
        EXPECT_EQ(shell("systemctl list-units --all --plain --no-legend 'run-*'"), "") << "nothing is left";
    });
}

} // namespace
} // namespace velt::test
