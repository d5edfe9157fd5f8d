// The administrator log.
#ifndef VELT_PLATFORM_ADMINLOG_H
#define VELT_PLATFORM_ADMINLOG_H

#ifdef __cplusplus
extern "C" {
#endif

/// Appends one entry. `event` (0x11B000nn) selects the message of the log's catalogue and the four
/// texts fill it; a text that the event does not use is "", never null. Category 2 stands for the
/// file-transfer services and 1 for the chroot users; level 1 is informational. Negative on failure.
/// May be called from any thread.
int VELTLogSet1(int category, int level, unsigned event, const char* arg1, const char* arg2, const char* arg3,
                const char* arg4);

#ifdef __cplusplus
}
#endif

#endif
