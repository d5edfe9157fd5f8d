// The system event bus.
#ifndef VELT_PLATFORM_SYSEVENT_H
#define VELT_PLATFORM_SYSEVENT_H

#include "platform/core.h"

#ifdef __cplusplus
extern "C" {
#endif

/// Announces `event` with the entries of `params` to its subscribers. The map stays the caller's.
/// `flags` is 1. Negative on failure. May be called from any thread.
int VLIBSyseventEmit(const char* event, VLIBCSzHash* params, int flags);

#ifdef __cplusplus
}
#endif

#endif
