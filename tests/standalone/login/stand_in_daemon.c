#include "tests/standalone/login/stand_in_daemon.h"

#include "standalone/login/main_process.h"

#include "conf.h"
#include "privs.h"

extern module velt_login_module;

session_t session;
server_rec* main_server = NULL;

typedef void (*listener)(const void*, void*);

static const struct login_world* world;
static listener on_code;
static listener on_root;
static int ended;
static int rights;
static pr_fs_t files;
static const char* client;
static const char* sessions_file;
static const char* spared_network;
static int sent_away;
static char log_text[2048];
static char memory[65536];
static size_t used;

/* What stands in is a session. */
void velt_keep_scoreboard(void) {}
void velt_restore_scoreboard(void) {}
void velt_note_ended_sessions_later(void) {}

static void* take(size_t size) {
    size_t start = (used + 15) & ~(size_t)15;
    if (start + size > sizeof(memory)) {
        abort();
    }
    used = start + size;
    return memory + start;
}

pool* make_sub_pool(pool* parent) {
    return parent;
}

void destroy_pool(pool* p) {
    (void)p;
}

void* pcalloc(pool* p, size_t size) {
    (void)p;
    return memset(take(size), 0, size);
}

char* pstrdup(pool* p, const char* text) {
    (void)p;
    return strcpy(take(strlen(text) + 1), text);
}

char* pstrcat(pool* p, ...) {
    char joined[8192] = "";
    va_list parts;
    va_start(parts, p);
    for (const char* part = NULL; (part = va_arg(parts, const char*)) != NULL;) {
        (void)strncat(joined, part, sizeof(joined) - strlen(joined) - 1);
    }
    va_end(parts);
    return pstrdup(p, joined);
}

const char* pr_uid2str(pool* p, uid_t uid) {
    char text[16];
    (void)snprintf(text, sizeof(text), "%lu", (unsigned long)uid);
    return pstrdup(p, text);
}

const char* pr_gid2str(pool* p, gid_t gid) {
    return pr_uid2str(p, (uid_t)gid);
}

struct passwd* pr_auth_getpwnam(pool* p, const char* name) {
    static struct passwd account;
    (void)p;
    account.pw_name = (char*)name;
    account.pw_dir = (char*)world->home;
    account.pw_uid = 1001;
    account.pw_gid = 1001;
    return world->knows_user ? &account : NULL;
}

int pr_auth_getgroups(pool* p, const char* name, array_header** ids, array_header** names) {
    static gid_t groups[2] = {1001, 2001};
    static array_header known;
    (void)p;
    (void)name;
    (void)names;
    known.elts = groups;
    known.nelts = world->knows_groups ? 2 : 0;
    *ids = &known;
    return world->knows_groups ? 2 : -1;
}

config_rec* find_config(xaset_t* set, int type, const char* name, int recurse) {
    static void* arguments[3];
    static void* networks[1];
    static config_rec found;
    static config_rec spared;
    (void)set;
    (void)type;
    (void)recurse;
    networks[0] = (void*)spared_network;
    spared.argc = 1;
    spared.argv = networks;
    if (strcmp(name, "VeltSpared") == 0) {
        return spared_network != NULL ? &spared : NULL;
    }
    arguments[0] = (void*)world->program;
    arguments[1] = (void*)world->state_root;
    /* The kind for which the program runs in the namespaces of the test itself. */
    arguments[2] = "server";
    found.argc = 3;
    found.argv = arguments;
    return strcmp(name, "VeltLoginView") == 0 && world->program[0] != '\0' ? &found : NULL;
}

config_rec* find_config_next(config_rec* previous, config_rec* next, int type, const char* name,
                             int recurse) {
    (void)previous;
    (void)next;
    (void)type;
    (void)name;
    (void)recurse;
    return NULL;
}

const char* pr_get_scoreboard(void) {
    return sessions_file;
}

config_rec* add_config_param_str(const char* name, unsigned int count, ...) {
    (void)name;
    (void)count;
    return NULL;
}

modret_t* mod_create_ret(cmd_rec* cmd, unsigned char code, const char* number, const char* text) {
    (void)cmd;
    (void)code;
    (void)number;
    (void)text;
    return NULL;
}

void* get_param_ptr(xaset_t* set, const char* name, int recurse) {
    (void)set;
    (void)name;
    (void)recurse;
    return NULL;
}

int pr_netaddr_get_family(const pr_netaddr_t* address) {
    (void)address;
    return AF_INET;
}

void* pr_netaddr_get_inaddr(const pr_netaddr_t* address) {
    static struct in_addr number;
    (void)address;
    return client != NULL && inet_pton(AF_INET, client, &number) == 1 ? &number : NULL;
}

const char* pr_netaddr_get_ipstr(const pr_netaddr_t* address) {
    (void)address;
    return "192.0.2.7";
}

