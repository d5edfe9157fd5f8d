// A platform for tests: the whole contract between the module and its platform, defined at link time.
//
// What a setter of the contract stores, the getter gives back, so that a whole request runs over the
// fake as over a server. Every call is written to one journal, in order; any call can be made to fail or
// to throw; every list, map, share and loaded user is accounted for.
//
// Tests of a program that loads the module at run time must link the whole archive and export its
// symbols. Threads: one.
#ifndef VELT_TESTS_SUPPORT_FAKE_PLATFORM_FAKE_PLATFORM_H
#define VELT_TESTS_SUPPORT_FAKE_PLATFORM_FAKE_PLATFORM_H

#include "ftp/ftp_library.h"
#include "platform/sftp.h"
#include "platform/webapi.h"

#include <json/value.h>

#include <map>
#include <memory>
#include <optional>
#include <set>
#include <stdexcept>
#include <string>
#include <utility>
#include <vector>

namespace fake {

class HandleTable;

struct LastError {
    int number = 0;
    std::string file;
    int line = 0;
};

struct ShareState {
    std::string comment;
    std::string path;
    int privilege = 2; ///< the effective code that every account has on the share
};

/// Where users come from, as the enumerators of the chroot users count the sources.
inline constexpr int sourceLocal = 1;
inline constexpr int everySource = 11;

struct UserState {
    std::string descr;
    int uid = 0;
    int source = everySource;                         ///< the sources that list the user
    std::optional<std::string> domain = std::nullopt; ///< nullopt: any domain; "": none
};

/// One captured line of the system log.
struct LogLine {
    int priority = 0;
    std::string format;
    std::string source;   ///< the argument of the leading "%s"; empty when the format has none
    int line = 0;         ///< the argument of the "%d" after it
    std::string rendered; ///< the text as the system log would show it
};

/// What a test sets up and what the contract's setters change.
struct State {
    _tag_VELT_FTP_CONF_ conf = defaultConf(); ///< port "21", all else 0
    int timeout = 300;
    int useUtf8 = 0;
    int fips = 0;
    int ascii = 0;
    int umask = 0;
    VELT_FTP_PORT_RANGE defaultRange = {55536, 55899};

    /// The key "ftp_ext_ip" of the system information file; nullopt: the file has no such key.
    std::optional<std::string> extIp;
    /// The other keys of that file. No other file exists: reading from one fails.
    std::map<std::string, std::string> infoKeys;
    /// What a test sets stays. Where it set no number, a look-up of a share, user, group or rule that finds
    /// nothing sets one.
    LastError lastError;

    /// What VLIBServiceIsEnabled answers, 0 for a service not named. A run key of 1 and VLIBServiceStart set
    /// 1, a run key of 2 and VLIBServiceStop set 0; VELTFTPConfSet and VELTSFTPConfigSet set what they store.
    std::map<std::string, int> services;
    std::map<std::string, int> runKeys;
    std::set<std::string> running; ///< what was started and not stopped
    std::set<std::string> paused;

    _tag_VELT_SFTP_CONFIG_ sftp = {0, {0x51, 0x52, 0x53, 0x54}, 22, {0x55, 0x56}};
    int sftpAlive = 0; ///< follows VLIBServiceStart and VLIBServiceStop of "sftp"

    std::map<std::string, ShareState> shares;
    std::vector<std::string> ftpShares; ///< what VELTFTPShareEnum lists, whatever the mask
    /// Both are narrowed by the substring; by source and domain only those who stand in `users`.
    std::vector<std::string> chrootUsers;
    std::vector<std::string> nonChrootUsers;
    std::map<std::string, UserState> users; ///< for VELTUserGet, SDK::User and the rules
    std::map<std::string, int> groups;      ///< name to gid

    /// Stored rule lines, "user:<uid>:<path>" or "group:<gid>:<path>". A line of another form, or with
    /// an id that `users` or `groups` does not have, is not parsed.
    std::vector<std::string> rules;
    int userFlag = 1; ///< what the parser of a rule gives for a user

    /// Ports by the service that holds them. A conflict is a port of the range that a service other
    /// than the asking one holds, here or in storedPorts.
    std::map<std::string, std::set<int>> takenPorts;
    /// The same for "ftp" and "ssh", as VELTFTPConfSet and VELTSFTPConfigSet stored their ports; nothing
    /// before.
    std::map<std::string, std::vector<VELT_FTP_PORT_RANGE>> storedPorts;

    bool journalListGets = false; ///< VLIBCSzListGet
    /// VLIBCErrGet, VLIBCErrorGetFile, VLIBCErrorGetLine. Off by default: the log line that asks for them
    /// shows what they gave.
    bool journalErrorGets = false;

