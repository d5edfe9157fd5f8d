// Sessions as JSON.
#ifndef VELT_HOST_API_SESSION_TEXT_H
#define VELT_HOST_API_SESSION_TEXT_H

#include "standalone/standalone.h"

#include <string>
#include <vector>

namespace velt::host {

/// One object. Put together as text: a thousand sessions take some milliseconds, and as JSON values three
/// times that.
std::string toJsonText(const OpenSession& session);

/// {"sessions": [...]} with those of which `isWanted` is true.
template<class Condition>
std::string toJsonText(const std::vector<OpenSession>& sessions, const Condition& isWanted) {
    std::string text;
    for (const OpenSession& session : sessions) {
        if (isWanted(session)) {
            text += (text.empty() ? "" : ",") + toJsonText(session);
        }
    }
    return "{\"sessions\":[" + text + "]}";
}

} // namespace velt::host

#endif
