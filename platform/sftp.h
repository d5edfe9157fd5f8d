// The SFTP configuration library.
//
// Threads: every operation may be called from any thread.
#ifndef VELT_PLATFORM_SFTP_H
#define VELT_PLATFORM_SFTP_H

#include <assert.h>
#include <stddef.h>
#include <stdint.h>

#ifdef __cplusplus
extern "C" {
#endif

/// The SFTP configuration record.
typedef struct _tag_VELT_SFTP_CONFIG_ {
    int32_t enable; ///< non-zero: SFTP is enabled
    int32_t reserved1[4];
    int32_t port; ///< TCP port, 1 to 65535
    int32_t reserved2[2];
} _tag_VELT_SFTP_CONFIG_;

static_assert(sizeof(_tag_VELT_SFTP_CONFIG_) == 32, "the record has 32 bytes");
static_assert(offsetof(_tag_VELT_SFTP_CONFIG_, enable) == 0, "enable comes first");
static_assert(offsetof(_tag_VELT_SFTP_CONFIG_, reserved1) == 4, "16 bytes are the platform's");
static_assert(offsetof(_tag_VELT_SFTP_CONFIG_, port) == 20, "port is at 20");
static_assert(offsetof(_tag_VELT_SFTP_CONFIG_, reserved2) == 24, "8 bytes are the platform's");

/// Fills the record with the stored settings. `which` is 1. Negative on failure.
int VELTSFTPConfigGet(int which, _tag_VELT_SFTP_CONFIG_* out);

/// Stores the enable flag and the port. Negative on failure. A platform whose settings are changed by several
/// callers may leave alone the one that is as the calling thread last read or stored it.
int VELTSFTPConfigSet(int enable, int port);

/// Non-zero while the SFTP service runs, whatever the stored settings say. A negative result reads as
/// running.
int VELTSFTPIsAlive(void);

#ifdef __cplusplus
}
#endif

#endif
