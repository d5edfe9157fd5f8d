#include "cli/server_events.h"

#include "cli/failure.h"

#include <ostream>

namespace velt::cli {

void EventStream::feed(std::string_view piece) {
    for (const char c : piece) {
        if (c != '\n') {
            line_ += c;
            continue;
        }
        if (!line_.empty() && line_.back() == '\r') {
            line_.pop_back();
        }
        takeLine(line_);
        line_.clear();
    }
}

void EventStream::takeLine(std::string_view line) {
    if (line.empty()) {
        if (hasData_) {
            handler_(event_.empty() ? "message" : event_, data_);
        }
        event_.clear();
        data_.clear();
        hasData_ = false;
        return;
    }
    const std::size_t colon = line.find(':'); // first of a line: a comment, such as a heartbeat
    const std::string_view field = line.substr(0, colon);
    std::string_view value = colon == std::string_view::npos ? std::string_view() : line.substr(colon + 1);
    if (!value.empty() && value.front() == ' ') {
        value.remove_prefix(1);
    }
    if (field == "event") {
        event_ = value;
    } else if (field == "data") {
        data_ += hasData_ ? "\n" : "";
        data_ += value;
        hasData_ = true;
    }
}

namespace {

std::string eventsPath(const std::vector<std::string>& kinds) {
    std::string path = "/events";
    for (const std::string& kind : kinds) {
        path += (&kind == &kinds.front() ? "?kinds=" : ",") + kind;
    }
    return path;
}

} // namespace

void followEvents(Context& context, const std::vector<std::string>& kinds,
                  const std::function<void()>& onOpen,
                  const std::function<bool(const std::string& event, const std::string& data)>& onEvent) {
    bool open = false;
    bool done = false;
    EventStream stream([&](const std::string& event, const std::string& data) {
        done = done || !onEvent(event, data) || !context.console.out.good();
    });
    context.console.watchInterruptions();
    context.api.follow(
        eventsPath(kinds),
        [&](std::string_view piece) {
            if (!open) {
                open = true;
                onOpen();
            }
            stream.feed(piece);
            return !done;
        },
        context.console.interrupted);
    if (!done && !context.console.interrupted()) {
        throw Failure(ExitCode::access, "The server closed the stream of events.",
                      "Check with 'veltctl status' that it runs, then try again.");
    }
}

} // namespace velt::cli
