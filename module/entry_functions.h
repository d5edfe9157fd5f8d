// The entry functions: one for each row of the API table. Each builds the handler of its API on its stack,
// calls one public method of it, and destroys it. What the handler lets pass, an exception too, reaches
// the framework.
#ifndef VELT_MODULE_ENTRY_FUNCTIONS_H
#define VELT_MODULE_ENTRY_FUNCTIONS_H

#include "platform/webapi.h"

void FTPGet(VELT::APIRequest* request, VELT::APIResponse* response);
void FTPSet(VELT::APIRequest* request, VELT::APIResponse* response);
void FTPGetV2(VELT::APIRequest* request, VELT::APIResponse* response);
void FTPSetV2(VELT::APIRequest* request, VELT::APIResponse* response);
void FTPGetV3(VELT::APIRequest* request, VELT::APIResponse* response);
void FTPSetV3(VELT::APIRequest* request, VELT::APIResponse* response);

void FTPSecurityGet(VELT::APIRequest* request, VELT::APIResponse* response);
void FTPSecuritySet(VELT::APIRequest* request, VELT::APIResponse* response);
void FTPSecurityShareGet(VELT::APIRequest* request, VELT::APIResponse* response);

// One API name, two generations of data: version 1 works with chroot users, version 2 with chroot rules.
void FTPChrootUserList(VELT::APIRequest* request, VELT::APIResponse* response);
void FTPChrootUserAdd(VELT::APIRequest* request, VELT::APIResponse* response);
void FTPChrootUserDelete(VELT::APIRequest* request, VELT::APIResponse* response);
void FTPChrootUserLoad(VELT::APIRequest* request, VELT::APIResponse* response);
void FTPChrootUserSave(VELT::APIRequest* request, VELT::APIResponse* response);

void SFTPGet(VELT::APIRequest* request, VELT::APIResponse* response);
void SFTPSet(VELT::APIRequest* request, VELT::APIResponse* response);

#endif