    bool unknownUsersAreRefused = false; ///< as chroot users; tests whose users have no records leave it off
    bool enumeratorsReplaceList = false; ///< a new list stands where the old one stood
    bool failedEnumeratorsReplaceList = false; ///< the same when the enumerator was made to fail
    bool pushMovesList = false;                ///< every push moves the list; a full list always moves
    bool hashMoves = false;                    ///< every VLIBCSzHashSetValue moves the map
    bool failedShareGetLeavesShare = false;    ///< VELTShareGet leaves a share to free when it fails

    static _tag_VELT_FTP_CONF_ defaultConf();
};

/// What an operation throws when throwFrom says so.
class Thrown : public std::runtime_error {
public:
    using std::runtime_error::runtime_error;
};

class Platform : public State {
public:
    static constexpr int everyCall = 0;

    static Platform& instance();

    /// Back to the default state: empty journal, nothing scripted, nothing accounted. Handles of the
    /// time before are freed and must not be used any more.
    void reset();

    /// Every call of the contract and every syslog line, in order, one line each: "Name(arguments)".
    ///
    /// Texts are quoted, null is null, JSON is compact. An output buffer is left out (its size is not);
    /// a handle passed by address shows what stands there when the call begins. Handles are named
    /// list1, map1, share1, sdkuser1, user1, group1 in the order of their making. A list or map that
    /// moves or is replaced keeps its name, so that the journal does not depend on moves; an address that
    /// is no longer valid shows as "list1 (moved)" or "list1 (freed)".
    ///
    /// VELTFTPConfSet shows the fields that differ from the stored record. A list that is an input shows
    /// as: list1 flags=16 ["a", "b"]; one that is pushed to shows its flags when they are not 0. A syslog
    /// line shows the priority, the format, the source name and the arguments after the line number; the
    /// number itself shows only when it is not positive.
    std::vector<std::string> journal;

    std::vector<LogLine> logLines;

    /// The nth call of the operation since reset (or everyCall) is journalled and returns `result`
    /// without any effect. An allocator, SDK::User::LoadUser and VLIBCSzListGet return null,
    /// APIRequest::GetParam its default. Operations are named as in the journal; an unknown name throws
    /// std::invalid_argument.
    void fail(const std::string& operation, int nth = 1, int result = -1);

    /// The nth call of the operation is journalled and throws Thrown, without any effect. Not for the
    /// operations that free: owners call them from destructors.
    void throwFrom(const std::string& operation, int nth = 1);

    /// What fail and throwFrom asked for and no call met: "VELTFTPConfSet #2".
    std::vector<std::string> unmetScripts() const;

    /// Calls of the operation since reset, also those that are not journalled.
    int count(const std::string& operation) const;

    /// The journal's lines that begin with `prefix`, in order.
    std::vector<std::string> callsTo(const std::string& prefix) const;

    /// The operation of a journal line: what stands before its "(".
    static std::string operationOf(const std::string& journalLine);

    /// All operations that fail and throwFrom know.
    static const std::vector<std::string>& operations();

    /// Empty when every list, map, share and loaded user was freed once and used only before that.
    /// Otherwise one line for each that is still live, was freed twice, or was used after its end.
    std::vector<std::string> handleErrors() const;

    /// VELT_USER and VELT_GROUP records made since reset. The platform owns them; a record that is handed
    /// in is filled anew, so one request makes at most one of each.
    int userRecords() const;
    int groupRecords() const;

    /// For the operations themselves: counts and journals a call, and throws or returns a result when
    /// the test asked for it.
    std::optional<int> enter(const std::string& operation, const std::string& arguments,
                             bool journalled = true);
    /// For those that find nothing: sets the last error, unless the test did, and returns a negative result.
    int notFound(const char* file, int line);
    HandleTable& handles() { return *handles_; }

private:
    struct Script {
        std::string operation;
        int nth;
        std::optional<int> result; ///< nullopt: throw
        bool met = false;
    };

    Platform();
    ~Platform();
    void addScript(Script script);

    std::vector<Script> scripts_;
    std::map<std::string, int> counts_;
    std::unique_ptr<HandleTable> handles_;
};

/// A request with the parameters that a test gives it.
class Request : public VELT::APIRequest {
public:
    Request() : params(Json::objectValue) {}
    explicit Request(Json::Value parameters) : params(std::move(parameters)) {}

    Json::Value params;
};

struct Answer {
    bool success = false;
    int code = 0; ///< 0 for a success
    Json::Value data;
};

/// A response that keeps what it was given, also when it is given more than one answer.
class Response : public VELT::APIResponse {
public:
    std::vector<Answer> answers;
};

} // namespace fake

#endif
