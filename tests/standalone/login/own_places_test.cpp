// What is kept behind the links of a home.
#include "tests/standalone/login/kept_home.h"

namespace velt::test {
namespace {
namespace fs = std::filesystem;

class OwnPlaces : public KeptHome {};

TEST_F(OwnPlaces, areKnownBehindLinks) {
    fs::create_directories(home() / "dots/ssh");
    folder_.write("home/dots/rc", "");
    fs::create_symlink(home() / "dots/rc", home() / ".bashrc");
    fs::create_directory_symlink("way/ssh", home() / ".ssh");
    fs::create_directory_symlink("dots", home() / "way");
    fs::create_hard_link(home() / "dots/rc", home() / "twin");
    fs::create_symlink(".profile", home() / "start");
    fs::create_symlink("turn", home() / "turn");
    keep();
    for (const char* kept :
         {"dots/rc", "way/rc", "twin", "start", "dots/ssh/keys", "way/ssh/keys", "dots/ssh"}) {
        EXPECT_EQ(content(kept), "kept") << kept;
    }
    for (const char* kept : {"dots", "way", "dots/ssh", "."}) {
        EXPECT_EQ(name(kept), "kept") << kept;
    }
    EXPECT_EQ(name("start"), "") << "the link is no such file";
    EXPECT_EQ(content("dots/file"), "");
    EXPECT_EQ(content("dots"), "") << "its mode";
    EXPECT_EQ(content("turn"), std::to_string(ELOOP));
}

// As programs lay them that keep all such files in one folder.
TEST_F(OwnPlaces, areKnownBehindLinksWithinTheirFolders) {
    fs::create_directories(home() / "dots/systemd/user");
    fs::create_directories(home() / ".ssh");
    fs::create_directories(home() / ".config/a/b/c");
    folder_.write("home/dots/authorized_keys", "");
    folder_.write("home/dots/deep", "");
    folder_.write("home/dots/zwc", "");
    fs::create_symlink("../dots/authorized_keys", home() / ".ssh/authorized_keys");
    fs::create_directory_symlink("../dots/systemd", home() / ".config/systemd");
    fs::create_symlink(home() / "dots/deep", home() / ".config/a/b/c/deep");
    fs::create_symlink("dots/zwc", home() / ".zshrc.zwc");
    fs::create_directory_symlink("dots/elvish", home() / ".elvish");
    keep();
    for (const char* kept : {"dots/authorized_keys", ".ssh/authorized_keys", "dots/systemd/user/x.service",
                             ".config/systemd/user/x.service", "dots/deep", "dots/zwc", "dots/elvish"}) {
        EXPECT_EQ(content(kept), "kept") << kept;
        EXPECT_EQ(name(kept), "kept") << kept;
    }
    EXPECT_EQ(content("dots/free"), "");
    EXPECT_EQ(name("dots"), "kept");
}

TEST_F(OwnPlaces, areKnownBehindLinksThatLeadNowhereYet) {
    fs::create_directories(home() / "dots");
    fs::create_directories(home() / ".ssh");
    fs::create_symlink("dots/absent", home() / ".bash_aliases");
    fs::create_symlink("../dots/keys", home() / ".ssh/authorized_keys");
    keep();
    for (const char* kept : {"dots/absent", "dots/ABSENT", "dots/keys"}) {
        EXPECT_EQ(content(kept), "kept") << kept;
        EXPECT_EQ(name(kept), "kept") << kept;
    }
    EXPECT_EQ(name("dots/other"), "");
}

TEST_F(OwnPlaces, areKnownBehindLinksOfLinksWithinTheirFolders) {
    for (const char* made : {".config/a/b/c", "dots/up", "dots/down", "dots/deep/x", "dots/deep/other"}) {
        fs::create_directories(home() / made);
    }
    fs::create_directory_symlink("../dots/up", home() / ".config/b");
    fs::create_symlink("../b/file", home() / ".config/a/file");
    fs::create_symlink("b/c/d/e/file", home() / ".config/a/far");
    fs::create_directory_symlink("../../../../dots/down", home() / ".config/a/b/c/d");
    fs::create_directory_symlink("../dots/deep/x", home() / ".config/linked");
    fs::create_symlink("../other/file", home() / "dots/deep/x/up");
    keep();
    for (const char* kept : {"dots/up/file", "dots/down/e", "dots/up", "dots/down", "dots/deep/other/file"}) {
        EXPECT_EQ(content(kept), "kept") << kept;
    }
    EXPECT_EQ(content("dots/deep/other/free"), "");
}

TEST_F(OwnPlaces, areKeptWhenTheyAreReplaced) {
    for (const char* made : {"dots/keys", "dots/real", "dots/deep/x", ".config", ".ssh"}) {
        fs::create_directories(home() / made);
    }
    folder_.write("home/dots/rc", "");
    fs::create_symlink("dots/rc", home() / ".bashrc");
    fs::create_directory_symlink("../way", home() / ".config/app");
    fs::create_directory_symlink("dots/real", home() / "way");
    fs::create_directory_symlink("dots/deep/x", home() / ".vnc");
    keep();
    folder_.write("home/dots/new", "");
    fs::create_hard_link(home() / "dots/rc", home() / "dots/old"); // or a folder could get its number
    fs::rename(home() / "dots/new", home() / "dots/rc");
    fs::rename(home() / "dots/real", home() / "dots/former");
    fs::create_directories(home() / "dots/real/below");
    for (const char* kept : {"dots/rc", "dots/RC", "dots/real", "dots/real/below/file", "way/file"}) {
        EXPECT_EQ(content(kept), "kept") << kept;
        EXPECT_EQ(name(kept), "kept") << kept;
    }
    EXPECT_EQ(content("dots"), "") << "its mode";
    EXPECT_EQ(content("dots/free"), "");
    fs::rename(home() / "dots/deep", home() / "dots/away");
    EXPECT_EQ(content("dots/deep"), "kept") << "no file is made where a folder was";
    EXPECT_EQ(name("dots/deep"), "kept");
    fs::remove(home() / "way");
    EXPECT_EQ(content("way"), "kept") << "no file is made where a link was";
    EXPECT_EQ(name("way"), "kept");
    fs::create_directories(home() / "way/below");
    EXPECT_EQ(name("way/below/file"), "kept");
    EXPECT_EQ(content("way/below/file"), "kept");
    fs::rename(home() / "dots", folder_.path() / "former");
    EXPECT_EQ(content("dots"), "kept");
    fs::create_directories(folder_.path() / "prepared");
    fs::rename(folder_.path() / "prepared", home() / "dots");
    EXPECT_EQ(content("dots/rc"), "kept") << "as many folders as before";
}

TEST_F(OwnPlaces, doNotCloseTheHomeByALinkToAllOfIt) {
    fs::create_directories(home() / ".config");
    fs::create_directory_symlink(home(), home() / ".config/home");
    fs::create_directory_symlink("/", home() / ".local");
    fs::create_directory_symlink(".", home() / ".all");
    fs::create_directories(folder_.path() / "data");
    fs::create_directory_symlink(folder_.path() / "data", home() / ".data");
    keep();
    EXPECT_EQ(name("free"), "");
    EXPECT_EQ(refusal(folder_.path() / "data/free", velt_changes_name), "") << "nobody is known to obey it";
    EXPECT_EQ(name(".data"), "kept");
}

} // namespace
} // namespace velt::test
