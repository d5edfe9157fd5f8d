// The names of everything that a test can fail, throw from or count.

#include "tests/support/fake_platform/fake_platform.h"

#include <iterator>

namespace fake {

namespace {

constexpr const char* operationNames[] = {
    "APIRequest::GetParam",
    "APIResponse::SetSuccess",
    "APIResponse::SetError",
    "WebUtils::IsPortConflict",
    "SDK::User::LoadUser",
    "SDK::User::GetDesc",
    "SDK::User::Release",
    "VLIBCSzListAlloc",
    "VLIBCSzListGet",
    "VLIBCSzListPush",
    "VLIBCSzListFree",
    "VLIBCSzHashAlloc",
    "VLIBCSzHashSetValue",
    "VLIBCSzHashFree",
    "VLIBCFileGetKeyValue",
    "VLIBCINFOSetKeyValue",
    "VLIBCErrGet",
    "VLIBCErrorGetFile",
    "VLIBCErrorGetLine",
    "VLIBServiceIsEnabled",
    "VLIBServicectlStart",
    "VLIBServicectlStop",
    "VLIBServicecfgRunKeySet",
    "VLIBServiceStart",
    "VLIBServiceStop",
    "VLIBServicePause",
    "VLIBServiceResume",
    "VLIBSyseventEmit",
    "VELTFwRuleHup",
    "VELTLogSet1",
    "VELTFTPConfGet",
    "VELTFTPConfSet",
    "VELTFTPTimeOutGet",
    "VELTFTPTimeOutSet",
    "VELTFTPUseUTF8Get",
    "VELTFTPUseUTF8Set",
    "VELTFTPFIPSEnabledGet",
    "VELTFTPFIPSEnabledSet",
    "VELTFTPASCIIEnabledGet",
    "VELTFTPASCIIEnabledSet",
    "VELTFTPUmaskEnabledGet",
    "VELTFTPUmaskEnabledSet",
    "VELTFTPDefaultPassivePortGet",
    "VELTFTPShareEnum",
    "VELTFTPChrootUserEnum",
    "VELTFTPNonChrootUserEnum",
    "VELTFTPAddChrootUser",
    "VELTFTPDeleteChrootUser",
    "VELTFTPChrootRuleEnum",
    "VELTFTPChrootRuleParseToName",
    "VELTFTPChrootRuleFormat",
    "VELTFTPChrootRuleSave",
    "VELTShareGet",
    "VELTShareUGPrivGetLocal",
    "VELTShareFree",
    "VELTUserGet",
    "VELTGroupGet",
    "VELTSFTPConfigGet",
    "VELTSFTPConfigSet",
    "VELTSFTPIsAlive",
    "syslog",
};

} // namespace

const std::vector<std::string>& Platform::operations() {
    static const std::vector<std::string> names(std::begin(operationNames), std::end(operationNames));
    return names;
}

} // namespace fake
