/* Setting the mode of what stands at a name, and of nothing that a link there leads to. */
#ifndef VELT_STANDALONE_LOGIN_NAME_MODE_H
#define VELT_STANDALONE_LOGIN_NAME_MODE_H

#include <sys/types.h>

#ifdef __cplusplus
extern "C" {
#endif

/* 0, or -1 with errno: EOPNOTSUPP or ELOOP for a symbolic link, else as of fchmodat(2). */
int velt_set_mode_at(int folder, const char* name, mode_t mode);

/* The same for kernels before 6.6, which have no fchmodat2(2). It opens what it sets: what its owner may
 * neither read nor write is refused with EACCES. */
int velt_set_mode_by_opening(int folder, const char* name, mode_t mode);

#ifdef __cplusplus
}
#endif

#endif
