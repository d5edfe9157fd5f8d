// What the platform library offers the program that loads the module over it, beside the contract.
//
// A host, at its start: openState, the subscriptions, undoUnfinishedChange, startServicesAtBoot,
// watchServices, startActivityReader. Then, for each request, on the thread that serves it: setRequestActor,
// clearLastError, around one that changes something a SettingsChange, the module's entry function, and after
// a failure lastErrorSentence or lastPortConflict for the answer.
//
// Unless it says otherwise a function may be called from any thread.
#ifndef VELT_STANDALONE_STANDALONE_H
#define VELT_STANDALONE_STANDALONE_H

// Taking a state root into use, starting and watching what is enabled.
#include "standalone/control/open_state.h"
#include "standalone/control/service_watch.h"
#include "standalone/control/start_services.h"

// The frame of a request: what it makes of stops and starts, and which sessions end.
#include "standalone/control/service_request.h"
// Changing the settings as a whole: preview, all or nothing.
#include "standalone/change/settings_change.h"

// Which services there are, which are down, and who holds a port.
#include "standalone/contract/last_port_conflict.h"
#include "standalone/control/service_overview.h"

// What is wrong, and what mends it.
#include "standalone/health/judge_health.h"

// On whose behalf, what happened, and what was written down.
#include "standalone/journal/admin_log.h"
#include "standalone/journal/catalogue.h"
#include "standalone/journal/change_history.h"
#include "standalone/journal/request_actor.h"
#include "standalone/journal/subscriptions.h"

// Who is logged in, what sessions did and do.
#include "standalone/activity/activity_reader.h"
#include "standalone/activity/operation_search.h"
#include "standalone/control/open_sessions.h"

// The settings of the platform, which no module knows.
#include "standalone/control/change_confinement.h"

// The chroot rules that a module cannot name.
#include "standalone/rules/unnamed_rules.h"

// What the logins of an account would see.
#include "standalone/login/access_report.h"

// Who is refused for a while after too many failed logins.
#include "standalone/bans/login_guard.h"

// The public keys with which users log in over SFTP.
#include "standalone/keys/stored_keys.h"

// The calling thread's last error in a sentence.
#include "standalone/contract/last_error.h"

// Listing effects instead of doing them, or failing them.
#include "standalone/core/effects.h"

#endif
