// The parameters of an FTP "set": which keys there are, and what their values must be.
#ifndef VELT_FTP_PARAMETERS_H
#define VELT_FTP_PARAMETERS_H

#include <json/value.h>

/// The key that carries the UTF-8 setting, which the API version decides.
const char* utf8Key(int version);

/// Whether the two service switches are booleans and every optional key that is present has its type. The
/// UTF-8 key is not looked at.
bool haveFTPTypes(const Json::Value& params);

/// Whether the UTF-8 key of the version is absent or has its type.
bool hasUtf8Type(const Json::Value& params, int version);

/// Whether the UTF-8 key of the version, of the right type, is absent or has a value of its set.
bool hasUtf8Value(const Json::Value& params, int version);

/// Whether a text is present and empty.
bool hasEmptyText(const Json::Value& params, const char* key);

/// "first:last" as two numbers. An end that cannot be read is 0.
struct ParsedRange {
    int first = 0;
    int last = 0;
    int matched = 0; ///< how many of the two could be read
};

/// Reads the text of "custom_port".
ParsedRange parseRange(const Json::Value& text);

#endif
