/* Which places a session may read and not change: the files of a user's home that programs obey, such as
 * .ssh/authorized_keys or .profile. Who may use FTP and nothing else would get a shell by writing them. */
#ifndef VELT_STANDALONE_LOGIN_OWN_FILES_H
#define VELT_STANDALONE_LOGIN_OWN_FILES_H

/* Keeps such files of this home, and the home itself, as they are; where the home does not exist, it is not
 * made either. Called before the root directory changes, with the right to look everywhere. 0, or -1 with
 * errno; E2BIG when there is too much of it, as velt_crowded_place of own_places.h tells. */
int velt_keep_home(const char* path);

/* Keeps the files of what stands at the homes' paths by now: a home may have been made or exchanged since.
 * Needs no more rights than the user has. 0, or -1 with errno; then nothing may be changed. */
int velt_look_at_homes(void);

/* Forgets the homes of an earlier login. */
void velt_forget_homes(void);

/* From the change of the root directory on, its folders "etc" and "lib" are kept as well: the daemon's
 * libraries look there. */
void velt_keep_root(void);

enum velt_change {
    velt_changes_content, /* of the file or folder, its mode or times; a symbolic link stands for its target
                           */
    velt_changes_name,    /* makes, moves or removes it */
};

/* Whether the session may make this change to folder/name. 0, or -1 with errno: EACCES where it may not. */
int velt_may_change(int folder, const char* name, enum velt_change change);

#endif
