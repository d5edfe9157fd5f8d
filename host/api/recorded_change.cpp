#include "host/api/recorded_change.h"

#include <json/reader.h>

#include <memory>

namespace velt::host {

Json::Value fieldsOf(const ChangeRecord& change) {
    Json::Value value;
    const std::unique_ptr<Json::CharReader> reader(Json::CharReaderBuilder().newCharReader());
    const char* const text = change.fields.data();
    return reader->parse(text, text + change.fields.size(), &value, nullptr) && value.isArray()
               ? value
               : Json::Value(Json::arrayValue);
}

std::vector<FieldChange> changesOf(const ChangeRecord& change) {
    std::vector<FieldChange> changes;
    for (const Json::Value& each : fieldsOf(change)) {
        changes.push_back({each["field"].asString(), each["from"], each["to"]});
    }
    return changes;
}

Json::Value& placeIn(Json::Value& document, const std::string& pointer) {
    const std::size_t slash = pointer.find('/', 1);
    Json::Value& section = document[pointer.substr(1, slash == std::string::npos ? slash : slash - 1)];
    return slash == std::string::npos ? section : section[pointer.substr(slash + 1)];
}

} // namespace velt::host
