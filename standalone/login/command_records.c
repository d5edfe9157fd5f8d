#include "standalone/login/command_records.h"

#include "privs.h"

#include "standalone/activity/session_activity.h"
#include "standalone/login/recorded_path.h"

/* How a command is recorded. */
struct kind {
    const char* command; /* of SITE, its first parameter */
    const char* operation;
    int path;          /* which parameter begins the path, which is the last one */
    int follows_links; /* it changes what a link leads to */
};

static const struct kind kinds[] = {
    {C_RETR, "download", 1, TRUE},       {C_STOR, "upload", 1, TRUE},
    {C_APPE, "upload", 1, TRUE},         {C_STOU, "upload", 1, TRUE},
    {C_DELE, "delete", 1, FALSE},        {C_RNFR, "rename", 1, FALSE},
    {C_RNTO, "rename", 1, FALSE},        {C_MKD, "make-folder", 1, FALSE},
    {C_XMKD, "make-folder", 1, FALSE},   {C_RMD, "remove-folder", 1, FALSE},
    {C_XRMD, "remove-folder", 1, FALSE}, {"CHMOD", "mode", 3, TRUE},
    {"CHGRP", "owner", 3, TRUE},         {"MFMT", "times", 2, TRUE},
    {"MFF", "times", 2, TRUE},
};

/* The command that is being done. */
static struct {
    const struct kind* kind; /* NULL: none that is recorded */
    char path[PATH_MAX];
    char from[PATH_MAX]; /* of RNFR, until its RNTO */
    int64_t began;
    int transfers; /* its octets are counted while it runs */
    off_t octets_before;
    int timer;
} current = {NULL, "", "", 0, FALSE, 0, -1};

static module* self = NULL;

/* Between the login and the end nothing else is told. */
static int is_open = FALSE;

modret_t* velt_set_configuration(cmd_rec* cmd) {
    CHECK_ARGS(cmd, 1);
    CHECK_CONF(cmd, CONF_ROOT);
    (void)add_config_param_str(cmd->argv[0], 1, cmd->argv[1]);
    return PR_HANDLED(cmd);
}

static const char* parameter_of(const char* directive, int number) {
    const config_rec* c = find_config(main_server->conf, CONF_PARAM, directive, FALSE);

    return c != NULL && c->argc > (unsigned)number ? c->argv[number] : NULL;
}

void velt_expect_login(void) {
    const char* state_root = parameter_of("VeltLoginView", 1);

    if (state_root != NULL) {
        PRIVS_ROOT
        velt_begin_activity(state_root);
        PRIVS_RELINQUISH
    }
}

void velt_expect_success(void) {
    PRIVS_ROOT
    velt_expect_session();
    PRIVS_RELINQUISH
}

/* With the name that the client gave; the account may have another. */
static struct velt_session describe_session(pool* p) {
    struct velt_session described;
    const char* user = pr_table_get(session.notes, "mod_auth.orig-user", NULL);
    const char* version = pr_env_get(p, "TLS_PROTOCOL");
    const char* cipher = pr_env_get(p, "TLS_CIPHER");

    memset(&described, 0, sizeof(described));
    described.protocol = version != NULL ? velt_ftps : velt_ftp;
    described.security =
        version != NULL ? pstrcat(p, version, " ", cipher != NULL ? cipher : "", NULL) : NULL;
    described.user = user != NULL ? user : session.user;
    described.account = session.user;
    described.address = pr_netaddr_get_ipstr(session.c->remote_addr);
    described.configuration = parameter_of("VeltConfiguration", 0);
    return described;
}

void velt_note_refused_login(const char* kind) {
    pool* p = make_sub_pool(session.pool);
    const struct velt_session described = describe_session(p);

    velt_login_was_refused(&described, kind);
    destroy_pool(p);
}

static void open_session(void) {
    pool* p = make_sub_pool(session.pool);
    const struct velt_session described = describe_session(p);

    is_open = TRUE;
    velt_session_opened(&described);
    destroy_pool(p);
}

static const struct kind* kind_of(const cmd_rec* cmd) {
    int site = strcmp(cmd->argv[0], C_SITE) == 0;

    if (site && cmd->argc < 2) {
        return NULL;
    }
    for (size_t i = 0; i < sizeof(kinds) / sizeof(kinds[0]); i++) {
        if (strcasecmp(cmd->argv[site ? 1 : 0], kinds[i].command) == 0) {
            return &kinds[i];
        }
    }
    return NULL;
}

/* The words from the path's on, as the client sent them. */
static const char* path_words(cmd_rec* cmd, const struct kind* kind) {
    const char* text = cmd->arg != NULL ? cmd->arg : "";

    for (int skipped = 1; skipped < kind->path && *text != '\0'; skipped++) {
        text += strcspn(text, " ");
        text += strspn(text, " ");
    }
    return pr_fs_decode_path(cmd->tmp_pool, text);
}

modret_t* velt_note_command(cmd_rec* cmd) {
    const struct kind* kind = kind_of(cmd);

    current.kind = NULL;
    velt_command_began(cmd->argv[0], kind != NULL ? path_words(cmd, kind) : NULL);
    return PR_DECLINED(cmd);
}

static int is_upload(void) {
    return strcmp(current.kind->operation, "upload") == 0;
}

/* Of all transfers of the session. The daemon's count of the one that runs is gone before its end is told. */
static off_t all_octets(void) {
    return is_upload() ? session.total_bytes_in : session.total_bytes_out;
}

static int64_t moved_octets(void) {
    return (int64_t)(all_octets() - current.octets_before);
}

