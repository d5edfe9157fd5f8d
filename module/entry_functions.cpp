#include "module/entry_functions.h"

#include "chroot/chroot.h"
#include "chroot/chrootuser.h"
#include "ftp/ftp.h"
#include "security/security.h"
#include "sftp/sftp.h"

void FTPGet(VELT::APIRequest* request, VELT::APIResponse* response) {
    FTPServiceHandler handler(request, response);
    handler.Get();
}

void FTPSet(VELT::APIRequest* request, VELT::APIResponse* response) {
    FTPServiceHandler handler(request, response);
    handler.Set();
}

void FTPGetV2(VELT::APIRequest* request, VELT::APIResponse* response) {
    FTPServiceHandler handler(request, response, 2);
    handler.Get();
}

void FTPSetV2(VELT::APIRequest* request, VELT::APIResponse* response) {
    FTPServiceHandler handler(request, response, 2);
    handler.Set();
}

void FTPGetV3(VELT::APIRequest* request, VELT::APIResponse* response) {
    FTPServiceHandler handler(request, response, 3);
    handler.Get();
}

void FTPSetV3(VELT::APIRequest* request, VELT::APIResponse* response) {
    FTPServiceHandler handler(request, response, 3);
    handler.Set();
}

void FTPSecurityGet(VELT::APIRequest* request, VELT::APIResponse* response) {
    FTPSecurityServiceHandler handler(request, response);
    handler.Get();
}

void FTPSecuritySet(VELT::APIRequest* request, VELT::APIResponse* response) {
    FTPSecurityServiceHandler handler(request, response);
    handler.Set();
}

void FTPSecurityShareGet(VELT::APIRequest* request, VELT::APIResponse* response) {
    FTPSecurityServiceHandler handler(request, response);
    handler.GetShare();
}

void FTPChrootUserList(VELT::APIRequest* request, VELT::APIResponse* response) {
    FTPChrootUserServiceHandler handler(request, response);
    handler.List();
}

void FTPChrootUserAdd(VELT::APIRequest* request, VELT::APIResponse* response) {
    FTPChrootUserServiceHandler handler(request, response);
    handler.Add();
}

void FTPChrootUserDelete(VELT::APIRequest* request, VELT::APIResponse* response) {
    FTPChrootUserServiceHandler handler(request, response);
    handler.Delete();
}

void FTPChrootUserLoad(VELT::APIRequest* request, VELT::APIResponse* response) {
    FTPChrootServiceHandler handler(request, response);
    handler.Load();
}

void FTPChrootUserSave(VELT::APIRequest* request, VELT::APIResponse* response) {
    FTPChrootServiceHandler handler(request, response);
    handler.Save();
}

void SFTPGet(VELT::APIRequest* request, VELT::APIResponse* response) {
    SFTPServiceHandler handler(request, response);
    handler.Get();
}

void SFTPSet(VELT::APIRequest* request, VELT::APIResponse* response) {
    SFTPServiceHandler handler(request, response);
    handler.Set();
}
