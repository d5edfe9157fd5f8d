// One thing that a session did, or that happened to it, as it was recorded.
#ifndef VELT_STANDALONE_ACTIVITY_OPERATION_RECORD_H
#define VELT_STANDALONE_ACTIVITY_OPERATION_RECORD_H

#include <chrono>
#include <cstdint>
#include <optional>
#include <string>
#include <string_view>

namespace velt {

enum class SessionProtocol {
    ftp,
    ftps,
    sftp
};

/// "ftp", "ftps", "sftp".
std::string_view protocolName(SessionProtocol protocol);
std::optional<SessionProtocol> protocolNamed(std::string_view name);

enum class Operation {
    loginRefused,  ///< has no session; the reason says of which kind: "password", "configuration", "banned",
                   ///< "limit"
    sessionOpened, ///< with the login
    sessionClosed, ///< the reason says why; octets and duration are those of the whole session
    upload,
    download,
    remove, ///< of a file or link
    rename, ///< of a file or folder; the new name is in newPlace
    makeFolder,
    removeFolder,
    changeMode, ///< the new mode is in detail, in octal
    changeOwner,
    changeTimes,
    makeLink, ///< a hard one has its new name in newPlace, a symbolic one its target in detail
    cutFile,  ///< to another length, which is in octets
};

/// "login-refused", "session-opened", "session-closed", "upload", "download", "delete", "rename",
/// "make-folder", "remove-folder", "mode", "owner", "times", "link", "truncate".
std::string_view operationName(Operation operation);
std::optional<Operation> operationNamed(std::string_view name);

enum class OperationResult {
    done,
    incomplete, ///< a transfer that ended before its end
    refused,
};

/// "done", "incomplete", "refused".
std::string_view operationResultName(OperationResult result);
std::optional<OperationResult> operationResultNamed(std::string_view name);

/// A file or folder. Names are UTF-8. Where one is not, all texts of its record have '%' and each octet that
/// is not part of UTF-8 as "%XX", and the record says that it is escaped.
struct RecordedPlace {
    std::string path;       ///< as the session sees it, from its root directory
    std::string serverPath; ///< on the server, or "" when that is not known
    std::string share;      ///< the innermost share that it lies in, or ""
    std::string sharePath;  ///< within that share, "" for its own folder

    bool operator==(const RecordedPlace&) const = default;
};

struct OperationRecord {
    using TimePoint = std::chrono::system_clock::time_point;

    std::int64_t id = 0; ///< of the store; 0 for what has not been stored
    TimePoint time;      ///< of its end, in microseconds
    Operation operation = Operation::upload;
    OperationResult result = OperationResult::done;
    std::string reason;      ///< why it was refused or incomplete, in words
    std::string session;     ///< the id of the session
    std::int64_t number = 0; ///< within the session: two records never have both in common
    SessionProtocol protocol = SessionProtocol::ftp;
    std::string user;    ///< the name of the login
    std::string account; ///< the Unix name whose rights counted
    std::string address; ///< the client's
    RecordedPlace place;
    RecordedPlace newPlace; ///< of a rename or link
    std::string detail;     ///< what else belongs to the operation; of a session its TLS or SSH version
    std::optional<std::uint64_t> octets;               ///< of a transfer, those that were moved
    std::optional<std::uint64_t> octetsIn;             ///< of a session that closed: uploaded,
    std::optional<std::uint64_t> octetsOut;            ///< and downloaded
    std::optional<std::chrono::microseconds> duration; ///< of a transfer or session
    std::uint64_t leftOut = 0; ///< refused operations of the session since its last record that have none
    bool escaped = false;
    bool cut = false; ///< texts were too long, and are not whole
};

} // namespace velt

#endif
