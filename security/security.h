// FTP security settings and the shares offered to FTP: the web API "VELT.Core.FileServ.FTP.Security",
// version 1.
#ifndef VELT_SECURITY_SECURITY_H
#define VELT_SECURITY_SECURITY_H

#include "ftp/ftp_library.h"
#include "handler/handler.h"

class FTPSecurityServiceHandler : public ServiceHandler {
public:
    FTPSecurityServiceHandler(VELT::APIRequest* request, VELT::APIResponse* response);
    ~FTPSecurityServiceHandler() = default;

    /// Answers with the current settings.
    void Get();

    /// Checks the parameters, applies what differs, restarts the daemons.
    void Set();

    /// Answers with the shares offered to FTP ("list_ftp_share").
    void GetShare();

    /// Fills `result` with the current settings.
    bool GetData(Json::Value& result);

    /// Checks the types of the parameters. Changes nothing.
    bool CheckData(const Json::Value& params);

    /// Applies checked parameters. Nothing is rolled back after a failure.
    bool SetData(const Json::Value& params);

    /// Fills "share" of `result` with the names of the shares offered to FTP, the home folders left out.
    /// Whether an account may reach them is not asked.
    bool GetShareData(Json::Value& result);

    /// Whether the account "ftp" can reach the share. Any failure is logged and means no; sets no error code.
    bool IsFTPShare(const char* share);

    /// Writes the administrator-log entries of a change.
    void LogChanges(_tag_VELT_FTP_CONF_* oldConf, _tag_VELT_FTP_CONF_* newConf);
};

#endif
