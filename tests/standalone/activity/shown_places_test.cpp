// From a path in a session to the file on the server.
#include "standalone/activity/shown_places.h"

#include "base/file.h"
#include "base/unique_fd.h"
#include "tests/support/temporary_folder.h"

#include <fcntl.h>
#include <gtest/gtest.h>

#include <string>
#include <vector>

namespace velt {
namespace {

class ShownPlaces : public testing::Test {
protected:
    void TearDown() override { velt_note_shown_places(-1); }

    void know(const std::vector<std::string>& texts) {
        std::string all;
        for (const std::string& text : texts) {
            all += text + '\0';
        }
        const UniqueFd file(::open(folder_.write("facts", all).c_str(), O_RDONLY | O_CLOEXEC));
        velt_note_shown_places(file.get());
    }

    /// "SERVER PATH [SHARE] PATH IN IT"
    static std::string find(const std::string& path) {
        velt_shown_place place{};
        velt_find_shown_place(path.c_str(), &place);
        return std::string(place.server_path) + " [" + place.share + "] " + place.share_path;
    }

private:
    test::TemporaryFolder folder_;
};

TEST_F(ShownPlaces, OfAHome) {
    know({"view", "/", "/home/anna"});
    EXPECT_EQ(find("/"), "/home/anna [] ");
    EXPECT_EQ(find("/a/b"), "/home/anna/a/b [] ");
}

TEST_F(ShownPlaces, OfSharesSideBySide) {
    know({"view", "/music", "/srv/m", "view", "/mus", "/srv/other", "share", "music", "/srv/m", "share",
          "mus", "/srv/other"});
    EXPECT_EQ(find("/music/x"), "/srv/m/x [music] x");
    EXPECT_EQ(find("/mus/x"), "/srv/other/x [mus] x");
    EXPECT_EQ(find("/musical"), " [] ");
    EXPECT_EQ(find("/"), " [] ");
    EXPECT_EQ(find("/music"), "/srv/m [music] ");
}

TEST_F(ShownPlaces, OfTheInnermostShare) {
    know({"view", "/", "/srv/all/anna", "share", "all", "/srv/all", "share", "inner", "/srv/all/anna/inner"});
    EXPECT_EQ(find("/x"), "/srv/all/anna/x [all] anna/x");
    EXPECT_EQ(find("/inner/x"), "/srv/all/anna/inner/x [inner] x");
    EXPECT_EQ(find("/innermost"), "/srv/all/anna/innermost [all] anna/innermost");
}

TEST_F(ShownPlaces, OfTheWholeServer) {
    know({"view", "/", "/", "share", "all", "/srv"});
    EXPECT_EQ(find("/srv/x"), "/srv/x [all] x");
    EXPECT_EQ(find("/etc"), "/etc [] ");
}

TEST_F(ShownPlaces, AreTheServersOwnWithoutAnyFacts) {
    velt_note_shown_places(-1);
    EXPECT_EQ(find("/srv/x"), "/srv/x [] ");
    EXPECT_EQ(find(""), " [] ");
}

TEST_F(ShownPlaces, LeaveOutWhatWasCut) {
    know({"view", "/", "/home/anna", "share", "all"});
    EXPECT_EQ(find("/x"), "/home/anna/x [] ");
}

TEST_F(ShownPlaces, SayNothingOfAPathThatWouldBeTooLong) {
    know({"view", "/", "/home/anna"});
    EXPECT_EQ(find("/" + std::string(4090, 'x')), " [] ");
}

} // namespace
} // namespace velt
