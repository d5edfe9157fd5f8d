#include "standalone/login/refused_commands.h"

#include "standalone/login/place.h"

MODRET refuse_unique_name(cmd_rec* cmd) {
    struct velt_place place;

    /* Any name stands for the one that the daemon will make up. */
    if (velt_open_place(&place, "ftp", velt_changes_name) < 0) {
        return PR_ERROR_MSG(cmd, R_550, "Nothing may be changed in this folder");
    }
    velt_close_place(&place);
    return PR_DECLINED(cmd);
}

cmdtable velt_refused_commands[] = {
    {PRE_CMD, C_STOU, G_NONE, refuse_unique_name, TRUE, FALSE, 0, NULL},
    {0, NULL, NULL, NULL, FALSE, FALSE, 0, NULL},
};
