// The server-sent events of a stream, put together from pieces of any size.
#ifndef VELT_CLI_SERVER_EVENTS_H
#define VELT_CLI_SERVER_EVENTS_H

#include <functional>
#include <string>
#include <string_view>

namespace velt::cli {

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

} // namespace velt::cli

#endif
