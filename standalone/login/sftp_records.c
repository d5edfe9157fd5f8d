#include "standalone/login/sftp_records.h"

#include "standalone/activity/session_activity.h"
#include "standalone/login/recorded_path.h"

#include <arpa/inet.h>
#include <errno.h>
#include <fcntl.h>
#include <netinet/in.h>
#include <stdio.h>
#include <stdlib.h>
#include <string.h>
#include <sys/socket.h>
#include <sys/stat.h>
#include <unistd.h>

enum {
    most_looked_at = 64,
    between_notes = 200000 /* microseconds */
};

/* A file that a client has open. */
struct transfer {
    int open;
    int changed; /* it was opened for writing only, made or cut */
    int whole;   /* it was read up to its end */
    off_t size;
    uint64_t sent;     /* octets that the client wrote */
    uint64_t received; /* octets that it read */
    int64_t began;
    int64_t noted;
    char path[PATH_MAX];
};

static struct transfer** transfers = NULL; /* by descriptor */
static size_t room = 0;
static int shown = -1; /* the one in the page */

static pid_t first = 0; /* of the session's processes */
static char user_name[256];
static char address[INET6_ADDRSTRLEN];
static const char* settings = NULL;

/* A client's rename is a link to the new name and then the removal of the old one. */
static struct {
    int held;
    int reason;
    char from[PATH_MAX];
    char to[PATH_MAX];
} link_before;

/* The client's end of the first connection among this process's files. */
static void find_address(void) {
    for (int file = 0; file < most_looked_at; file++) {
        struct sockaddr_storage peer;
        socklen_t size = sizeof(peer);
        const void* number = NULL;

        memset(&peer, 0, sizeof(peer));
        if (getpeername(file, (struct sockaddr*)&peer, &size) < 0) {
            continue;
        }
        if (peer.ss_family == AF_INET) {
            number = &((const struct sockaddr_in*)&peer)->sin_addr;
        } else if (peer.ss_family == AF_INET6) {
            number = &((const struct sockaddr_in6*)&peer)->sin6_addr;
        }
        if (number != NULL && inet_ntop(peer.ss_family, number, address, sizeof(address)) != NULL) {
            return;
        }
    }
}

static struct velt_session described(void) {
    const struct velt_session session = {velt_sftp, "SSH-2.0", user_name, user_name, address, settings};

    return session;
}

void velt_expect_sftp_login(const char* state_root, const char* user, const char* configuration) {
    (void)snprintf(user_name, sizeof(user_name), "%s", user);
    settings = configuration;
    find_address();
    velt_begin_activity(state_root);
    velt_share_session();
    velt_expect_session();
}

void velt_note_refused_sftp_login(void) {
    const struct velt_session session = described();

    velt_login_was_refused(&session, "configuration");
    velt_session_closed(NULL);
}

void velt_note_sftp_login(void) {
    const struct velt_session session = described();

    first = getpid();
    velt_session_opened(&session);
}

static void record(const char* kind, const char* path, const char* other, const char* detail, int reason) {
    const struct velt_record made = {kind,
                                     reason == 0 ? "done" : "refused",
                                     reason == 0 ? NULL : strerror(reason),
                                     path,
                                     other,
                                     detail,
                                     -1,
                                     -1};

    velt_record_operation(&made);
}

/* What was held is no rename. */
static void record_link_before(void) {
    if (link_before.held) {
        link_before.held = 0;
        record("link", link_before.from, link_before.to, NULL, link_before.reason);
    }
}

static void hold_link(const char* from, const char* to, int reason) {
    link_before.held = 1;
    link_before.reason = reason;
    (void)snprintf(link_before.from, sizeof(link_before.from), "%s", from);
    (void)snprintf(link_before.to, sizeof(link_before.to), "%s", to);
}

