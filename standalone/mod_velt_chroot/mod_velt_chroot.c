/* Confines each login of a local user by the chroot rules: a user's rule before a group's before the general
 * DefaultRoot. The rules are read at every login, so a change of theirs needs no restart.
 *
 * A login whose rule cannot be told (rules file missing or damaged, share or folder gone) gets a root
 * directory that cannot exist: the password is still checked and counted as any other, and then the
 * login fails. Nothing is ever left to a weaker setting.
 */
#include "conf.h"
#include "privs.h"

#include "standalone/mod_velt_chroot/rules.h"

#include <sys/stat.h>

#define MODULE_VERSION "mod_velt_chroot/1.0"

module velt_chroot_module;

/* Below a file nothing can be a directory. */
static const char no_root[] = "/dev/null/refused";

/* The DefaultRoot of the configuration. A failed login may be followed by another user's, so it is put back
 * each time. */
static const char* general_root = NULL;

struct account {
    uid_t uid;
    gid_t gid;
    const array_header* gids; /* NULL: no further groups */
};

static int belongs_to(unsigned long gid, const struct account* account) {
    if (gid == (unsigned long)account->gid) {
        return TRUE;
    }
    if (account->gids == NULL) {
        return FALSE;
    }
    for (int i = 0; i < (int)account->gids->nelts; i++) {
        if (gid == (unsigned long)((const gid_t*)account->gids->elts)[i]) {
            return TRUE;
        }
    }
    return FALSE;
}

static int get_account(pool* p, const char* login, struct account* account) {
    array_header* gids = NULL;
    array_header* names = NULL;

    const struct passwd* pw = pr_auth_getpwnam(p, login);
    if (pw == NULL) {
        return FALSE;
    }
    /* The next look-up may reuse what `pw` points to. */
    account->uid = pw->pw_uid;
    account->gid = pw->pw_gid;
    /* Every source tells the primary group at least; without an answer, group rules would be skipped. */
    if (pr_auth_getgroups(p, pstrdup(p, pw->pw_name), &gids, &names) < 0) {
        pr_log_pri(PR_LOG_ERR, MODULE_VERSION ": the groups cannot be told: login of '%s' refused", login);
        return FALSE;
    }
    account->gids = gids;
    return TRUE;
}

/* Finds the path of the rule that applies: NULL when none does. FALSE when the rules cannot be read to their
 * end. */
static int find_rule(pool* p, const char* file, const struct account* account, const char** path) {
    struct velt_lines lines;
    struct velt_rule rule;
    int status = 0;

    *path = NULL;
    if (velt_lines_open(&lines, file, VELT_RULES_HEADER) < 0) {
        return FALSE;
    }
    int have_user_rule = FALSE;
    while ((status = velt_lines_next(&lines)) > 0) {
        if (velt_rule_parse(lines.text, &rule) < 0) {
            status = -1;
            break;
        }
        if (rule.is_user && !have_user_rule && rule.id == (unsigned long)account->uid) {
            *path = pstrdup(p, rule.path);
            have_user_rule = TRUE;
        } else if (!rule.is_user && *path == NULL && belongs_to(rule.id, account)) {
            *path = pstrdup(p, rule.path);
        }
    }
    velt_lines_close(&lines);
    return status == 0;
}

/* The folder of the share `name`; NULL when the map does not tell. */
static const char* share_folder(pool* p, const char* map, const char* name, size_t name_length) {
    struct velt_lines lines;
    const char* folder = NULL;

    if (velt_lines_open(&lines, map, VELT_SHARES_HEADER) < 0) {
        return NULL;
    }
    while (folder == NULL && velt_lines_next(&lines) > 0) {
        const char* tab = strchr(lines.text, '\t');
        if (tab != NULL && (size_t)(tab - lines.text) == name_length &&
            memcmp(lines.text, name, name_length) == 0) {
            folder = pstrdup(p, tab + 1);
        }
    }
    velt_lines_close(&lines);
    return folder;
}

static int is_below(const char* folder, const char* path) {
    size_t length = strlen(folder);

    if (strcmp(folder, "/") == 0) {
        return TRUE;
    }
    return strncmp(folder, path, length) == 0 && (path[length] == '\0' || path[length] == '/');
}

/* The root directory for a rule's path; NULL when there is none. Whoever may write in the share could put a
 * symbolic link in the place of a folder, so the folder must still lie in the share when all links are
 * followed. */