static int count_octets(CALLBACK_FRAME) {
    (void)p1;
    (void)p2;
    (void)p3;
    (void)data;
    velt_transfer_moved((uint64_t)moved_octets());
    return 1;
}

static void begin_transfer(void) {
    current.transfers = TRUE;
    current.octets_before = all_octets();
    velt_transfer_began(is_upload() ? velt_upload : velt_download, current.path);
    current.timer = pr_timer_add(1, -1, self, count_octets, "octets of a transfer");
}

/* Where the path leads before the command changes anything. */
static void begin_operation(cmd_rec* cmd, const struct kind* kind) {
    const char* stored = pr_table_get(cmd->notes, "mod_xfer.store-path", NULL);
    const char* sent = pr_table_get(cmd->notes, "mod_xfer.retr-path", NULL);
    const char* known = stored != NULL ? stored : sent;

    current.kind = kind;
    current.began = velt_now();
    current.transfers = FALSE;
    velt_resolve_path(known != NULL ? known : path_words(cmd, kind), kind->follows_links, current.path);
}

modret_t* velt_note_start(cmd_rec* cmd) {
    const struct kind* kind = kind_of(cmd);

    if (is_open && kind != NULL) {
        begin_operation(cmd, kind);
        if (strcmp(kind->operation, "upload") == 0 || strcmp(kind->operation, "download") == 0) {
            begin_transfer();
        }
    }
    return PR_DECLINED(cmd);
}

/* The daemon's words for the client, and their code. */
static const char* answer(pool* p, const char** code) {
    const char* words = NULL;

    return pr_response_get_last(p, code, &words) == 0 ? words : NULL;
}

/* The daemon begins with the path as the client gave it. */
static const char* reason_of(cmd_rec* cmd) {
    const char* code = NULL;
    const char* words = answer(cmd->tmp_pool, &code);
    size_t length = cmd->arg != NULL ? strlen(cmd->arg) : 0;

    if (words != NULL && length > 0 && strncmp(words, cmd->arg, length) == 0 && words[length] == ':') {
        words += length + 1;
        words += strspn(words, " ");
    }
    return words;
}

/* A transfer that a full disk, the client or its silence ended, and not the server's rules. */
static int is_incomplete(cmd_rec* cmd) {
    const char* code = NULL;

    (void)answer(cmd->tmp_pool, &code);
    return current.transfers && (moved_octets() > 0 || code == NULL || code[0] != '5');
}

static const char* detail_of(const cmd_rec* cmd) {
    if (strcmp(current.kind->operation, "mode") == 0) {
        return cmd->argc > 2 ? cmd->argv[2] : NULL;
    }
    return NULL;
}

static void record(const char* result, const char* reason, const char* detail) {
    struct velt_record operation = {
        current.kind->operation, result, reason, current.path, NULL, detail, -1, -1};

    if (strcmp(current.kind->command, C_RNTO) == 0) {
        operation.path = current.from;
        operation.new_path = current.path;
    }
    if (current.transfers) {
        if (current.timer > 0) {
            (void)pr_timer_remove(current.timer, self);
            current.timer = -1;
        }
    }
    if (current.transfers && strcmp(result, "refused") != 0) {
        operation.octets = moved_octets();
        operation.duration = velt_now() - current.began;
    }
    (current.transfers ? velt_transfer_ended : velt_record_operation)(&operation);
    current.kind = NULL;
    current.transfers = FALSE;
}

modret_t* velt_note_success(cmd_rec* cmd) {
    if (!is_open && strcmp(cmd->argv[0], C_PASS) == 0) {
        open_session();
    }
    if (current.kind != NULL && strcmp(current.kind->command, C_RNFR) == 0) {
        (void)snprintf(current.from, sizeof(current.from), "%s", current.path);
    } else if (current.kind != NULL) {
        record("done", NULL, detail_of(cmd));
    }
    current.kind = NULL;
    velt_command_ended();
    return PR_DECLINED(cmd);
}

modret_t* velt_note_failure(cmd_rec* cmd) {
    const struct kind* kind = kind_of(cmd);

    /* Refused before anybody came to do it. */
    if (is_open && current.kind == NULL && kind != NULL) {
        begin_operation(cmd, kind);
    }
    if (current.kind != NULL) {
        record(is_incomplete(cmd) ? "incomplete" : "refused", reason_of(cmd), detail_of(cmd));
    }
    velt_command_ended();
    return PR_DECLINED(cmd);
}

static void on_exit_of_session(const void* data, void* ignored) {
    const char* details = NULL;
    const char* reason = pr_session_get_disconnect_reason(&details);
    (void)data;
    (void)ignored;

    if (current.kind != NULL && current.transfers) {
        record("incomplete", "the session ended", NULL);
    }
    /* The daemon goes on to tell of a transfer that ended with the session. */
    is_open = FALSE;
    PRIVS_ROOT
    velt_session_closed(reason);
    PRIVS_RELINQUISH
}

static void on_limit(const void* data, void* ignored) {
    (void)data;
    (void)ignored;
    velt_expect_login();
    velt_note_refused_login("limit");
}

int velt_watch_session(module* owner) {
    static const char* const limits[] = {"mod_auth.max-connections-per-host", "mod_auth.max-clients-per-host",
                                         "mod_auth.max-clients-per-user", "mod_auth.max-clients"};

    self = owner;
    for (size_t i = 0; i < sizeof(limits) / sizeof(limits[0]); i++) {
        if (pr_event_register(owner, limits[i], on_limit, NULL) < 0) {
            return -1;
        }
    }
    return pr_event_register(owner, "core.exit", on_exit_of_session, NULL);
}
