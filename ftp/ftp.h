// FTP and FTPS settings: the web API "VELT.Core.FileServ.FTP", versions 1 to 3.
//
// The versions differ in one key: version 1 has "enable_utf8" (the server supports UTF-8 names), version 2
// "use_utf8" (sessions use UTF-8 from the start), version 3 "utf8_mode" (0 none, 1 supported, 2 used). Any
// version above 3 behaves as 3, any below 2 as 1.
#ifndef VELT_FTP_FTP_H
#define VELT_FTP_FTP_H

#include "ftp/ftp_library.h"
#include "handler/handler.h"

class FTPServiceHandler : public ServiceHandler {
public:
    FTPServiceHandler(VELT::APIRequest* request, VELT::APIResponse* response);
    FTPServiceHandler(VELT::APIRequest* request, VELT::APIResponse* response, int version);
    ~FTPServiceHandler() = default;

    /// Answers with the current settings.
    void Get();

    /// Checks the parameters, applies what differs, restarts the services.
    void Set();

    /// Fills `result` with the current settings.
    bool GetData(Json::Value& result);

    /// Checks presence and types of the parameters, and port collisions. Changes nothing.
    bool CheckData(const Json::Value& params);

    /// Applies checked parameters. Nothing is rolled back after a failure.
    bool SetData(const Json::Value& params);

    /// Fills "custom_port_range" and "custom_port" ("first:last"; the default range without a custom one).
    void GetCustomPortConf(Json::Value& result, const _tag_VELT_FTP_CONF_& conf);

    /// Stages the custom passive range; sets `reloadFirewall` when it differs. Returns how many numbers
    /// of "custom_port" could be read, 0 when it was not looked at.
    int SetCustomPortConf(const Json::Value& params, const _tag_VELT_FTP_CONF_& oldConf,
                          _tag_VELT_FTP_CONF_& newConf, bool& reloadFirewall);

    /// Fills `buffer` of `size` bytes with the external address, "" when none is set. A failure is logged;
    /// sets no error code.
    bool GetExtIP(char* buffer, int size);

    /// Writes the administrator-log entries of a change. `wasEnabled` is 1 when FTP or FTPS was enabled
    /// before it, `nowEnabled` is 1 when the stored record has any bit of service_flags set; the records are
    /// the one read and the one stored.
    void LogChanges(int wasEnabled, int nowEnabled, _tag_VELT_FTP_CONF_* oldConf,
                    _tag_VELT_FTP_CONF_* newConf);
};

#endif
