// Service control. A service is named "ftpd" (the FTP service as a whole), "ftpd-pure" (the plain FTP
// daemon), "ftpd-ssl" (the FTPS daemon) or "sftp".
//
// Threads: every operation may be called from any thread; a start or stop blocks until it is done.
#ifndef VELT_PLATFORM_SERVICE_H
#define VELT_PLATFORM_SERVICE_H

#ifdef __cplusplus
extern "C" {
#endif

/// Non-zero when the stored settings enable the service, whether or not it runs now; 0 when they do not. A
/// negative result reads as enabled.
int VLIBServiceIsEnabled(const char* service);

/// Starts a daemon. `flags` is 0. Negative on failure.
int VLIBServicectlStart(const char* service, int flags);

/// Stops a daemon; stopping one that does not run succeeds. `flags` is 0. Negative on failure.
int VLIBServicectlStop(const char* service, int flags);

/// Sets the service's run key, by which a platform may decide whether it starts at boot: 1 after it was
/// started, 2 after it was stopped. It does not change whether the service is enabled. Negative on failure.
int VLIBServicecfgRunKeySet(const char* service, int value);

/// Starts a service, and sets its run key to 1. `flags` is 0. Negative on failure.
int VLIBServiceStart(const char* service, int flags);

/// Stops a service and its sessions, and sets its run key to 2; stopping one that does not run succeeds.
/// `flags` is 0. Negative on failure.
int VLIBServiceStop(const char* service, int flags);

/// Pauses a running service: it takes no new sessions until it is resumed, while those that run go on.
/// Negative on failure.
int VLIBServicePause(const char* service);

/// Resumes a paused service, which takes up the stored settings. Negative on failure.
int VLIBServiceResume(const char* service);

#ifdef __cplusplus
}
#endif

#endif
