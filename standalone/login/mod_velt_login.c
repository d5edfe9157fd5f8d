/* Shows each login what it may see, and nothing else.
 *
 * Once the password has been accepted, the session gets its own mount namespace. There the program named by
 * VeltLoginView makes one folder show what the login may see. The configuration has that folder as the
 * DefaultRoot and as the directory of <Anonymous>. For everybody else the folder is empty, so a session that
 * gets there without this module sees nothing. When the program refuses, the login fails as with a wrong
 * password.
 *
 * From the login on, file_functions.h and refused_commands.h limit what the session may do there.
 */
#include "conf.h"
#include "privs.h"

#include "standalone/login/admission.h"
#include "standalone/login/banned_address.h"
#include "standalone/login/client_address.h"
#include "standalone/login/command_records.h"
#include "standalone/login/file_functions.h"
#include "standalone/login/main_process.h"
#include "standalone/login/own_files.h"
#include "standalone/login/refused_commands.h"
#include "standalone/login/session_mounts.h"
#include "standalone/login/session_view.h"

#define MODULE_VERSION "mod_velt_login/2.0"

module velt_login_module;

/* The user this session's view was made for. The login may still fail, and another user try next. */
static const char* made_for = NULL;

/* "1000,1000,27": the primary group, then all that the daemon knows of. NULL when they cannot be
 * looked up. */
static char* groups_text(pool* p, const struct passwd* pw) {
    array_header* gids = NULL;
    array_header* names = NULL;

    /* Every source knows the primary group at least. Without an answer the rules and refusals of groups
     * would be skipped. */
    char* text = pstrcat(p, pr_gid2str(p, pw->pw_gid), NULL);
    if (pr_auth_getgroups(p, pw->pw_name, &gids, &names) < 0) {
        return NULL;
    }
    for (int i = 0; gids != NULL && i < (int)gids->nelts; i++) {
        text = pstrcat(p, text, ",", pr_gid2str(p, ((const gid_t*)gids->elts)[i]), NULL);
    }
    return text;
}

/* A copy: later look-ups may overwrite the daemon's answer. */
static struct passwd* copy_account(pool* p, const char* user) {
    const struct passwd* known = user != NULL ? pr_auth_getpwnam(p, user) : NULL;
    if (known == NULL || known->pw_name == NULL || known->pw_dir == NULL) {
        return NULL;
    }
    struct passwd* copy = pcalloc(p, sizeof(struct passwd));
    copy->pw_name = pstrdup(p, known->pw_name);
    copy->pw_dir = pstrdup(p, known->pw_dir);
    copy->pw_uid = known->pw_uid;
    copy->pw_gid = known->pw_gid;
    return copy;
}

static int run_program(pool* p, const config_rec* c, const char* kind, const char* root, const char* user) {
    char words[1024] = "cannot look up the account or its groups";
    int good = FALSE;

    struct passwd* pw = copy_account(p, user);
    char* groups = pw != NULL ? groups_text(p, pw) : NULL;
    if (groups != NULL) {
        char* arguments[velt_view_words] = {
            [velt_view_program] = c->argv[0],
            [velt_view_state] = c->argv[1],
            [velt_view_kind] = pstrdup(p, kind),
            [velt_view_root] = pstrdup(p, root),
            [velt_view_user] = pw->pw_name,
            [velt_view_uid] = pstrdup(p, pr_uid2str(p, pw->pw_uid)),
            [velt_view_gids] = groups,
            [velt_view_home] = pw->pw_dir,
            [velt_view_file] = c->argc > 3 && session.anon_config != NULL ? c->argv[3] : NULL,
        };
        PRIVS_ROOT
        good = velt_make_session_view(arguments, words, sizeof(words));
        PRIVS_RELINQUISH
    }
    if (!good) {
        pr_log_pri(PR_LOG_ERR, MODULE_VERSION ": login of '%s' refused: %s", user, words);
    } else if (words[0] != '\0') {
        pr_log_pri(PR_LOG_WARNING, MODULE_VERSION ": login of '%s': %s", user, words);
    }
    return good;
}

