/* Asks the FTP daemon's module for the root directory of a login, with a stand-in for the daemon around it.
 * */
#ifndef VELT_TESTS_STANDALONE_CHROOT_LOGIN_ROOT_H
#define VELT_TESTS_STANDALONE_CHROOT_LOGIN_ROOT_H

/* What the daemon would answer the module. The account is uid 1001, gid 1001, of the group 2001 besides. */
struct login_world {
    const char* rules_file;
    const char* share_map;
    int knows_user;
    int knows_groups; /* else the look-up of the groups fails */
};

/* The DefaultRoot that holds for the login then; "" for none. Valid until the next call. */
const char* root_of(const struct login_world* world);

#endif
