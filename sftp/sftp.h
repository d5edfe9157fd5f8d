// SFTP settings: the web API "VELT.Core.FileServ.FTP.SFTP", version 1.
#ifndef VELT_SFTP_SFTP_H
#define VELT_SFTP_SFTP_H

#include "handler/handler.h"
#include "platform/sftp.h"

class SFTPServiceHandler : public ServiceHandler {
public:
    SFTPServiceHandler(VELT::APIRequest* request, VELT::APIResponse* response);
    SFTPServiceHandler(VELT::APIRequest* request, VELT::APIResponse* response, int version);
    ~SFTPServiceHandler() = default;

    /// Answers with whether the service runs, and its port.
    void Get();

    /// Checks the parameters and applies what differs.
    void Set();

    /// Fills `result`: "enable" is the live state of the service, not the stored flag.
    bool GetData(Json::Value& result);

    /// Checks types, the range of the port, and port collisions. Changes nothing.
    bool CheckData(const Json::Value& params);

    /// Applies checked parameters. Nothing is rolled back after a failure.
    bool SetData(const Json::Value& params);

    /// Writes the administrator-log entries of a change; none when SFTP ends up disabled.
    void LogChanges(_tag_VELT_SFTP_CONFIG_* oldConf, _tag_VELT_SFTP_CONFIG_* newConf);
};

#endif