/* The second half of a rename, or the other way, which the daemon takes where no link can be made. */
static int completes_rename(const struct velt_operation* operation, const char* path) {
    if (!link_before.held || strcmp(link_before.from, path) != 0) {
        return 0;
    }
    return (operation->kind == velt_removes_file && link_before.reason == 0) ||
           (operation->kind == velt_moves && link_before.reason != 0);
}

static struct transfer* transfer_of(int descriptor) {
    const size_t place = (size_t)descriptor;

    return descriptor >= 0 && place < room && transfers[place] != NULL && transfers[place]->open
               ? transfers[place]
               : NULL;
}

static struct transfer* make_transfer(int descriptor) {
    const size_t place = (size_t)descriptor;

    if (place >= room) {
        struct transfer** larger = realloc(transfers, (place + 1) * sizeof(struct transfer*));
        if (larger == NULL) {
            return NULL;
        }
        memset(larger + room, 0, (place + 1 - room) * sizeof(struct transfer*));
        transfers = larger;
        room = place + 1;
    }
    if (transfers[place] == NULL) {
        transfers[place] = calloc(1, sizeof(struct transfer));
    }
    return transfers[place];
}

static int is_upload(const struct transfer* transfer) {
    return transfer->changed || transfer->sent > 0;
}

static void show(int descriptor, const struct transfer* transfer) {
    shown = descriptor;
    velt_transfer_began(is_upload(transfer) ? velt_upload : velt_download, transfer->path);
}

static void begin_transfer(int descriptor, int flags, const char* path) {
    const int way = flags & O_ACCMODE;
    struct stat status;

    if (fstat(descriptor, &status) < 0 || !S_ISREG(status.st_mode)) {
        return;
    }
    struct transfer* transfer = make_transfer(descriptor);
    if (transfer == NULL) {
        return;
    }
    memset(transfer, 0, sizeof(*transfer));
    transfer->open = 1;
    transfer->changed =
        way == O_WRONLY || (flags & O_TRUNC) != 0 || ((flags & O_CREAT) != 0 && status.st_size == 0);
    transfer->size = status.st_size;
    transfer->began = velt_now();
    (void)snprintf(transfer->path, sizeof(transfer->path), "%s", path);
    /* Of what is open for both, the octets tell what it is. */
    if (shown < 0 && way != O_RDWR) {
        show(descriptor, transfer);
    }
}

static void note_open(const struct velt_operation* operation, int descriptor, int reason) {
    char path[PATH_MAX];
    int reads = (operation->flags & O_ACCMODE) == O_RDONLY;

    velt_resolve_path(operation->path, 1, path);
    if (descriptor < 0) {
        record(reads ? "download" : "upload", path, NULL, NULL, reason);
    } else {
        begin_transfer(descriptor, operation->flags, path);
    }
}

static const char* kind_of(enum velt_operation_kind kind) {
    static const char* const kinds[velt_operation_kinds] = {
        [velt_cuts_file] = "truncate",  [velt_makes_folder] = "make-folder",
        [velt_removes_file] = "delete", [velt_removes_folder] = "remove-folder",
        [velt_moves] = "rename",        [velt_sets_mode] = "mode",
        [velt_sets_owner] = "owner",    [velt_sets_times] = "times",
        [velt_makes_link] = "link",     [velt_makes_symbolic_link] = "link",
    };

    return kinds[kind];
}

static int follows_links(const struct velt_operation* operation) {
    switch (operation->kind) {
    case velt_sets_mode:
    case velt_sets_owner:
    case velt_sets_times:
    case velt_cuts_file:
        return !operation->is_of_link;
    default:
        return 0;
    }
}

static void note_change(const struct velt_operation* operation, int reason) {
    static char path[PATH_MAX];
    static char other[PATH_MAX];
    char mode[16];
    const char* detail = NULL;

    velt_resolve_path(operation->path, follows_links(operation), path);
    other[0] = '\0';
    if (operation->kind == velt_moves || operation->kind == velt_makes_link) {
        velt_resolve_path(operation->other, 0, other);
    }
    if (completes_rename(operation, path)) {
        link_before.held = 0;
        record("rename", path, link_before.to, NULL, reason);
        return;
    }
    record_link_before();
    if (operation->kind == velt_makes_link) {
        hold_link(path, other, reason);
        return;
    }
    if (operation->kind == velt_sets_mode) {
        (void)snprintf(mode, sizeof(mode), "%03o", (unsigned)operation->mode & 07777U);
        detail = mode;
    } else if (operation->kind == velt_makes_symbolic_link) {
        detail = operation->other;
    }
    record(kind_of(operation->kind), path, other, detail, reason);
}

