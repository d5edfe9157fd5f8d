// Putting JSON values together.
#ifndef VELT_BASE_JSON_VALUE_H
#define VELT_BASE_JSON_VALUE_H

#include <json/value.h>

#include <initializer_list>
#include <utility>

namespace velt {

/// An object with these members.
inline Json::Value jsonObject(std::initializer_list<std::pair<const char*, Json::Value>> members) {
    Json::Value object(Json::objectValue);
    for (const auto& [key, value] : members) {
        object[key] = value;
    }
    return object;
}

/// An array with the value that `valueOf` gives for each of the elements.
template<class Elements, class Function>
Json::Value jsonArray(const Elements& elements, const Function& valueOf) {
    Json::Value array(Json::arrayValue);
    for (const auto& each : elements) {
        array.append(valueOf(each));
    }
    return array;
}

} // namespace velt

#endif
