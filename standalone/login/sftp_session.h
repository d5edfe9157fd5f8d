/* A session of the SFTP daemon that has its view. */
#ifndef VELT_STANDALONE_LOGIN_SFTP_SESSION_H
#define VELT_STANDALONE_LOGIN_SFTP_SESSION_H

/* Whether this process works in a view by now, and its changes of files are to be looked at. */
int velt_is_in_view(void);

/* The function of this name that the daemon would have called without us. Not NULL: without it the process
 * ends. A function pointer, to be assigned by its address. */
void* velt_next_function(const char* name);

/* As the definitions of the C library, which the daemon calls by name. */
#define VELT_WRAPPER __attribute__((visibility("default")))

/* Declares `next`, a pointer to what `name` would be without us. */
#define VELT_NEXT(name)                                                                                      \
    __typeof__(&(name)) next;                                                                                \
    *(void**)(&next) = velt_next_function(#name)

#endif
