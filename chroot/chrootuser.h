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

    /// Fills "total" (before paging) and "user" of `result`. An offset outside the list stands for 0, a limit
    /// of -1 for the rest of the list; any other negative limit gives an empty page.
    bool ListUser(const Json::Value& params, Json::Value& result);

    /// Adds the users named in "id" and fills "chrootuser_id" of `result` with them. Elements that are no
    /// text are left out; when nothing is left, there is no platform call.
    bool AddUser(const Json::Value& params, Json::Value& result);

    /// Deletes the users named in "id", with the same rules for its elements.
    bool DeleteUser(const Json::Value& params);
};

#endif
