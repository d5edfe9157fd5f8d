#include "standalone/login/own_names.h"

#include <ctype.h>
#include <string.h>
#include <strings.h>

#define SMALL_LETTERS "abcdefghijklmnopqrstuvwxyz"

static const char small_letters[] = SMALL_LETTERS;
static const char letters_and_digits[] = SMALL_LETTERS "ABCDEFGHIJKLMNOPQRSTUVWXYZ0123456789";

const char* const velt_own_names[] = {
    /* who may log in */
    ".ssh",
    ".lsh",
    ".rhosts",
    ".shosts",
    ".klogin",
    ".k5login",
    ".k5users",
    ".eid",
    ".monkeysphere",
    ".google_authenticator",
    ".yubico",
    ".otpw",
    ".pamusb",
    /* what logins and their services start or mount */
    ".pam_environment",
    ".pam_mount.conf.xml",
    ".ecryptfs",
    ".config",
    ".local",
    ".byobu",
    ".gnupg",
    ".keychain",
    ".pulse",
    ".asoundrc",
    /* what mail starts */
    ".forward*",
    ".procmail",
    ".procmailrc",
    ".mailfilter*",
    ".mailfilters",
    ".maildelivery",
    ".mailrc",
    ".msmtprc",
    ".qmail*",
    ".courier*",
    ".dovecot*",
    ".dovecot.sieve",
    /* what shells read; zsh prefers a compiled file beside one that it sources */
    ".profile",
    ".profile.zwc",
    ".shrc",
    ".bashrc*",
    ".bash_profile*",
    ".bash_login*",
    ".bash_logout*",
    ".bash_aliases*",
    ".bash_completion*",
    ".login",
    ".logout",
    ".cshrc",
    ".cshdirs",
    ".tcshrc",
    ".kshrc*",
    ".mkshrc*",
    ".zshrc*",
    ".zshenv*",
    ".zprofile*",
    ".zlogin*",
    ".zlogout*",
    ".zcompdump*",
    ".yashrc",
    ".yash_profile",
    ".rcrc",
    ".esrc",
    ".aliasrc",
    ".xonshrc",
    ".inputrc",
    ".lessfilter",
    /* where shells look for programs first */
    "bin",
    /* what gives or extends a login that serves repositories alone */
    "git-shell-commands",
    ".gitconfig",
    ".gitolite*",
    ".hgrc",
    ".bazaar",
    /* what desktops start */
    ".vnc",
    ".xpra",
    "startwm.sh",
    "GNUstep",
    ".xprofile",
    ".xsession",
    ".xsessionrc",
    ".xinitrc",
    ".xserverrc",
    ".xinputrc",
    ".xbindkeysrc*",
    ".gnomerc",
    NULL,
};

/* Names that begin with a dot, and that no program obeys when somebody logs in: what clients and file
 * managers make, and what web servers read of the site that a home may hold. A star stands for the rest of a
 * name. */
static const char* const harmless_names[] = {
    ".in.*",         "._*",         ".DS_Store", ".AppleDouble", ".TemporaryItems", ".Trash*",
    ".fuse_hidden*", ".nfs*",       ".~lock.*",  ".directory",   ".hidden",         ".htaccess",
    ".htpasswd",     ".well-known", ".user.ini", NULL,
};

/* What clients have a file end with while they send it. */
static const char* const temporary_ends[] = {".part", ".partial", ".filepart", ".tmp", ".temp", ".swp", NULL};

/* Some file systems know no difference between small and capital letters. A home may hold very many names;
 * most of those here differ from one in the second letter, before which none has a star. */
static int is_in(const char* const* names, const char* name) {
    for (; *names != NULL; names++) {
        if (name[0] == '\0' || tolower((unsigned char)(*names)[1]) != tolower((unsigned char)name[1])) {
            continue;
        }
        size_t length = strcspn(*names, "*");
        if (strncasecmp(*names, name, length) == 0 && ((*names)[length] == '*' || name[length] == '\0')) {
            return 1;
        }
    }
    return 0;
}

/* ".letter.txt.part", or as rsync has it ".letter.txt.Ab12Cd": six small letters are a word,
 * ".profile.custom". */
static int is_temporary(const char* name) {
    const char* end = strrchr(name, '.');

    if (end == name) {
        return 0;
    }
    for (const char* const* each = temporary_ends; *each != NULL; each++) {
        if (strcasecmp(end, *each) == 0) {
            return 1;
        }
    }
    size_t length = strlen(end + 1);
    return length == 6 && strspn(end + 1, letters_and_digits) == length &&
           strspn(end + 1, small_letters) < length;
}

int velt_is_listed_own_name(const char* name) {
    return is_in(velt_own_names, name);
}

int velt_is_own_name(const char* name) {
    if (velt_is_listed_own_name(name)) {
        return 1;
    }
    if (name[0] != '.' || name[1] == '\0' || strcmp(name, "..") == 0) {
        return 0;
    }
    return !is_in(harmless_names, name) && !is_temporary(name);
}
