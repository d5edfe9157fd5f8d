#include "standalone/activity/session_activity.h"

#include "standalone/activity/page_file.h"
#include "standalone/activity/record_line.h"
#include "standalone/activity/shown_places.h"
#include "standalone/activity/spool.h"

#include <inttypes.h>
#include <stdio.h>
#include <string.h>
#include <sys/fsuid.h>
#include <time.h>
#include <unistd.h>

enum {
    most_tries = 1000,
    microseconds = 1000000,
    between_refused = microseconds / 5,
    most_refused_at_once = 10,
    longest_refused = 1024, /* octets of a text */
    group_of_files = 0      /* whichever this process has by now, which may be that of who logs in */
};

/* Where there is no page of this kind, this one is written, and nobody reads it. */
static struct velt_session_page unseen;

static struct velt_session_page* page = &unseen;
static char session_name[velt_session_name_size];
static int page_file = -1;
static int folder = -1;
static int spool = -1;
static struct velt_lost_records* lost = NULL;
static int begun = 0;
static int recording = 0;
static int shared = 0;

/* For the rate. */
static int64_t moment;
static uint64_t octets_at_moment;

int64_t velt_now(void) {
    struct timespec now;

    (void)clock_gettime(CLOCK_REALTIME, &now);
    return (int64_t)now.tv_sec * microseconds + now.tv_nsec / 1000;
}

/* Processes of one session may write at the same time. One that was killed meanwhile leaves the page as if it
 * wrote for ever, so nobody waits for it long. */
static void begin_change(void) {
    for (int i = 0; i < most_tries; i++) {
        uint32_t changes = __atomic_load_n(&page->changes, __ATOMIC_RELAXED);
        if (changes % 2 == 0 && __atomic_compare_exchange_n(&page->changes, &changes, changes + 1, 0,
                                                            __ATOMIC_ACQUIRE, __ATOMIC_RELAXED)) {
            break;
        }
    }
    __atomic_thread_fence(__ATOMIC_RELEASE);
}

static void end_change(void) {
    uint32_t changes = __atomic_load_n(&page->changes, __ATOMIC_RELAXED);

    __atomic_store_n(&page->changes, (changes | 1) + 1, __ATOMIC_RELEASE);
}

/* Longer texts are cut; a 0 stays behind each. */
static void set_text(char* field, size_t size, const char* text) {
    size_t length = text != NULL ? strnlen(text, size - 1) : 0;

    memset(field, 0, size);
    memcpy(field, text != NULL ? text : "", length);
}

#define SET_TEXT(field, text) set_text((field), sizeof(field), (text))

void velt_begin_activity(const char* state_root) {
    if (begun) {
        return;
    }
    begun = 1;
    int group = setfsgid(group_of_files);
    lost = velt_open_lost(state_root);
    folder = velt_open_sessions_folder(state_root);
    recording = velt_may_record(state_root);
    spool = recording ? velt_open_spool(state_root) : -1;
    (void)setfsgid((gid_t)group);
    if (velt_name_session(session_name) < 0) {
        session_name[0] = '\0';
    }
}

void velt_list_activity_files(int descriptors[velt_activity_files]) {
    descriptors[0] = spool;
    descriptors[1] = folder;
    descriptors[2] = page_file;
}

static const char* protocol_name(void) {
    static const char* const names[] = {"ftp", "ftps", "sftp"};

    return names[page->protocol % 3];
}

/* What every record says, and then what this one does. */
static void write_record(const struct velt_member* own, size_t count, uint32_t number, size_t longest) {
    static char line[velt_longest_line];
    struct velt_member members[32] = {
        {"time", NULL, velt_now()},       {"session", session_name, 0}, {"number", NULL, number},
        {"protocol", protocol_name(), 0}, {"user", page->user, 0},      {"account", page->account, 0},
        {"address", page->address, 0},
    };
    const size_t common = 8;

    if (!recording) {
        return;
    }
    uint32_t left_out = __atomic_exchange_n(&page->left_out, 0, __ATOMIC_RELAXED);
    members[7] = (struct velt_member){"leftout", NULL, left_out > 0 ? (int64_t)left_out : -1};
    memcpy(members + common, own, count * sizeof(*own));
    size_t length = velt_make_line(line, members, common + count, longest);
    if (spool < 0 || velt_write_spool(spool, line, length) < 0) {
        velt_count_lost(lost, velt_now());
        (void)__atomic_add_fetch(&page->left_out, left_out, __ATOMIC_RELAXED);
    }
}

