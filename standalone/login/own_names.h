/* What in a home may be obeyed by programs: logins, mail, shells, services of a session. */
#ifndef VELT_STANDALONE_LOGIN_OWN_NAMES_H
#define VELT_STANDALONE_LOGIN_OWN_NAMES_H

/* Names that are known to be obeyed. A star stands for the rest of a name. NULL is the last. */
extern const char* const velt_own_names[];

int velt_is_listed_own_name(const char* name);

/* Whether programs may obey a file or folder of this name that lies directly in a home: the names above, and
 * each one that begins with a dot, since no list of programs is whole; but for those that are known to be
 * harmless, and those that clients give a file while they send it. In any case: some file systems know no
 * difference. */
int velt_is_own_name(const char* name);

#endif
