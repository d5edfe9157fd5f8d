#include "tests/standalone/chroot/login_root.h"

#include "conf.h"
#include "privs.h"

extern module velt_chroot_module;

session_t session;
server_rec* main_server = NULL;

static const struct login_world* world;
static config_rec places;
static config_rec root;
static void* root_arguments[2];
static char memory[65536];
static size_t used;

static void* take(size_t size) {
    size_t start = (used + 15) & ~(size_t)15;
    if (start + size > sizeof(memory)) {
        abort();
    }
    used = start + size;
    return memory + start;
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

struct passwd* pr_auth_getpwnam(pool* p, const char* name) {
    static struct passwd account;
    (void)p;
    account.pw_name = (char*)name;
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

const void* pr_table_get(pr_table_t* table, const char* key, size_t* size) {
    (void)table;
    (void)key;
    (void)size;
    return "alice";
}

config_rec* pr_auth_get_anon_config(pool* p, const char** login, char** user, char** name) {
    (void)p;
    (void)login;
    (void)user;
    (void)name;
    return NULL;
}

config_rec* find_config(xaset_t* set, int type, const char* name, int recurse) {
    static void* arguments[2];
    (void)set;
    (void)type;
    (void)recurse;
    arguments[0] = (void*)world->rules_file;
    arguments[1] = (void*)world->share_map;
    places.argv = arguments;
    return strcmp(name, "VeltChrootRules") == 0 ? &places : NULL;
}

int remove_config(xaset_t* set, const char* name, int recurse) {
    (void)set;
    (void)name;
    (void)recurse;
    root_arguments[0] = NULL;
    return TRUE;
}

config_rec* add_config_param_set(xaset_t** set, const char* name, unsigned int count, ...) {
    (void)set;
    (void)name;
    (void)count;
    root.argv = root_arguments;
    return &root;
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
    (void)priority;
    (void)format;
}

int pr_privs_root(const char* file, int line) {
    (void)file;
    (void)line;
    return 0;
}

int pr_privs_relinquish(const char* file, int line) {
    (void)file;
    (void)line;
    return 0;
}

const char* root_of(const struct login_world* login) {
    static server_rec server;
    cmd_rec command;

    memset(&command, 0, sizeof(command));
    main_server = &server;
    world = login;
    used = 0;
    (void)velt_chroot_module.cmdtable[0].handler(&command);
    return root_arguments[0] != NULL ? (const char*)root_arguments[0] : "";
}
