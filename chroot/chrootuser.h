// Chroot users, those confined to their home folder over FTP: the web API
// "VELT.Core.FileServ.FTP.ChrootUser", version 1.
#ifndef VELT_CHROOT_CHROOTUSER_H
#define VELT_CHROOT_CHROOTUSER_H

#include "handler/handler.h"

class FTPChrootUserServiceHandler : public ServiceHandler {
public:
    FTPChrootUserServiceHandler(VELT::APIRequest* request, VELT::APIResponse* response);
    ~FTPChrootUserServiceHandler() = default;

    /// Answers with one page of the users who are, or are not, chroot users.
    void List();

    /// Makes users chroot users; answers with their names.
    void Add();

    /// Takes the chroot status from users.
    void Delete();

    /// Fills "total" (before paging) and "user" of `result`.
    bool ListUser(const Json::Value& params, Json::Value& result);

    /// Adds the users named in "id" and fills "chrootuser_id" of `result` with them.
    bool AddUser(const Json::Value& params, Json::Value& result);

    /// Deletes the users named in "id".
    bool DeleteUser(const Json::Value& params);
};

#endif
