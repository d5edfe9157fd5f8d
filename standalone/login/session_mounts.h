/* Whether sessions can be given mounts of their own. */
#ifndef VELT_STANDALONE_LOGIN_SESSION_MOUNTS_H
#define VELT_STANDALONE_LOGIN_SESSION_MOUNTS_H

#ifdef __cplusplus
extern "C" {
#endif

/* Tries it in a child of this process, which needs root's rights for it. 0 when that works, else the errno of
 * what failed. */
int velt_try_session_mounts(void);

#ifdef __cplusplus
}
#endif

#endif
