// Tests of what a session may not change.
#ifndef VELT_TESTS_STANDALONE_LOGIN_KEPT_HOME_H
#define VELT_TESTS_STANDALONE_LOGIN_KEPT_HOME_H

#include "tests/support/temporary_folder.h"

#include <gtest/gtest.h>

extern "C" {
#include "standalone/login/own_files.h"
#include "standalone/login/place.h"
}

#include <cerrno>
#include <filesystem>
#include <string>
#include <vector>

namespace velt::test {

/// A home whose files are kept, as for a session.
class KeptHome : public testing::Test {
protected:
    void TearDown() override { velt_forget_homes(); }

    std::filesystem::path home() const { return folder_.path() / "home"; }
    void keep() {
        std::filesystem::create_directories(home());
        ASSERT_EQ(velt_keep_home(home().c_str()), 0);
    }
    /// "" where the change is allowed.
    static std::string refusal(const std::filesystem::path& path, velt_change change) {
        velt_place place{};
        if (velt_open_place(&place, path.c_str(), change) < 0) {
            return errno == EACCES ? "kept" : std::to_string(errno);
        }
        velt_close_place(&place);
        return "";
    }
    std::string content(const std::filesystem::path& path) {
        return refusal(home() / path, velt_changes_content);
    }
    std::string name(const std::filesystem::path& path) { return refusal(home() / path, velt_changes_name); }

    TemporaryFolder folder_;
};

} // namespace velt::test

#endif
