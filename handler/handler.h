// The base of the service handlers: one request, one answer.
//
// An entry function builds a handler, calls one public method named after the API method, and destroys the
// handler. The method runs the request cycle: fetch the parameters, run the workers, answer. A worker
// returns true when it is done; before it returns false it logs the reason and, as a rule, sets an error
// code. The first code of a request wins, a failure without one is answered with ErrorCode::operationFailed.
// A failed request is written to the system log with its parameters. Exceptions of the JSON library and of
// the framework pass through to the framework.
//
// A handler owns nothing and belongs to the thread that runs its entry function.
#ifndef VELT_HANDLER_HANDLER_H
#define VELT_HANDLER_HANDLER_H

#include "platform/webapi.h"

#include <json/value.h>
#include <json/writer.h>

/// The codes with which a request fails.
struct ErrorCode {
    static constexpr int none = 0;
    static constexpr int badParameter = 1901;    ///< missing, of the wrong type, or outside its set
    static constexpr int operationFailed = 1902; ///< a platform call or a rule; also the default
    static constexpr int ftpPortConflict = 1903;
    static constexpr int passivePortConflict = 1904;
    static constexpr int shareNotAccessible = 1905;
    static constexpr int sftpPortConflict = 1951;
};

// FastWriter's one line of compact JSON ends in a newline, which readers of the log parse; its successor
// leaves that newline out.
#pragma GCC diagnostic push
#pragma GCC diagnostic ignored "-Wdeprecated-declarations"
/// Renders the parameters of a failed request for the log.
using RequestWriter = Json::FastWriter;
#pragma GCC diagnostic pop

class ServiceHandler {
public:
    ServiceHandler(VELT::APIRequest* request, VELT::APIResponse* response);
    ServiceHandler(VELT::APIRequest* request, VELT::APIResponse* response, int version);
    ~ServiceHandler() = default;
    ServiceHandler(const ServiceHandler&) = delete;
    ServiceHandler& operator=(const ServiceHandler&) = delete;

    /// Records the code to fail with; a code that is already there stays.
    void SetError(int code);

    /// Fails the request with the recorded code and null data.
    void ReportError();

    /// Fails the request with the recorded code and `data`.
    void ReportError(Json::Value& data);

    /// The request succeeded, without data.
    void ReportSuccess();

    /// The request succeeded with `data`.
    void ReportSuccess(const Json::Value& data);

protected:
    /// All parameters of the request as one JSON object.
    Json::Value fetchParams();

    VELT::APIRequest* request_;
    VELT::APIResponse* response_;
    int version_;
    int errorCode_;
};

#endif