void velt_note_file_operation(const struct velt_operation* operation, int result, int reason) {
    int former = errno;

    if (operation->path != NULL) {
        velt_command_began(operation->kind == velt_opens_file ? "open" : kind_of(operation->kind),
                           operation->path);
        if (operation->kind == velt_opens_file) {
            record_link_before();
            note_open(operation, result, reason);
        } else {
            note_change(operation, result == 0 ? 0 : reason);
        }
        velt_command_ended();
    }
    errno = former;
}

/* One that was read first shows from now on as the upload that it is. */
static void show_octets(int descriptor, struct transfer* transfer, int began_to_send) {
    int64_t now = velt_now();

    if (shown < 0 || (shown == descriptor && began_to_send)) {
        show(descriptor, transfer);
    }
    if (shown == descriptor && (now - transfer->noted >= between_notes || now < transfer->noted)) {
        transfer->noted = now;
        velt_transfer_moved(is_upload(transfer) ? transfer->sent : transfer->received);
    }
}

void velt_note_octets(int descriptor, ssize_t octets, int are_sent) {
    int former = errno;
    struct transfer* transfer = transfer_of(descriptor);

    if (transfer == NULL) {
        record_link_before();
    } else if (octets == 0) {
        transfer->whole = transfer->whole || !are_sent;
    } else if (octets > 0) {
        int was_upload = is_upload(transfer);
        *(are_sent ? &transfer->sent : &transfer->received) += (uint64_t)octets;
        show_octets(descriptor, transfer, !was_upload && are_sent);
    }
    errno = former;
}

static void record_transfer(int descriptor, const struct transfer* transfer, int upload, const char* reason) {
    const struct velt_record made = {upload ? "upload" : "download",
                                     reason == NULL ? "done" : "incomplete",
                                     reason,
                                     transfer->path,
                                     NULL,
                                     NULL,
                                     (int64_t)(upload ? transfer->sent : transfer->received),
                                     velt_now() - transfer->began};

    if (shown == descriptor && upload == is_upload(transfer)) {
        shown = -1;
        velt_transfer_ended(&made);
        velt_command_ended();
    } else {
        velt_record_operation(&made);
    }
}

/* A client that has read as much as there was need not ask for more. */
static const char* why_part_was_read(const struct transfer* transfer) {
    return transfer->whole || transfer->received >= (uint64_t)transfer->size ? NULL : "closed before the end";
}

/* What was read and written is both: neither hides the other. */
static void end_transfer(int descriptor, struct transfer* transfer, const char* reason) {
    if (is_upload(transfer)) {
        record_transfer(descriptor, transfer, 1, reason);
    }
    if (!is_upload(transfer) || transfer->received > 0) {
        record_transfer(descriptor, transfer, 0, reason != NULL ? reason : why_part_was_read(transfer));
    }
    transfer->open = 0;
}

void velt_note_close(int descriptor) {
    int former = errno;
    struct transfer* transfer = transfer_of(descriptor);

    if (transfer != NULL) {
        end_transfer(descriptor, transfer, NULL);
    }
    errno = former;
}

void velt_note_end_of_process(void) {
    record_link_before();
    for (size_t i = 0; i < room; i++) {
        struct transfer* transfer = transfer_of((int)i);
        if (transfer != NULL) {
            end_transfer((int)i, transfer, "the session ended");
        }
    }
    if (first != 0 && getpid() == first) {
        first = 0;
        velt_session_closed("the connection ended");
    }
}
