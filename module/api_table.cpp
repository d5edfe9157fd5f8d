#include "module/api_table.h"

#include "module/entry_functions.h"

const VELT::APITableRow gTable[17] = {
    {"VELT.Core.FileServ.FTP", 1, "get", FTPGet},
    {"VELT.Core.FileServ.FTP", 1, "set", FTPSet},
    {"VELT.Core.FileServ.FTP", 2, "get", FTPGetV2},
    {"VELT.Core.FileServ.FTP", 2, "set", FTPSetV2},
    {"VELT.Core.FileServ.FTP", 3, "get", FTPGetV3},
    {"VELT.Core.FileServ.FTP", 3, "set", FTPSetV3},
    {"VELT.Core.FileServ.FTP.Security", 1, "get", FTPSecurityGet},
    {"VELT.Core.FileServ.FTP.Security", 1, "set", FTPSecuritySet},
    {"VELT.Core.FileServ.FTP.Security", 1, "list_ftp_share", FTPSecurityShareGet},
    {"VELT.Core.FileServ.FTP.ChrootUser", 1, "list", FTPChrootUserList},
    {"VELT.Core.FileServ.FTP.ChrootUser", 1, "add", FTPChrootUserAdd},
    {"VELT.Core.FileServ.FTP.ChrootUser", 1, "delete", FTPChrootUserDelete},
    {"VELT.Core.FileServ.FTP.ChrootUser", 2, "load", FTPChrootUserLoad},
    {"VELT.Core.FileServ.FTP.ChrootUser", 2, "save", FTPChrootUserSave},
    {"VELT.Core.FileServ.FTP.SFTP", 1, "get", SFTPGet},
    {"VELT.Core.FileServ.FTP.SFTP", 1, "set", SFTPSet},
    {nullptr, 0, nullptr, nullptr},
};

const VELT::APITableRow* GetAPITable() {
    return &gTable[0];
}