/* Makes `root` show what the user who logs in may see. */
static int make_view(const char* root, int anonymous) {
    const config_rec* c = find_config(main_server->conf, CONF_PARAM, "VeltLoginView", FALSE);
    const char* user = session.user;

    made_for = NULL;
    if (c == NULL || user == NULL) {
        pr_log_pri(PR_LOG_ERR,
                   MODULE_VERSION ": login refused: VeltLoginView is missing from the configuration");
        return FALSE;
    }
    pool* p = make_sub_pool(session.pool);
    int good = run_program(p, c, anonymous ? "anonymous" : c->argv[2], root, user);
    destroy_pool(p);
    if (good) {
        made_for = pstrdup(session.pool, user);
    }
    return good;
}

/* The firewall ends no connection that was open before its address was banned. */
static int is_banned(void) {
    const config_rec* c = find_config(main_server->conf, CONF_PARAM, "VeltLoginView", FALSE);
    struct in6_addr address;
    int banned = FALSE;

    if (c == NULL || !velt_read_address(session.c->remote_addr, &address)) {
        return FALSE;
    }
    PRIVS_ROOT
    banned = velt_is_banned(c->argv[1], &address, time(NULL));
    PRIVS_RELINQUISH
    return banned;
}

/* A local user's password has been checked, or the user is not known. */
static void on_authenticated(const void* data, void* ignored) {
    /* The daemon reads the code again after all listeners. */
    int* code = (int*)data;
    (void)ignored;

    if (code == NULL || session.anon_config != NULL) {
        return;
    }
    velt_expect_login();
    if (is_banned()) {
        velt_note_refused_login("banned");
        *code = PR_AUTH_DISABLEDPWD;
        return;
    }
    if (*code < 0) {
        velt_note_refused_login("password");
        /* The supervisor counts these lines. Nothing in them is of the client's choosing. */
        pr_log_pri(PR_LOG_NOTICE, "mod_velt_login: password refused from %s",
                   pr_netaddr_get_ipstr(session.c->remote_addr));
        return;
    }
    const config_rec* c = find_config(main_server->conf, CONF_PARAM, "DefaultRoot", FALSE);
    if (!make_view(c != NULL ? c->argv[0] : "/", FALSE)) {
        velt_note_refused_login("configuration");
        *code = PR_AUTH_DISABLEDPWD;
        return;
    }
    velt_expect_success();
    velt_note_login();
}

/* The session is about to enter its root directory. */
static void on_chroot(const void* root, void* ignored) {
    const char* reason = NULL;
    (void)ignored;

    if (session.anon_config != NULL) {
        velt_expect_login();
        reason = is_banned() ? "banned" : make_view(root, TRUE) ? NULL : "configuration";
    } else if (made_for == NULL || session.user == NULL || strcmp(made_for, session.user) != 0) {
        reason = "configuration";
    }
    if (reason != NULL) {
        velt_note_refused_login(reason);
        pr_response_send(R_530, "Login incorrect.");
        pr_session_end(0);
    }
    velt_expect_success();
    velt_note_login();
    velt_keep_root();
}

/* usage: VeltLoginView program state-root home|shares|server [file-with-the-share-of-anonymous-users] */
MODRET set_velt_login_view(cmd_rec* cmd) {
    if (cmd->argc < 4 || cmd->argc > 5) {
        CONF_ERROR(cmd, "expected 3 or 4 parameters");
    }
    CHECK_CONF(cmd, CONF_ROOT);
    if (*(const char*)cmd->argv[1] != '/' || *(const char*)cmd->argv[2] != '/') {
        CONF_ERROR(cmd, "expected absolute paths");
    }
    if (cmd->argc == 5) {
        (void)add_config_param_str(cmd->argv[0], 4, cmd->argv[1], cmd->argv[2], cmd->argv[3], cmd->argv[4]);
    } else {
        (void)add_config_param_str(cmd->argv[0], 3, cmd->argv[1], cmd->argv[2], cmd->argv[3]);
    }
    return PR_HANDLED(cmd);
}

