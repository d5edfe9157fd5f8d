// The server's events, as they happen.
#ifndef VELT_CLI_SERVER_EVENTS_H
#define VELT_CLI_SERVER_EVENTS_H

#include "cli/command.h"

#include <functional>
#include <string>
#include <string_view>
#include <vector>

namespace velt::cli {

/// Server-sent events, put together from pieces of any size.
class EventStream {
public:
    using Handler = std::function<void(const std::string& event, const std::string& data)>;

    explicit EventStream(Handler handler) : handler_(std::move(handler)) {}

    /// Takes the next piece and calls the handler for each event that it completes. Lines end with LF or CR
    /// LF.
    void feed(std::string_view piece);

private:
    void takeLine(std::string_view line);

    Handler handler_;
    std::string line_;
    std::string event_;
    std::string data_;
    bool hasData_ = false;
};

/// Asks for events of these kinds, or with none for the usual ones. Calls `onOpen` as soon as the server
/// sends events, then `onEvent` for each, until that returns false, the user interrupts or the output cannot
/// be written. Failure (access) when the server ends the stream before that.
void followEvents(Context& context, const std::vector<std::string>& kinds,
                  const std::function<void()>& onOpen,
                  const std::function<bool(const std::string& event, const std::string& data)>& onEvent);

} // namespace velt::cli

#endif
