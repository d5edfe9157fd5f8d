// Which places a session may not change.
#include "tests/standalone/login/kept_home.h"

#include <climits>
#include <string>
#include <vector>

namespace velt::test {
namespace {
namespace fs = std::filesystem;

class OwnFiles : public KeptHome {};

TEST_F(OwnFiles, areKnownByName) {
    keep();
    for (const char* kept : {".ssh", ".profile", ".Profile", ".qmail", ".qmail-x", ".forward", ".forwarder",
                             ".yubico", ".dovecot.sieve", ".lessfilter", ".vnc", ".yashrc"}) {
        EXPECT_EQ(content(kept), "kept") << kept;
        EXPECT_EQ(name(kept), "kept") << kept;
    }
    for (const char* free : {"ssh", ".", "profile", "binary", "x.forward", "startwm", "bin2"}) {
        EXPECT_EQ(content(free), "") << free;
    }
    EXPECT_EQ(refusal(folder_.path() / ".profile", velt_changes_name), "") << "no home";
}

// No list of programs is whole.
TEST_F(OwnFiles, areAllThatBeginWithADot) {
    keep();
    for (const char* kept :
         {".selected_editor", ".tmux.conf", ".vimrc", ".fetchmailrc", ".muttrc", ".x", "...", ".env", ".part",
          ".Ab12Cd", ".bashrc.tmp", ".zshrc.Ab12Cd", ".ssh.", ".letter.Ab12C", ".letter.Ab12Cde",
          ".letter.Ab_2Cd", ".profile.custom", ".vimrc.before"}) {
        EXPECT_EQ(content(kept), "kept") << kept;
        EXPECT_EQ(name(kept), "kept") << kept;
    }
    for (const char* free :
         {"._letter", ".DS_Store", ".Trash-1000", ".in.letter.", ".htaccess", ".well-known", ".~lock.letter#",
          ".letter.txt.part", ".letter.FILEPART", ".letter.txt.Ab12Cd", ".letter.txt.abcdeF",
          ".letter.txt.1bcdef", ".letter.tmp", ".fuse_hidden00001"}) {
        EXPECT_EQ(content(free), "") << free;
        EXPECT_EQ(name(free), "") << free;
    }
    fs::create_directories(home() / "other");
    EXPECT_EQ(name("other/.selected_editor"), "") << "only the home's own";
}

TEST_F(OwnFiles, areWhatLiesInFoldersThatBeginWithADot) {
    fs::create_directories(home() / ".elvish/lib");
    fs::create_directories(home() / ".well-known/x");
    keep();
    fs::create_directories(home() / ".fizsh/deep");
    for (const char* kept : {".elvish/rc.elv", ".elvish/lib/x", ".fizsh/.zshrc", ".fizsh/deep/x"}) {
        EXPECT_EQ(content(kept), "kept") << kept << ", also where the folder was made after the login";
        EXPECT_EQ(name(kept), "kept") << kept;
    }
    EXPECT_EQ(content(".well-known/x/y"), "");
}

struct Family {
    const char* obeyedBy;
    std::vector<std::string> names;
};

const std::vector<Family> families = {
    {"logins by key or host", {".ssh", ".lsh", ".rhosts", ".shosts", ".klogin", ".k5login", ".k5users"}},
    {"PAM",
     {".eid", ".monkeysphere", ".google_authenticator", ".yubico", ".otpw", ".pamusb", ".pam_environment",
      ".pam_mount.conf.xml", ".ecryptfs"}},
    {"services of a login", {".config", ".local", ".byobu", ".gnupg", ".keychain", ".pulse", ".asoundrc"}},
    {"mail",
     {".forward", ".forward+list", ".procmail", ".procmailrc", ".mailfilter", ".mailfilters", ".maildelivery",
      ".mailrc", ".msmtprc", ".qmail", ".qmail-list", ".courier", ".courier-list", ".dovecot.sieve",
      ".dovecot.svbin"}},
    {"sh and bash",
     {".profile", ".profile.zwc", ".shrc", ".bashrc", ".bash_profile", ".bash_login", ".bash_logout",
      ".bash_aliases", ".bash_aliases.zwc", ".bash_completion", ".inputrc"}},
    {"csh", {".login", ".logout", ".cshrc", ".cshdirs", ".tcshrc"}},
    {"ksh", {".kshrc", ".kshrc.zwc", ".mkshrc"}},
    {"zsh",
     {".zshenv", ".zprofile", ".zshrc", ".zlogin", ".zlogout", ".zshenv.zwc", ".zprofile.zwc", ".zshrc.zwc",
      ".zlogin.zwc", ".zlogout.zwc", ".ZSHENV.ZWC", ".zshrc.local", ".zcompdump", ".zcompdump-host-5.9.zwc"}},
    {"other shells", {".yashrc", ".yash_profile", ".rcrc", ".esrc", ".aliasrc", ".xonshrc", ".lessfilter"}},
    {"search for programs", {"bin"}},
    {"repositories", {"git-shell-commands", ".gitconfig", ".gitolite", ".gitolite.rc", ".hgrc", ".bazaar"}},
    {"desktops",
     {".vnc", ".xpra", "startwm.sh", ".xprofile", ".xsession", ".Xsession", ".xsessionrc", ".xinitrc",
      ".xserverrc", ".xinputrc", ".xbindkeysrc", ".xbindkeysrc.scm", ".gnomerc", "GNUstep"}},
};

TEST_F(OwnFiles, areThoseThatProgramsObey) {
    keep();
    for (const Family& family : families) {
        for (const std::string& kept : family.names) {
            EXPECT_EQ(content(kept), "kept") << family.obeyedBy << ": upload to " << kept;
            EXPECT_EQ(name(kept), "kept") << family.obeyedBy << ": new folder or name " << kept;
        }
    }
}

TEST_F(OwnFiles, areFoldersOfThatKindToo) {
    keep();
    for (const std::string folder : {".ssh",
                                     ".lsh",
                                     ".eid",
                                     ".monkeysphere",
                                     ".pamusb",
                                     ".ecryptfs",
                                     ".config",
                                     ".local",
                                     ".byobu",
                                     ".gnupg",
                                     ".keychain",
                                     ".pulse",
                                     ".procmail",
                                     ".mailfilters",
                                     ".bash_completion",
                                     "bin",
                                     "git-shell-commands",
                                     ".gitolite",
                                     ".bazaar",
                                     ".vnc",
                                     ".xpra"}) {
        fs::create_directory(home() / folder);
        EXPECT_EQ(content(folder + "/file"), "kept") << folder;
        EXPECT_EQ(name(folder + "/file"), "kept") << folder;
    }
}

TEST_F(OwnFiles, includeWhatLiesInThem) {
    keep();
    fs::create_directories(home() / ".config/deep/below");
    fs::create_directories(home() / "other/.config");
    EXPECT_EQ(content(".config/deep/below/file"), "kept") << "made after the login";
    EXPECT_EQ(name("other/../.config/file"), "kept");
    EXPECT_EQ(content("other/.config/file"), "");
    EXPECT_EQ(content("other/absent/file"), std::to_string(ENOENT));
}

TEST_F(OwnFiles, areThoseOfALinkedHome) {
    fs::create_directories(folder_.path() / "real/alice");
    fs::create_directory_symlink("real", folder_.path() / "homes");
    ASSERT_EQ(velt_keep_home((folder_.path() / "homes/alice").c_str()), 0);
    EXPECT_EQ(refusal(folder_.path() / "real/alice/.bashrc", velt_changes_content), "kept");
    for (const char* way : {"real", "homes", "real/alice"}) {
        EXPECT_EQ(refusal(folder_.path() / way, velt_changes_name), "kept") << way;
    }
}

TEST_F(OwnFiles, areNoneWithoutAHome) {
    EXPECT_EQ(velt_keep_home((folder_.path() / "absent").c_str()), 0);
    EXPECT_EQ(velt_keep_home((folder_.write("file", "") / "below").c_str()), 0);
    EXPECT_EQ(refusal(folder_.path() / ".profile", velt_changes_name), "");
    velt_forget_homes();
    fs::create_directory_symlink("turn", folder_.path() / "turn");
    EXPECT_EQ(velt_keep_home((folder_.path() / "turn").c_str()), -1);
    velt_forget_homes();
    EXPECT_EQ(velt_keep_home(std::string(PATH_MAX, 'x').c_str()), -1);
}

TEST_F(OwnFiles, needAHomeThatASessionDoesNotMake) {
    ASSERT_EQ(velt_keep_home((folder_.path() / "homes/alice").c_str()), 0);
    for (const char* missing : {"homes", "HOMES"}) {
        EXPECT_EQ(refusal(folder_.path() / missing, velt_changes_name), "kept") << missing;
        EXPECT_EQ(refusal(folder_.path() / missing, velt_changes_content), "kept") << missing;
    }
    EXPECT_EQ(refusal(folder_.path() / "other", velt_changes_name), "");
    fs::create_directory(folder_.path() / "homes");
    EXPECT_EQ(refusal(folder_.path() / "homes", velt_changes_name), "kept") << "on the way to the home";
    EXPECT_EQ(refusal(folder_.path() / "homes/alice", velt_changes_name), "kept");
    EXPECT_EQ(refusal(folder_.path() / "homes/bob", velt_changes_name), "");
    EXPECT_EQ(refusal(folder_.path() / "alice", velt_changes_name), "");
    fs::create_directory(folder_.path() / "homes/alice");
    EXPECT_EQ(refusal(folder_.path() / "homes/alice", velt_changes_name), "kept");
    EXPECT_EQ(refusal(folder_.path() / "homes/alice/.ssh", velt_changes_name), "kept");
    EXPECT_EQ(refusal(folder_.path() / "homes/alice/free", velt_changes_name), "");
}

TEST_F(OwnFiles, needAHomeBehindALinkThatLeadsNowhere) {
    fs::create_directory_symlink("elsewhere/alice", folder_.path() / "home");
    ASSERT_EQ(velt_keep_home(home().c_str()), 0);
    EXPECT_EQ(refusal(home(), velt_changes_name), "kept");
    EXPECT_EQ(refusal(folder_.path() / "elsewhere", velt_changes_name), "kept");
    fs::create_directory(folder_.path() / "elsewhere");
    EXPECT_EQ(refusal(folder_.path() / "elsewhere/alice", velt_changes_name), "kept");
    EXPECT_EQ(refusal(folder_.path() / "elsewhere/bob", velt_changes_name), "");
}

TEST_F(OwnFiles, needAHomeInPlaceOfAFile) {
    ASSERT_EQ(velt_keep_home((folder_.write("file", "") / "below").c_str()), 0);
    EXPECT_EQ(refusal(folder_.path() / "file", velt_changes_name), "kept");
}

TEST_F(OwnFiles, areThoseOfTheHomeThatStandsThereNow) {
    fs::create_directories(home() / "dots");
    keep();
    fs::rename(home(), folder_.path() / "former");
    EXPECT_EQ(name("."), std::to_string(ENOENT));
    EXPECT_EQ(refusal(home(), velt_changes_name), "kept") << "it is not made anew";
    fs::create_directories(home() / "keys");
    fs::create_directory_symlink("keys", home() / ".ssh");
    for (const char* kept : {".ssh/authorized_keys", "keys/authorized_keys", ".profile", ".Bashrc"}) {
        EXPECT_EQ(content(kept), "kept") << kept;
        EXPECT_EQ(name(kept), "kept") << kept;
    }
    EXPECT_EQ(name("."), "kept");
    EXPECT_EQ(content("free"), "");
    EXPECT_EQ(refusal(folder_.path() / "former/.profile", velt_changes_name), "") << "no home any more";
    EXPECT_EQ(refusal(folder_.path() / "former", velt_changes_name), "");
}

TEST_F(OwnFiles, cannotBeToldWhereTheHomeCannotBeFound) {
    keep();
    fs::remove(home());
    fs::create_directory_symlink("home", home());
    EXPECT_EQ(refusal(folder_.path() / "free", velt_changes_name), std::to_string(ELOOP));
    fs::remove(home());
    EXPECT_EQ(refusal(folder_.path() / "free", velt_changes_name), "");
}

TEST_F(OwnFiles, areForgottenWithTheLogin) {
    keep();
    velt_forget_homes();
    EXPECT_EQ(content(".profile"), "");
    EXPECT_EQ(name("."), "");
}

} // namespace
} // namespace velt::test