/* The configuration has been read. */
static void on_postparse(const void* data, void* ignored) {
    (void)data;
    (void)ignored;
    velt_keep_scoreboard();
}

/* The daemon is about to serve. Where no session can have mounts of its own, it would start well, and refuse
 * every login. */
static void on_startup(const void* data, void* ignored) {
    int error = 0;
    (void)data;
    (void)ignored;

    velt_restore_scoreboard();
    velt_note_ended_sessions_later();
    if (getuid() != 0) {
        return;
    }
    PRIVS_ROOT
    error = velt_try_session_mounts();
    PRIVS_RELINQUISH
    if (error != 0) {
        pr_log_pri(PR_LOG_ERR, "FTP sessions cannot be confined here: cannot make a mount namespace: %s",
                   strerror(error));
        exit(EXIT_FAILURE);
    }
}

static int velt_init(void) {
    if (pr_event_register(&velt_login_module, "core.postparse", on_postparse, NULL) < 0) {
        return -1;
    }
    return pr_event_register(&velt_login_module, "core.startup", on_startup, NULL);
}

static int velt_sess_init(void) {
    int exact = FALSE;
    /* The one for all paths: one of our own would not be asked for the names in the first folder. */
    pr_fs_t* files = pr_get_fs("/", &exact);
    if (files == NULL) {
        return -1;
    }
    velt_admit();
    velt_replace_file_functions(files);
    /* The daemon's port may be shared with its successor; the ports of data connections are a session's own.
     */
    main_server->tcp_reuse_port = -1;
    if (velt_watch_session(&velt_login_module) < 0 ||
        pr_event_register(&velt_login_module, "mod_auth.authentication-code", on_authenticated, NULL) < 0 ||
        pr_event_register(&velt_login_module, "core.chroot", on_chroot, NULL) < 0) {
        return -1;
    }
    return 0;
}

static conftable velt_conftab[] = {
    {"VeltLoginView", set_velt_login_view, NULL},
    {"VeltSpared", velt_set_spared, NULL},
    {"VeltConfiguration", velt_set_configuration, NULL},
    {NULL, NULL, NULL},
};

static cmdtable velt_commands[] = {
    {PRE_CMD, C_ANY, G_NONE, velt_look_at_characters, FALSE, FALSE, 0, NULL},
    {PRE_CMD, C_ANY, G_NONE, velt_note_command, FALSE, FALSE, 0, NULL},
    {PRE_CMD, C_PORT, G_NONE, velt_refuse_data_to_the_inside, TRUE, FALSE, 0, NULL},
    {PRE_CMD, C_EPRT, G_NONE, velt_refuse_data_to_the_inside, TRUE, FALSE, 0, NULL},
    {PRE_CMD, C_STOU, G_NONE, velt_refuse_unique_name, TRUE, FALSE, 0, NULL},
    {CMD, C_ANY, G_NONE, velt_refuse_name, FALSE, FALSE, 0, NULL},
    {CMD, C_ANY, G_NONE, velt_note_start, FALSE, FALSE, 0, NULL},
    {LOG_CMD, C_ANY, G_NONE, velt_note_success, FALSE, FALSE, 0, NULL},
    {LOG_CMD_ERR, C_ANY, G_NONE, velt_note_failure, FALSE, FALSE, 0, NULL},
    {0, NULL, NULL, NULL, FALSE, FALSE, 0, NULL},
};

module velt_login_module = {
    NULL, NULL,      0x20,           "velt_login",   velt_conftab, velt_commands,
    NULL, velt_init, velt_sess_init, MODULE_VERSION, NULL,         0,
};
