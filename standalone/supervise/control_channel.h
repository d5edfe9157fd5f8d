// How a supervisor is spoken to: one request and one answer over a Unix socket beside its state file.
#ifndef VELT_STANDALONE_SUPERVISE_CONTROL_CHANNEL_H
#define VELT_STANDALONE_SUPERVISE_CONTROL_CHANNEL_H

#include "base/result.h"
#include "base/unique_fd.h"
#include "standalone/supervise/daemon_order.h"

#include <chrono>
#include <filesystem>
#include <functional>
#include <optional>
#include <string>

namespace velt {

enum class Command {
    start, ///< make this order run; the answer comes when it does or cannot, and what ran then runs on
    pause, ///< end the listener only
    stop,  ///< end the listener and its sessions; the supervisor ends as well
    close, ///< end the listener only; the supervisor ends with the last of the sessions
};

struct ControlRequest {
    Command command = Command::stop;
    DaemonOrder order;        ///< for a start
    bool endSessions = false; ///< for a start: those that others left end; else they go on
};

/// A request as one message, and back. Fails when the message does not have this form.
std::string encodeRequest(const ControlRequest& request);
Result<ControlRequest> decodeRequest(const std::string& message);

/// The supervisor's end of the channel of a daemon; its socket is removed with it. Only root and the
/// supervisor's own user may speak to it.
class ControlListener {
public:
    static Result<ControlListener> open(const std::filesystem::path& folder, const std::string& daemon);
    ControlListener(ControlListener&&) = default;
    ~ControlListener();

    /// Readable when a request waits.
    int descriptor() const { return socket_.get(); }

    /// Takes one request and answers with what `handle` returns for it.
    void serve(const std::function<Result<SessionCount>(const ControlRequest&)>& handle);

private:
    ControlListener(const std::filesystem::path& folder, const std::string& daemon);

    std::filesystem::path folder_;
    std::string daemon_;
    UniqueFd socket_;
};

/// Sends the request to the daemon's supervisor, and returns its answer; nothing when no supervisor answers
/// in time. The error's message is a phrase, as everywhere in this folder: it continues "The FTP daemon does
/// not start: ".
std::optional<Result<SessionCount>> askSupervisor(const std::filesystem::path& folder,
                                                  const std::string& daemon, const ControlRequest& request,
                                                  std::chrono::milliseconds limit);

/// The error's message of a supervisor that does not know the request: one of another version.
inline constexpr const char* unknownRequest = "unknown request";

} // namespace velt

#endif