static const char* root_of_rule(pool* p, const char* map, const char* rule_path) {
    char share_real[PATH_MAX];
    char real[PATH_MAX];
    struct stat st;

    if (strcmp(rule_path, "/home") == 0) {
        return "~";
    }
    const char* name = rule_path + 1;
    size_t name_length = strcspn(name, "/");
    const char* folder = share_folder(p, map, name, name_length);
    if (folder == NULL || realpath(folder, share_real) == NULL) {
        return NULL;
    }
    const char* whole = pstrcat(p, share_real, name + name_length, NULL);
    if (realpath(whole, real) == NULL || !is_below(share_real, real) || stat(real, &st) < 0 ||
        !S_ISDIR(st.st_mode)) {
        return NULL;
    }
    /* The daemon would put the user's name in its place. */
    if (strstr(real, "%u") != NULL) {
        return NULL;
    }
    return pstrdup(p, real);
}

static const char* root_of_login(pool* p, const config_rec* places, const char* login) {
    const char* rule_path = NULL;
    const char* root = NULL;

    struct account account;
    if (!get_account(p, login, &account)) {
        return no_root;
    }

    PRIVS_ROOT
    int readable = find_rule(p, places->argv[0], &account, &rule_path);
    if (readable && rule_path != NULL) {
        root = root_of_rule(p, places->argv[1], rule_path);
    }
    PRIVS_RELINQUISH

    if (!readable) {
        pr_log_pri(PR_LOG_ERR, MODULE_VERSION ": the chroot rules cannot be read: login of '%s' refused",
                   login);
        return no_root;
    }
    if (rule_path == NULL) {
        return general_root;
    }
    if (root == NULL) {
        pr_log_pri(PR_LOG_ERR, MODULE_VERSION ": there is no folder '%s': login of '%s' refused", rule_path,
                   login);
        return no_root;
    }
    return root;
}

MODRET velt_pre_pass(cmd_rec* cmd) {
    const char* login = pr_table_get(session.notes, "mod_auth.orig-user", NULL);
    if (login == NULL || pr_auth_get_anon_config(cmd->tmp_pool, &login, NULL, NULL) != NULL) {
        return PR_DECLINED(cmd);
    }

    const config_rec* places = find_config(main_server->conf, CONF_PARAM, "VeltChrootRules", FALSE);
    const char* root = no_root;
    if (places != NULL && login != NULL) {
        root = root_of_login(cmd->tmp_pool, places, login);
    }

    (void)remove_config(main_server->conf, "DefaultRoot", FALSE);
    if (root != NULL) {
        config_rec* c = add_config_param_set(&main_server->conf, "DefaultRoot", 1, NULL);
        c->argv[0] = pstrdup(c->pool, root);
    }
    return PR_DECLINED(cmd);
}

/* usage: VeltChrootRules rules-file share-map */
MODRET set_velt_chroot_rules(cmd_rec* cmd) {
    CHECK_ARGS(cmd, 2);
    CHECK_CONF(cmd, CONF_ROOT);
    for (int i = 1; i <= 2; i++) {
        if (*(const char*)cmd->argv[i] != '/') {
            CONF_ERROR(cmd, "needs two absolute paths");
        }
    }
    (void)add_config_param_str(cmd->argv[0], 2, cmd->argv[1], cmd->argv[2]);
    return PR_HANDLED(cmd);
}

static int velt_sess_init(void) {
    const config_rec* c = find_config(main_server->conf, CONF_PARAM, "DefaultRoot", FALSE);
    if (c != NULL) {
        general_root = pstrdup(session.pool, c->argv[0]);
    }
    return 0;
}

static conftable velt_conftab[] = {
    {"VeltChrootRules", set_velt_chroot_rules, NULL},
    {NULL, NULL, NULL},
};

static cmdtable velt_cmdtab[] = {
    {PRE_CMD, C_PASS, G_NONE, velt_pre_pass, FALSE, FALSE, CL_AUTH, NULL},
    {0, NULL, NULL, NULL, FALSE, FALSE, 0, NULL},
};

module velt_chroot_module = {
    NULL, NULL, 0x20,           "velt_chroot",  velt_conftab, velt_cmdtab,
    NULL, NULL, velt_sess_init, MODULE_VERSION, NULL,         0,
};
