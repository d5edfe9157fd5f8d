#include "host/module/waiting_requests.h"

#include <algorithm>
#include <utility>

namespace velt::host {

bool WaitingRequests::add(const std::string& caller, WaitingRequest request) {
    const std::size_t bytes = request.bytes;
    const auto line = std::ranges::find(lines_, caller, &Line::caller);
    if (line == lines_.end()) {
        Line first{caller, {}, bytes};
        first.requests.push_back(std::move(request));
        lines_.push_back(std::move(first));
        return true;
    }
    if (line->requests.size() >= most_ || line->bytes + bytes > mostBytes_) {
        return false;
    }
    line->requests.push_back(std::move(request));
    line->bytes += bytes;
    return true;
}

WaitingRequest WaitingRequests::takeNext() {
    Line& line = lines_.front();
    WaitingRequest next = std::move(line.requests.front());
    line.requests.pop_front();
    line.bytes -= next.bytes;
    if (line.requests.empty()) {
        lines_.pop_front();
    } else {
        lines_.splice(lines_.end(), lines_, lines_.begin());
    }
    return next;
}

} // namespace velt::host
