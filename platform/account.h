// The user and group library.
//
// Threads: every operation may be called from any thread.
#ifndef VELT_PLATFORM_ACCOUNT_H
#define VELT_PLATFORM_ACCOUNT_H

#include <assert.h>
#include <stddef.h>

#ifdef __cplusplus
extern "C" {
#endif

/// A user. What follows the public fields is the platform's.
typedef struct VELT_USER {
    const char* name;
    const char* description;
    int uid;
} VELT_USER;

static_assert(offsetof(VELT_USER, name) == 0, "name comes first");
static_assert(offsetof(VELT_USER, description) == sizeof(const char*), "description is second");
static_assert(offsetof(VELT_USER, uid) == 2 * sizeof(const char*), "uid is third");
static_assert(sizeof(VELT_USER) == 3 * sizeof(const char*), "a user is two texts and an int, padded");

/// A group. What follows the public fields is the platform's.
typedef struct VELT_GROUP {
    const char* name;
    int gid;
} VELT_GROUP;

static_assert(offsetof(VELT_GROUP, name) == 0, "name comes first");
static_assert(offsetof(VELT_GROUP, gid) == sizeof(const char*), "gid is second");
static_assert(sizeof(VELT_GROUP) == 2 * sizeof(const char*), "a group is a text and an int, padded");

/// Looks a user up by name. `*out` is null or what an earlier look-up left there; on success it is a
/// record that the platform owns: it may reuse the one handed in, and callers release none. Negative
/// when there is no such user or on failure.
int VELTUserGet(const char* name, VELT_USER** out);

/// The same for a group.
int VELTGroupGet(const char* name, VELT_GROUP** out);

#ifdef __cplusplus
}
#endif

#endif