static uint32_t take_number(void) {
    return __atomic_fetch_add(&page->next_record, 1, __ATOMIC_RELAXED);
}

static const char* or_empty(const char* text) {
    return text != NULL ? text : "";
}

static void describe(const struct velt_session* session) {
    page->protocol = session->protocol;
    SET_TEXT(page->security, session->security);
    SET_TEXT(page->user, session->user);
    SET_TEXT(page->account, session->account);
    SET_TEXT(page->address, session->address);
    SET_TEXT(page->configuration, session->configuration);
}

void velt_login_was_refused(const struct velt_session* session, const char* kind) {
    describe(session);
    const struct velt_member members[] = {
        {"kind", "login-refused", 0},
        {"result", "refused", 0},
        {"reason", or_empty(kind), 0},
        {"detail", page->security, 0},
    };
    write_record(members, sizeof(members) / sizeof(members[0]), take_number(), velt_longest_text);
}

void velt_expect_session(void) {
    if (page != &unseen || folder < 0 || session_name[0] == '\0') {
        return;
    }
    velt_remove_ended_pages(folder);
    int group = setfsgid(group_of_files);
    struct velt_session_page* seen = velt_make_page(folder, session_name, &page_file);
    (void)setfsgid((gid_t)group);
    if (seen != NULL) {
        *seen = *page;
        page = seen;
    }
}

void velt_session_opened(const struct velt_session* session) {
    begin_change();
    describe(session);
    page->since = velt_now();
    page->active = page->since;
    page->form = velt_page_form;
    end_change();
    const struct velt_member members[] = {
        {"kind", "session-opened", 0},
        {"result", "done", 0},
        {"detail", page->security, 0},
    };
    write_record(members, sizeof(members) / sizeof(members[0]), take_number(), velt_longest_text);
}

void velt_share_session(void) {
    shared = 1;
}

/* A page that others of the session may still write stays as it is: it says that the session is closed. */
static void remove_page(void) {
    if (page == &unseen || unlinkat(folder, session_name, 0) == 0 || shared) {
        return;
    }
    unseen = *page;
    page = &unseen;
    (void)!ftruncate(page_file, 0);
}

static uint64_t running_octets(enum velt_transfer transfer) {
    return page->transfer == transfer ? page->transfer_octets : 0;
}

static void record_end(const char* reason) {
    char words[400];

    (void)snprintf(words, sizeof(words), "%s", or_empty(reason));
    if (page->ended_by[0] != '\0') {
        (void)snprintf(words, sizeof(words), "ended by %.*s%s%.*s", (int)sizeof(page->ended_by),
                       page->ended_by, page->end_reason[0] != '\0' ? ": " : "", (int)sizeof(page->end_reason),
                       page->end_reason);
    }
    const struct velt_member members[] = {
        {"kind", "session-closed", 0},
        {"result", "done", 0},
        {"reason", words, 0},
        {"in", NULL, (int64_t)(page->octets_in + running_octets(velt_upload))},
        {"out", NULL, (int64_t)(page->octets_out + running_octets(velt_download))},
        {"duration", NULL, velt_now() - page->since},
    };
    write_record(members, sizeof(members) / sizeof(members[0]), velt_closing_record, velt_longest_text);
}

void velt_session_closed(const char* reason) {
    if (page->form == velt_page_form && !page->closed) {
        record_end(reason);
        page->closed = 1;
    }
    remove_page();
}

void velt_command_began(const char* command, const char* path) {
    begin_change();
    page->busy = 1;
    page->active = velt_now();
    SET_TEXT(page->command, command);
    SET_TEXT(page->path, path);
    end_change();
}

void velt_command_ended(void) {
    begin_change();
    page->busy = page->transfer != velt_no_transfer;
    page->active = velt_now();
    end_change();
}

