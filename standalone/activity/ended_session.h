// Sessions that ended without being able to say so: killed, or with the machine's power.
#ifndef VELT_STANDALONE_ACTIVITY_ENDED_SESSION_H
#define VELT_STANDALONE_ACTIVITY_ENDED_SESSION_H

#include "standalone/activity/session_page.h"
#include "standalone/activity/session_pages.h"

namespace velt {

/// Writes into the spool what the session would have: the transfer that ran, as incomplete, and its end. Who
/// reads a record twice knows it by its number. False when that cannot be written.
bool recordEndedSession(const SessionName& name, const velt_session_page& page);

} // namespace velt

#endif
