// What is said of a setting, to people.
#ifndef VELT_SCHEMA_SETTING_TEXT_H
#define VELT_SCHEMA_SETTING_TEXT_H

#include "schema/settings_table.h"

#include <string>

namespace velt::schema {

/// How the two values of a boolean are written.
struct BooleanWords {
    const char* on;
    const char* off;
    const char* either;
};

inline constexpr BooleanWords onOff{"on", "off", "on or off"};
inline constexpr BooleanWords zeroOne{"1", "0", "0 or 1"};
inline constexpr BooleanWords trueFalse{"true", "false", "true or false"};

/// The numbers that are meant: "1 to 65535", "0 or more"; "" where all are.
std::string rangeText(const Setting& setting);

/// What a value has to be: "a number from 1 to 65535", "on or off".
std::string expectation(const Setting& setting, BooleanWords words);

/// What there is to know about the values: "seconds, 0 to 86400, default 300".
std::string valueFacts(const Setting& setting, BooleanWords words);

} // namespace velt::schema

#endif
