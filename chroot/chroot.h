// Chroot rules, each a user or group and the directory it is confined to over FTP: the web API
// "VELT.Core.FileServ.FTP.ChrootUser", version 2.
#ifndef VELT_CHROOT_CHROOT_H
#define VELT_CHROOT_CHROOT_H

#include "handler/handler.h"

class FTPChrootServiceHandler : public ServiceHandler {
public:
    FTPChrootServiceHandler(VELT::APIRequest* request, VELT::APIResponse* response);
    ~FTPChrootServiceHandler() = default;

    /// Answers with every stored rule, and whether its directory exists.
    void Load();

    /// Replaces all stored rules.
    void Save();

    /// Fills "total" and "rules" of `result`. Stored lines that cannot be read are left out.
    bool LoadRule(Json::Value& result);

    /// Stores "rules" in place of all stored rules. Rules of unknown users and groups are left out. Rules
    /// that are absent, null, a text, a number or a bool store an empty set; an object with members, or an
    /// element that is no object, passes the JSON library's exception, and nothing is stored.
    bool SaveRule(const Json::Value& params);
};

#endif
