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

/// What a value has to be: "a number from 1 to 65535", "on or off".
std::string expectation(const Setting& setting, BooleanWords words);

/// What there is to know about the values: "seconds, 0 to 2147483647, default 300".
std::string valueFacts(const Setting& setting, BooleanWords words);

} // namespace velt::schema

#endif