unsigned char check_context(cmd_rec* cmd, int contexts) {
    (void)cmd;
    (void)contexts;
    return TRUE;
}

char* get_context_name(cmd_rec* cmd) {
    static char none[] = "";
    (void)cmd;
    return none;
}

void pr_log_pri(int priority, const char* format, ...) {
    va_list parts;
    (void)priority;
    va_start(parts, format);
    (void)vsnprintf(log_text, sizeof(log_text), format, parts);
    va_end(parts);
}

int pr_privs_root(const char* file, int line) {
    (void)file;
    (void)line;
    rights++;
    return 0;
}

int pr_privs_relinquish(const char* file, int line) {
    (void)file;
    (void)line;
    rights--;
    return 0;
}

int pr_event_register(module* m, const char* event, listener told, void* data) {
    (void)m;
    (void)data;
    if (strcmp(event, "mod_auth.authentication-code") == 0) {
        on_code = told;
    } else if (strcmp(event, "core.chroot") == 0) {
        on_root = told;
    }
    return 0;
}

const void* pr_table_get(pr_table_t* table, const char* key, size_t* size) {
    (void)table;
    (void)key;
    (void)size;
    return NULL;
}

char* pr_env_get(pool* p, const char* name) {
    (void)p;
    (void)name;
    return NULL;
}

char* pr_fs_decode_path(pool* p, const char* path) {
    return pstrdup(p, path);
}

int pr_timer_add(int seconds, int number, module* m, callback_t call, const char* words) {
    (void)seconds;
    (void)number;
    (void)m;
    (void)call;
    (void)words;
    return -1;
}

int pr_timer_remove(int number, module* m) {
    (void)number;
    (void)m;
    return -1;
}

int pr_response_get_last(pool* p, const char** code, const char** words) {
    (void)p;
    (void)code;
    (void)words;
    return -1;
}

const char* pr_session_get_disconnect_reason(const char** details) {
    (void)details;
    return NULL;
}

pr_fs_t* pr_get_fs(const char* path, int* exact) {
    (void)path;
    *exact = TRUE;
    return &files;
}

void pr_response_send(const char* code, const char* format, ...) {
    (void)format;
    ended = strcmp(code, R_530) == 0;
    sent_away = strcmp(code, R_421) == 0;
}

void pr_session_end(int flags) {
    (void)flags;
}

static void begin(const struct login_world* login) {
    static server_rec server;
    static conn_t connection;
    static pr_netaddr_t* address;

    connection.remote_addr = (const pr_netaddr_t*)&address;
    main_server = &server;
    world = login;
    used = 0;
    ended = FALSE;
    sent_away = FALSE;
    rights = 0;
    log_text[0] = '\0';
    session.c = &connection;
    session.user = "alice";
    (void)velt_login_module.sess_init();
}

void connect_from(const char* address, const char* scoreboard, const char* spared) {
    client = address;
    sessions_file = scoreboard;
    spared_network = spared;
}

int is_sent_away(const struct login_world* login) {
    begin(login);
    return sent_away;
}

enum login_end log_in(const struct login_world* login) {
    begin(login);
    int code = login->code;
    on_code(&code, NULL);
    if (code < 0) {
        return login_wrong;
    }
    on_root("/root", NULL);
    return ended ? login_disconnected : login_granted;
}

enum login_end change_root_unasked(const struct login_world* login) {
    struct login_world wrong = *login;

    /* What an earlier login may have left is gone with a refused one. */
    wrong.knows_user = FALSE;
    (void)log_in(&wrong);
    begin(login);
    on_root("/root", NULL);
    return ended ? login_disconnected : login_granted;
}

int change_mode_as_the_daemon(const char* path, unsigned mode) {
    return files.chmod(&files, path, (mode_t)mode);
}

int change_mode_of_open_file_as_the_daemon(const char* path, int descriptor, unsigned mode) {
    pr_fh_t file;
    memset(&file, 0, sizeof(file));
    file.fh_fs = &files;
    file.fh_path = (char*)path;
    return files.fchmod(&file, descriptor, (mode_t)mode);
}

int open_as_the_daemon(const char* path, int flags) {
    pr_fh_t file;
    memset(&file, 0, sizeof(file));
    file.fh_fs = &files;
    return files.open(&file, path, flags);
}

int cut_as_the_daemon(const char* path, long length) {
    return files.truncate(&files, path, length);
}

int move_as_the_daemon(const char* from, const char* to) {
    return files.rename(&files, from, to);
}

int link_as_the_daemon(const char* target, const char* path) {
    return files.link(&files, target, path) + files.symlink(&files, target, path);
}

const char* logged(void) {
    return log_text;
}

int rights_taken(void) {
    return rights;
}
