// How a supervisor is spoken to: one request and one answer over a Unix socket beside its state file.
#ifndef VELT_STANDALONE_SUPERVISE_CONTROL_CHANNEL_H
#define VELT_STANDALONE_SUPERVISE_CONTROL_CHANNEL_H

#include "standalone/supervise/daemon_process.h"

#include <chrono>
#include <filesystem>
#include <functional>
#include <optional>
#include <string>

namespace velt {

enum class Command {
    start, ///< make this order run; an answer comes when it does or cannot
    pause, ///< end the listener only
    stop,  ///< end the listener and its sessions; the supervisor ends as well
};

struct ControlRequest {
    Command command = Command::stop;
    DaemonOrder order; ///< for a start
};

/// A request as one message, and back; nothing when the message is not of this form.
std::string encodeRequest(const ControlRequest& request);
std::optional<ControlRequest> decodeRequest(const std::string& message);

/// The supervisor's end. Root and the supervisor's own user may speak to it.
class ControlListener {
public:
    ControlListener(std::filesystem::path directory, std::string service);
    ~ControlListener();
    ControlListener(const ControlListener&) = delete;
    ControlListener& operator=(const ControlListener&) = delete;

    /// Readable when a request waits; -1 when the socket could not be made.
    int descriptor() const { return descriptor_; }

    /// Takes one request, has it answered by `handle` ("" stands for success) and sends the answer.
    void serve(const std::function<std::string(const ControlRequest&)>& handle);

private:
    std::filesystem::path directory_;
    std::string service_;
    int descriptor_ = -1;
};

/// Sends the request to the service's supervisor and waits for its answer: "" on success, else the reason.
/// Nothing when no supervisor answers in time.
std::optional<std::string> askSupervisor(const std::filesystem::path& directory, const std::string& service,
                                         const ControlRequest& request, std::chrono::milliseconds limit);

} // namespace velt

#endif
