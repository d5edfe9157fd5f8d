// An installation below a prefix of its own: what is there, and that it works there.
#include "tests/support/run_program.h"
#include "tests/support/temporary_folder.h"

#include <gtest/gtest.h>

#include <algorithm>
#include <filesystem>
#include <string>
#include <vector>

namespace velt::test {
namespace {
namespace fs = std::filesystem;

constexpr const char* libraries = VELT_LIBRARIES;
constexpr const char* helpers = VELT_HELPERS;

class Installation : public testing::Test {
protected:
    static void SetUpTestSuite() {
        folder_ = new TemporaryFolder;
        made_ = runProcess({VELT_CMAKE, "--install", VELT_BUILT_FOLDER, "--prefix", prefix().string()}, {},
                           std::chrono::seconds(60));
    }
    static void TearDownTestSuite() {
        delete folder_;
        folder_ = nullptr;
    }
    void SetUp() override { ASSERT_EQ(made_.exitCode, 0) << made_.errors; }

    static fs::path prefix() { return folder_->path() / "prefix"; }
    static ProcessResult run(const std::string& program, const std::vector<std::string>& words) {
        std::vector<std::string> arguments{(prefix() / program).string()};
        arguments.insert(arguments.end(), words.begin(), words.end());
        return runProcess(arguments);
    }

private:
    inline static TemporaryFolder* folder_ = nullptr;
    inline static ProcessResult made_;
};

std::vector<std::string> filesBelow(const fs::path& folder) {
    std::vector<std::string> files;
    for (const auto& entry : fs::recursive_directory_iterator(folder)) {
        if (!entry.is_directory()) {
            files.push_back(entry.path().lexically_relative(folder));
        }
    }
    std::ranges::sort(files);
    return files;
}

TEST_F(Installation, holdsTheseFilesAndNoOthers) {
    const std::string library = std::string(libraries) + "/";
    const std::string helper = std::string(helpers) + "/";
    std::vector<std::string> expected{
        "bin/veltctl",
        "sbin/veltd",
        library + "VELT.Core.FileServ.FTP.so",
        library + "libvelt-standalone.so",
        helper + "mod_velt_login.so",
        helper + "velt-access",
        helper + "velt-authorized-keys",
        helper + "velt-login-view",
        helper + "velt-sftp-session.so",
        helper + "velt-supervise",
        "lib/systemd/system/veltd.service",
        "lib/sysusers.d/velt.conf",
        "share/bash-completion/completions/veltctl",
        "share/doc/velt/api.md",
        "share/doc/velt/confinement.md",
        "share/doc/velt/firewall.md",
        "share/doc/velt/openapi.json",
        "share/doc/velt/operations.md",
        "share/doc/velt/security.md",
        "share/doc/velt/sessions.md",
        "share/man/man1/veltctl.1",
        "share/man/man8/veltd.8",
        "share/velt/known_services.conf",
    };
    std::ranges::sort(expected);
    EXPECT_EQ(filesBelow(prefix()), expected);
}

// What is shown there is what is tested here, and what scripts/start does.
TEST(InstallationPage, showsHowToInstall) {
    const std::string page = runProcess({"cat", VELT_SOURCE_FOLDER "/README.md"}).output;
    const std::string shown = page.substr(page.find("\n## On a server\n"));
    for (const char* command : {"\n    scripts/install-packages ",
                                "\n    cmake --preset release && cmake --build --preset release\n",
                                "\n    cmake --install build/release --prefix /usr/local\n"}) {
        EXPECT_NE(shown.find(command), std::string::npos) << command;
    }
    const std::string start = runProcess({"cat", VELT_SOURCE_FOLDER "/scripts/start"}).output;
    for (const char* command : {"\n    scripts/install-packages\n", "\n    cmake --preset release >"}) {
        EXPECT_NE(start.find(command), std::string::npos) << command;
    }
}

TEST(InstallationPage, aReleaseNeedsNoPackageOfTheTests) {
    const TemporaryFolder folder;
    const ProcessResult configured =
        runProcess({VELT_CMAKE, "-S", VELT_SOURCE_FOLDER, "--preset", "release", "-B",
                    (folder.path() / "build").string(), "-DCMAKE_DISABLE_FIND_PACKAGE_GTest=ON"},
                   {}, std::chrono::seconds(100));
    EXPECT_EQ(configured.exitCode, 0) << configured.errors;
}

TEST_F(Installation, itsProgramsStart) {
    const ProcessResult client = run("bin/veltctl", {"--version"});
    EXPECT_EQ(client.exitCode, 0) << client.errors;
    EXPECT_NE(client.output.find(VELT_VERSION), std::string::npos) << client.output;
    // Started at all, it has found the platform's library in the installation.
    const ProcessResult host = run("sbin/veltd", {"--help"});
    EXPECT_EQ(host.exitCode, 0) << host.errors;
    EXPECT_EQ(host.output.rfind("Usage: veltd", 0), 0U) << host.output;
    const ProcessResult supervisor = run(std::string(helpers) + "/velt-supervise", {});
    EXPECT_EQ(supervisor.exitCode, 2) << supervisor.errors;
}

TEST_F(Installation, looksForNoLibraryWhereItWasBuilt) {
    for (const std::string& file : filesBelow(prefix())) {
        const ProcessResult dynamic = runProcess({"readelf", "-d", (prefix() / file).string()});
        EXPECT_EQ(dynamic.output.find(VELT_BUILT_FOLDER), std::string::npos) << file;
    }
}

TEST_F(Installation, theUnitStartsTheInstalledProgramWithTheInstalledModule) {
    const ProcessResult unit = runProcess({"cat", (prefix() / "lib/systemd/system/veltd.service").string()});
    const std::string start = "ExecStart=" + (prefix() / "sbin/veltd").string() + " --module " +
                              (prefix() / libraries / "VELT.Core.FileServ.FTP.so").string() + " ";
    EXPECT_NE(unit.output.find(start), std::string::npos) << unit.output;
    for (const char* left : {"@VELTD@", "@MODULE@"}) {
        EXPECT_EQ(unit.output.find(left), std::string::npos) << unit.output;
    }
}

TEST_F(Installation, goesBelowTheFolderOfAPackage) {
    const fs::path package = prefix().parent_path() / "package";
    const ProcessResult made = runProcess({"env", "DESTDIR=" + package.string(), VELT_CMAKE, "--install",
                                           VELT_BUILT_FOLDER, "--prefix", "/usr"},
                                          {}, std::chrono::seconds(60));
    ASSERT_EQ(made.exitCode, 0) << made.errors;
    EXPECT_EQ(filesBelow(package / "usr"), filesBelow(prefix()));
    const ProcessResult unit =
        runProcess({"cat", (package / "usr/lib/systemd/system/veltd.service").string()});
    EXPECT_NE(unit.output.find("ExecStart=/usr/sbin/veltd --module /usr/"), std::string::npos) << unit.output;
}

} // namespace
} // namespace velt::test
