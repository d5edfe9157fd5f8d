#include "cli/event_text.h"

#include "cli/json_io.h"
#include "cli/size_text.h"

#include <array>

namespace velt::cli {

namespace {

/// " (reason)"; "" without one.
std::string inBrackets(const std::string& text) {
    return text.empty() ? "" : " (" + text + ")";
}

std::string ofService(const Json::Value& data) {
    return textAt(data, "service") + ": " + textAt(data, "action");
}

std::string ofLog(const Json::Value& data) {
    return textAt(data, "event") + " " + textAt(data, "text") + inBrackets(textAt(data, "actor"));
}

std::string ofChange(const Json::Value& data) {
    const std::string id = textAt(data, "id");
    return textAt(data, "way") + " by " + textAt(data, "actor") + (id.empty() ? "" : " (change " + id + ")");
}

/// "anna from 192.0.2.1 by sftp"
std::string who(const Json::Value& data) {
    return textAt(data, "user") + " from " + textAt(data, "address") + " by " + textAt(data, "protocol");
}

std::string ofSession(const Json::Value& data) {
    return textAt(data, "action") + ": " + who(data) + inBrackets(textAt(data, "reason"));
}

std::string ofTransfer(const Json::Value& data) {
    std::string text = textAt(data, "operation") + " " + textAt(data, "action") + ": " +
                       textAt(data, "path") + " of " + who(data);
    if (data["octets"].isIntegral()) {
        text += ", " + sizeText(data["octets"].asUInt64());
    }
    if (data["rate"].isIntegral() && data["rate"].asUInt64() > 0) {
        text += ", " + sizeText(data["rate"].asUInt64()) + "/s";
    }
    return text + inBrackets(textAt(data, "reason"));
}

std::string ofOperation(const Json::Value& data) {
    const std::string target = textAt(data, "new_path");
    return textAt(data, "operation") + " " + textAt(data, "result") + ": " + textAt(data, "path") +
           (target.empty() ? "" : " -> " + target) + " of " + who(data) + inBrackets(textAt(data, "reason"));
}

struct Kind {
    const char* name;
    std::string (*describe)(const Json::Value& data);
};

constexpr std::array<Kind, 6> kinds{{{"service", ofService},
                                     {"log", ofLog},
                                     {"change", ofChange},
                                     {"session", ofSession},
                                     {"transfer", ofTransfer},
                                     {"operation", ofOperation}}};

} // namespace

std::string describeEvent(const std::string& event, const Json::Value& data) {
    for (const auto& [name, describe] : kinds) {
        if (event == name) {
            return describe(data);
        }
    }
    return displayValue(data);
}

} // namespace velt::cli
