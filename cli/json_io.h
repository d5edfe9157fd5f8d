// JSON values from text and to text.
#ifndef VELT_CLI_JSON_IO_H
#define VELT_CLI_JSON_IO_H

#include <json/value.h>

#include <iosfwd>
#include <optional>
#include <string>

namespace velt::cli {

/// The value of a JSON text, strictly read; nothing when it is none, with the reason in `problem`.
std::optional<Json::Value> parseJson(const std::string& text, std::string& problem);

/// On one line, without a line end.
std::string compactJson(const Json::Value& value);

/// Indented by four spaces, with a line end.
void writeJson(std::ostream& out, const Json::Value& value);

/// A value as people read it: on and off for a bool, a text without quotes.
std::string displayValue(const Json::Value& value);

/// The text or number at a key of an object, as text; empty when the value is no object or has no such key.
std::string textAt(const Json::Value& object, const char* key);

} // namespace velt::cli

#endif
