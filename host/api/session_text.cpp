#include "host/api/session_text.h"

#include "base/utc_text.h"

#include <json/writer.h>

#include <concepts>
#include <string_view>

namespace velt::host {

namespace {

/// A JSON object, member by member.
class ObjectText {
public:
    void add(const char* key, const std::string& value) {
        begin(key) += Json::valueToQuotedString(value.c_str());
    }
    void add(const char* key, TimePoint time) { add(key, timestamp(time)); }
    void add(const char* key, std::same_as<bool> auto value) { begin(key) += value ? "true" : "false"; }
    void add(const char* key, std::uint64_t value) { begin(key) += std::to_string(value); }
    /// A value that is JSON already.
    void addJson(const char* key, std::string_view json) { begin(key) += json; }

    std::string finished() const { return text_ + '}'; }

private:
    std::string& begin(const char* key) {
        text_ += text_.empty() ? "{\"" : ",\"";
        text_ += key;
        return text_ += "\":";
    }

    std::string text_;
};

std::string toJsonText(const RunningTransfer& transfer) {
    ObjectText object;
    object.add("direction", std::string(transfer.upload ? "upload" : "download"));
    object.add("path", transfer.path);
    object.add("octets", transfer.octets);
    object.add("since", transfer.since);
    return object.finished();
}

} // namespace

std::string toJsonText(const OpenSession& session) {
    ObjectText object;
    object.add("id", session.id);
    object.add("protocol", std::string(protocolName(session.protocol)));
    object.add("security", session.security);
    object.add("user", session.user);
    object.add("account", session.account);
    object.add("address", session.address);
    object.add("since", session.since);
    object.add("idle_since", session.idleSince);
    object.add("busy", session.busy);
    object.add("command", session.command);
    object.add("path", session.path);
    object.addJson("transfer", session.transfer ? toJsonText(*session.transfer) : "null");
    object.add("octets_in", session.octetsIn);
    object.add("octets_out", session.octetsOut);
    object.add("rate", session.rate);
    object.add("current", session.current);
    return object.finished();
}

} // namespace velt::host
