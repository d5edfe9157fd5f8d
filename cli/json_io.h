// JSON values as commands read and write them.
#ifndef VELT_CLI_JSON_IO_H
#define VELT_CLI_JSON_IO_H

#include "base/json_text.h"
#include "cli/console.h"

#include <json/value.h>

#include <iosfwd>
#include <string>

namespace velt::cli {

/// The value of a JSON file, or of the standard input for "-". Failure when it cannot be read (usage) or is
/// not JSON (refused).
Json::Value readJsonFile(Console& console, const std::string& name);

/// On one line, without a line end.
std::string compactJson(const Json::Value& value);

/// Indented by four spaces, with a line end.
void writeJson(std::ostream& out, const Json::Value& value);

/// A value as people read it: on and off for a bool, a text without quotes.
std::string displayValue(const Json::Value& value);

/// What an object has at the key, as displayValue; empty for a missing key, or when the value is not an
/// object.
std::string textAt(const Json::Value& object, const char* key);

} // namespace velt::cli

#endif
