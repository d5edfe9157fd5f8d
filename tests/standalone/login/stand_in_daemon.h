/* Lets the FTP daemon's module decide on a login, with a stand-in for the daemon around it. */
#ifndef VELT_TESTS_STANDALONE_LOGIN_STAND_IN_DAEMON_H
#define VELT_TESTS_STANDALONE_LOGIN_STAND_IN_DAEMON_H

struct login_world {
    const char* program;    /* "": no VeltLoginView in the configuration */
    const char* state_root; /* handed to the program */
    int knows_user;
    int knows_groups;
    int code; /* what the daemon says of the password; negative: wrong */
    const char* home;
};

enum login_end {
    login_granted,
    login_wrong,        /* as a wrong password */
    login_disconnected, /* at the change of the root directory */
};

/* Sessions come from this IPv4 address from now on, and the list of sessions has this name; `spared` is a
 * network in the configuration, or NULL. Without an address, as at first, nobody is counted. */
void connect_from(const char* address, const char* scoreboard, const char* spared);

/* Whether a session is ended with 421 as soon as it begins. */
int is_sent_away(const struct login_world* world);

/* How the login of "alice" (1001, groups 1001 and 2001) ends. */
enum login_end log_in(const struct login_world* world);

/* How it ends when the root directory changes although nobody was told of a password. */
enum login_end change_root_unasked(const struct login_world* world);

/* What a session's command to change a mode comes to, after a login. 0, or -1 with errno. */
int change_mode_as_the_daemon(const char* path, unsigned mode);
int change_mode_of_open_file_as_the_daemon(const char* path, int descriptor, unsigned mode);

/* What the daemon's functions for files come to, after a login. As the system calls of these names; the last
 * one tries both kinds of links, and gives the sum. */
int open_as_the_daemon(const char* path, int flags);
int cut_as_the_daemon(const char* path, long length);
int move_as_the_daemon(const char* from, const char* to);
int link_as_the_daemon(const char* target, const char* path);

/* What the module wrote to the log in the last call; "" when nothing. */
const char* logged(void);

/* How often root's rights were taken in the last call and not given back. */
int rights_taken(void);

#endif