/* For who has to record the transfer when this process cannot. */
static void show_transfer_place(const char* path) {
    static struct velt_shown_place place;
    size_t length = 0;

    velt_find_shown_place(or_empty(path), &place);
    length = strlen(place.server_path);
    SET_TEXT(page->transfer_path, path);
    SET_TEXT(page->transfer_server, length < sizeof(page->transfer_server) ? place.server_path : "");
    SET_TEXT(page->transfer_share, place.share);
    page->transfer_within = (uint32_t)(length - strlen(place.share_path));
}

void velt_transfer_began(enum velt_transfer transfer, const char* path) {
    moment = velt_now();
    octets_at_moment = 0;
    begin_change();
    page->transfer = transfer;
    page->transfer_record = take_number();
    page->transfer_since = moment;
    page->transfer_octets = 0;
    page->rate = 0;
    page->busy = 1;
    page->active = moment;
    show_transfer_place(path);
    end_change();
}

void velt_transfer_moved(uint64_t octets) {
    int64_t now = velt_now();
    int64_t passed = now - moment;

    begin_change();
    page->transfer_octets = octets;
    page->active = now;
    if (passed >= microseconds || passed < 0) {
        page->rate = passed > 0 && octets >= octets_at_moment
                         ? (uint64_t)((double)(octets - octets_at_moment) * microseconds / (double)passed)
                         : 0;
        moment = now;
        octets_at_moment = octets;
    }
    end_change();
}

/* Each refused operation takes its time from a stock that fills up again, for all processes of the session. A
 * clock that was set back finds it full. */
static int may_record_refused(void) {
    const int64_t now = velt_now();
    const int64_t most = (int64_t)most_refused_at_once * between_refused;
    int64_t until = __atomic_load_n(&page->refused_until, __ATOMIC_RELAXED);
    int64_t next = 0;

    do {
        next = (until > now && until <= now + most ? until : now) + between_refused;
        if (next > now + most) {
            return 0;
        }
    } while (!__atomic_compare_exchange_n(&page->refused_until, &until, next, 0, __ATOMIC_RELAXED,
                                          __ATOMIC_RELAXED));
    return 1;
}

/* Who has nothing to lose may have as many operations refused as there is time for. Once the session is
 * closed, no record would say how many were left out. */
static int is_left_out(int refused) {
    if (!refused || page->closed || may_record_refused()) {
        return 0;
    }
    (void)__atomic_add_fetch(&page->left_out, 1, __ATOMIC_RELAXED);
    return 1;
}

static void write_operation(const struct velt_record* record, uint32_t number) {
    static struct velt_shown_place place;
    static struct velt_shown_place new_place;
    int refused = strcmp(record->result, "refused") == 0;

    if (is_left_out(refused)) {
        return;
    }
    velt_find_shown_place(or_empty(record->path), &place);
    velt_find_shown_place(or_empty(record->new_path), &new_place);
    const struct velt_member members[] = {
        {"kind", record->kind, 0},
        {"result", record->result, 0},
        {"reason", or_empty(record->reason), 0},
        {"path", or_empty(record->path), 0},
        {"server", place.server_path, 0},
        {"share", place.share, 0},
        {"within", place.share_path, 0},
        {"newpath", or_empty(record->new_path), 0},
        {"newserver", new_place.server_path, 0},
        {"newshare", new_place.share, 0},
        {"newwithin", new_place.share_path, 0},
        {"detail", or_empty(record->detail), 0},
        {"octets", NULL, record->octets},
        {"duration", NULL, record->duration},
    };
    write_record(members, sizeof(members) / sizeof(members[0]), number,
                 refused ? longest_refused : velt_longest_text);
}

static void add_octets(const struct velt_record* record) {
    uint64_t octets = record->octets > 0 ? (uint64_t)record->octets : 0;

    if (strcmp(record->kind, "upload") == 0) {
        page->octets_in += octets;
    } else if (strcmp(record->kind, "download") == 0) {
        page->octets_out += octets;
    }
    page->active = velt_now();
}

void velt_record_operation(const struct velt_record* record) {
    write_operation(record, take_number());
    begin_change();
    add_octets(record);
    end_change();
}

void velt_transfer_ended(const struct velt_record* record) {
    write_operation(record, page->transfer_record);
    begin_change();
    add_octets(record);
    page->transfer = velt_no_transfer;
    page->transfer_octets = 0;
    page->rate = 0;
    end_change();
}
