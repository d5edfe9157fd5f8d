// What an event of the server tells people.
#ifndef VELT_CLI_EVENT_TEXT_H
#define VELT_CLI_EVENT_TEXT_H

#include <json/value.h>

#include <string>

namespace velt::cli {

/// In one line, which may hold any text of others.
std::string describeEvent(const std::string& event, const Json::Value& data);

} // namespace velt::cli

#endif
