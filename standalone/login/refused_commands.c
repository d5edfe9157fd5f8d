#include "standalone/login/refused_commands.h"

#include "standalone/login/client_address.h"
#include "standalone/login/data_address.h"
#include "standalone/login/place.h"

/* Also in the form that UTF-8 gives to those above 0x7f. */
static int has_control_characters(const char* text) {
    for (const unsigned char* c = (const unsigned char*)text; *c != '\0'; c++) {
        if (*c < 0x20 || *c == 0x7f || (c[0] == 0xc2 && c[1] >= 0x80 && c[1] < 0xa0)) {
            return TRUE;
        }
    }
    return FALSE;
}

/* The name that USER gave is refused when the daemon has prepared for the command. */
static int name_is_refused = FALSE;

static modret_t* refusal(cmd_rec* cmd) {
    return PR_ERROR_MSG(cmd, R_501, "Control characters are not allowed here");
}

modret_t* velt_look_at_characters(cmd_rec* cmd) {
    const unsigned char* authenticated = get_param_ptr(main_server->conf, "authenticated", FALSE);

    name_is_refused = FALSE;
    if (authenticated != NULL && *authenticated != FALSE) {
        return PR_DECLINED(cmd);
    }
    /* A password is not logged, and may be anything. */
    const char* argument = cmd->arg != NULL && strcmp(cmd->argv[0], C_PASS) != 0 ? cmd->arg : "";
    if (!has_control_characters(cmd->argv[0]) && !has_control_characters(argument)) {
        return PR_DECLINED(cmd);
    }
    if (strcmp(cmd->argv[0], C_USER) != 0) {
        return refusal(cmd);
    }
    /* The daemon measures the time from its preparations for USER to the answer, to let all logins take the
     * same time. Without the preparations it would learn nonsense. */
    name_is_refused = TRUE;
    cmd->arg = pstrdup(cmd->pool, "?");
    return PR_DECLINED(cmd);
}

modret_t* velt_refuse_name(cmd_rec* cmd) {
    return name_is_refused ? refusal(cmd) : PR_DECLINED(cmd);
}

static int is_same(const struct in6_addr* address, const pr_netaddr_t* other) {
    struct in6_addr known;

    return velt_read_address(other, &known) && IN6_ARE_ADDR_EQUAL(address, &known);
}

static int is_inside(const struct in6_addr* address) {
    /* Under which this server is known outside, if that is another than its own. */
    const config_rec* c = find_config(main_server->conf, CONF_PARAM, "MasqueradeAddress", FALSE);
    struct in6_addr external;
    const int has_external = c != NULL && velt_read_address(c->argv[0], &external);

    return velt_is_inside(address, has_external ? &external : NULL);
}

modret_t* velt_refuse_data_to_the_inside(cmd_rec* cmd) {
    const config_rec* c = find_config(main_server->conf, CONF_PARAM, "AllowForeignAddress", FALSE);
    struct in6_addr address;

    /* Else the daemon takes no address but the client's own. */
    if (c == NULL || *(const int*)c->argv[0] == FALSE || cmd->argc != 2) {
        return PR_DECLINED(cmd);
    }
    int is_port = strcmp(cmd->argv[0], C_PORT) == 0;
    if (!(is_port ? velt_read_port : velt_read_eprt)(cmd->argv[1], &address)) {
        return PR_ERROR_MSG(cmd, R_501, "The address cannot be read");
    }
    if (is_same(&address, session.c->remote_addr) || !is_inside(&address)) {
        return PR_DECLINED(cmd);
    }
    pr_log_pri(PR_LOG_WARNING, "refused %s %s: an address of this server or of no host",
               (const char*)cmd->argv[0], (const char*)cmd->argv[1]);
    return PR_ERROR_MSG(cmd, R_501, "No data may be sent to this address");
}

modret_t* velt_refuse_unique_name(cmd_rec* cmd) {
    struct velt_place place;

    /* Any name stands for the one that the daemon will make up. */
    if (velt_open_place(&place, "ftp", velt_changes_name) < 0) {
        return PR_ERROR_MSG(cmd, R_550, "Nothing may be changed in this folder");
    }
    velt_close_place(&place);
    return PR_DECLINED(cmd);
}
