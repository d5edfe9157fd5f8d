// The share library.
//
// Threads: every operation may be called from any thread; a share belongs to the thread that looked it up.
#ifndef VELT_PLATFORM_SHARE_H
#define VELT_PLATFORM_SHARE_H

#include <assert.h>
#include <stddef.h>
#include <stdint.h>

#ifdef __cplusplus
extern "C" {
#endif

/// A share. What follows the public fields is the platform's.
typedef struct VELT_SHARE {
    const char* name;
    const char* comment;
    const char* path; ///< the share's folder, absolute
} VELT_SHARE;

static_assert(sizeof(VELT_SHARE) == 3 * sizeof(const char*), "a share starts with three texts");
static_assert(offsetof(VELT_SHARE, name) == 0, "name comes first");
static_assert(offsetof(VELT_SHARE, comment) == sizeof(const char*), "comment is second");
static_assert(offsetof(VELT_SHARE, path) == 2 * sizeof(const char*), "path is third");

/// An account's privilege on a share.
typedef struct VELT_SHARE_PRIV {
    int32_t reserved[2];
    int32_t effective; ///< 0 and 4: the account cannot reach the share; any other code: it can
} VELT_SHARE_PRIV;

static_assert(sizeof(VELT_SHARE_PRIV) == 12, "a privilege is three int32");
static_assert(offsetof(VELT_SHARE_PRIV, reserved) == 0, "two words come first");
static_assert(offsetof(VELT_SHARE_PRIV, effective) == 8, "the effective code is the third int32");

/// Looks a share up by name. On success `*out` is a share that the caller frees with VELTShareFree.
/// Negative when there is no such share or on failure; `*out` is then unchanged, or a share that the
/// caller frees all the same.
int VELTShareGet(const char* name, VELT_SHARE** out);

/// Fills `*out` with the privilege of the local user or group `account` on the share. Negative on
/// failure.
int VELTShareUGPrivGetLocal(const char* account, VELT_SHARE* share, VELT_SHARE_PRIV* out);

/// Frees a share. Null is allowed.
void VELTShareFree(VELT_SHARE* share);

#ifdef __cplusplus
}
#endif

#endif
