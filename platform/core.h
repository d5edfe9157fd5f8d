// The core library: string lists, string maps, key-value files, and the last error.
//
// Threads: a list or map belongs to one thread at a time. The last error is kept per thread.
#ifndef VELT_PLATFORM_CORE_H
#define VELT_PLATFORM_CORE_H

#include <assert.h>
#include <stddef.h>

#ifdef __cplusplus
extern "C" {
#endif

/// A growable list of texts. Only this header is public; the platform keeps the texts behind it.
typedef struct VLIBCSzList {
    int capacity; ///< entries that fit before the list must grow
    int count;    ///< entries in the list; callers read it directly
    int reserved;
    int flags; ///< the platform's; chroot-user lists are handed over with 16
} VLIBCSzList;

static_assert(sizeof(VLIBCSzList) == 16, "the list header is four ints");
static_assert(offsetof(VLIBCSzList, capacity) == 0, "capacity comes first");
static_assert(offsetof(VLIBCSzList, count) == 4, "count is the second int");
static_assert(offsetof(VLIBCSzList, reserved) == 8, "the third int is reserved");
static_assert(offsetof(VLIBCSzList, flags) == 12, "flags is the fourth int");

/// A map from text to text.
typedef struct VLIBCSzHash VLIBCSzHash;

/// Returns a new, empty list with room for `capacity` texts, or null when there is no memory. The
/// caller frees it with VLIBCSzListFree. count, reserved and flags start as 0.
VLIBCSzList* VLIBCSzListAlloc(int capacity);

/// Returns the entry at `index`, counted from 0, or null when there is no such entry. The text
/// belongs to the list and is valid until the list is changed or freed.
const char* VLIBCSzListGet(const VLIBCSzList* list, int index);

/// Appends a copy of `text`. The list may move: `*list` is then replaced, its flags kept, and the
/// old address is no longer valid. Negative on failure, which leaves the list as it was.
int VLIBCSzListPush(VLIBCSzList** list, const char* text);

/// Frees the list and its texts. Null is allowed.
void VLIBCSzListFree(VLIBCSzList* list);

/// Returns a new, empty map sized for `initialSize` entries, or null when there is no memory. The
/// caller frees it with VLIBCSzHashFree.
VLIBCSzHash* VLIBCSzHashAlloc(int initialSize);

/// Sets `key` to a copy of `value`, in place of a value that the key already has. The map may move:
/// `*map` is then replaced. Negative on failure, which leaves the map as it was.
int VLIBCSzHashSetValue(VLIBCSzHash** map, const char* key, const char* value);

/// Frees the map, its keys and its values. Null is allowed.
void VLIBCSzHashFree(VLIBCSzHash* map);

/// Reads `key` from the key=value text file `path` into `value`, a buffer of `size` bytes; a longer
/// value is cut to size - 1 bytes and NUL-terminated. `flags` is 0. Positive when the key was found,
/// 0 when the file has no such key, or is not there (the buffer is then not to be relied on), negative on
/// failure.
int VLIBCFileGetKeyValue(const char* path, const char* key, char* value, int size, int flags);

/// Writes `key` with `value` into the system information file ("/etc/veltinfo.conf"). The file's
/// other keys stay. Negative on failure.
int VLIBCINFOSetKeyValue(const char* key, const char* value);

/// The number of the calling thread's last error; 0 when there was none.
int VLIBCErrGet(void);

/// The source file in which the calling thread's last error was raised; never null, "" when there was
/// none. Valid until the thread's next call that fails; the three queries of the last error do not end it.
const char* VLIBCErrorGetFile(void);

/// The line at which the calling thread's last error was raised; 0 when there was none.
int VLIBCErrorGetLine(void);

#ifdef __cplusplus
}
#endif

#endif
