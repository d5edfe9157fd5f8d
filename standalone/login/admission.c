#include "standalone/login/admission.h"

#include "privs.h"

#include "standalone/login/client_address.h"
#include "standalone/login/stranger.h"

static const char* const loopback[] = {"127.0.0.0/8", "::1", NULL};

/* Held until the login. */
static int place = -1;

modret_t* velt_set_spared(cmd_rec* cmd) {
    CHECK_ARGS(cmd, 1);
    CHECK_CONF(cmd, CONF_ROOT);
    (void)add_config_param_str(cmd->argv[0], 1, cmd->argv[1]);
    return PR_HANDLED(cmd);
}

static int is_spared(const struct in6_addr* address) {
    for (const char* const* network = loopback; *network != NULL; network++) {
        if (velt_is_in_network(address, *network)) {
            return TRUE;
        }
    }
    config_rec* c = find_config(main_server->conf, CONF_PARAM, "VeltSpared", FALSE);
    for (; c != NULL; c = find_config_next(c, c->next, CONF_PARAM, "VeltSpared", FALSE)) {
        if (velt_is_in_network(address, c->argv[0])) {
            return TRUE;
        }
    }
    return FALSE;
}

/* Beside the list of sessions, which all daemons of the service share as well. */
static int count(const struct in6_addr* address) {
    char file[PR_TUNABLE_PATH_MAX];
    int descriptor = -1;
    int reason = ENAMETOOLONG;

    if (snprintf(file, sizeof(file), "%s.strangers", pr_get_scoreboard()) < (int)sizeof(file)) {
        PRIVS_ROOT
        descriptor = velt_count_stranger(file, address);
        reason = errno;
        PRIVS_RELINQUISH
    }
    errno = reason;
    return descriptor;
}

void velt_admit(void) {
    struct in6_addr address;

    if (!velt_read_address(session.c->remote_addr, &address)) {
        return;
    }
    place = count(&address);
    int reason = errno;
    if (place >= 0 || is_spared(&address)) {
        return;
    }
    if (reason != EAGAIN) {
        pr_log_pri(PR_LOG_WARNING, "connections without a login cannot be counted: %s", strerror(reason));
        return;
    }
    pr_log_pri(PR_LOG_NOTICE, "refused a connection from %s: %d of this address are not logged in",
               pr_netaddr_get_ipstr(session.c->remote_addr), velt_most_strangers);
    pr_response_send(R_421, "Too many connections from your address are not logged in.");
    pr_session_end(0);
}

void velt_note_login(void) {
    if (place >= 0) {
        (void)close(place);
        place = -1;
    }
}
