// The FTP configuration library: the record and the settings beside it.

#include "ftp/ftp_library.h"
#include "tests/support/fake_platform/fake_platform.h"
#include "tests/support/fake_platform/ftp_record.h"
#include "tests/support/fake_platform/text.h"

#include <cstdlib>
#include <cstring>

using fake::arguments;
using fake::Platform;
using fake::Verbatim;

namespace {

int getNumber(const char* operation, int value) {
    return Platform::instance().enter(operation, "").value_or(value);
}

int setNumber(const char* operation, int& stored, int value) {
    if (const auto failure = Platform::instance().enter(operation, arguments(value))) {
        return *failure;
    }
    stored = value;
    return 0;
}

/// What other operations answer follows from the stored record, until they are told otherwise.
void followRecord() {
    auto& platform = Platform::instance();
    const auto& conf = platform.conf;
    const int plain = (conf.service_flags & VELT_FTP_SERVICE_PLAIN) != 0 ? 1 : 0;
    const int tls = (conf.service_flags & VELT_FTP_SERVICE_TLS) != 0 ? 1 : 0;
    platform.services["ftpd"] = plain;
    platform.services["ftpd-pure"] = plain;
    platform.services["ftpd-ssl"] = tls;
    const std::string port(conf.portnum, ::strnlen(conf.portnum, sizeof conf.portnum));
    const int control = static_cast<int>(std::strtol(port.c_str(), nullptr, 10));
    const bool custom = conf.passive_port_min != 0 && conf.passive_port_max != 0;
    const VELT_FTP_PORT_RANGE passive{conf.passive_port_min, conf.passive_port_max};
    platform.storedPorts["ftp"] = {{control, control}, custom ? passive : platform.defaultRange};
}

} // namespace

int VELTFTPConfGet(_tag_VELT_FTP_CONF_* out) {
    auto& platform = Platform::instance();
    if (const auto failure = platform.enter("VELTFTPConfGet", "")) {
        return *failure;
    }
    *out = platform.conf;
    return 0;
}

int VELTFTPConfSet(_tag_VELT_FTP_CONF_ conf) {
    auto& platform = Platform::instance();
    const Verbatim changes{fake::differences(platform.conf, conf)};
    if (const auto failure = platform.enter("VELTFTPConfSet", arguments(changes))) {
        return *failure;
    }
    platform.conf = conf;
    followRecord();
    return 0;
}

int VELTFTPTimeOutGet(void) {
    return getNumber("VELTFTPTimeOutGet", Platform::instance().timeout);
}

int VELTFTPTimeOutSet(int timeout) {
    return setNumber("VELTFTPTimeOutSet", Platform::instance().timeout, timeout);
}

int VELTFTPUseUTF8Get(void) {
    return getNumber("VELTFTPUseUTF8Get", Platform::instance().useUtf8);
}

int VELTFTPUseUTF8Set(int enable) {
    return setNumber("VELTFTPUseUTF8Set", Platform::instance().useUtf8, enable);
}

int VELTFTPFIPSEnabledGet(void) {
    return getNumber("VELTFTPFIPSEnabledGet", Platform::instance().fips);
}

int VELTFTPFIPSEnabledSet(int enable) {
    return setNumber("VELTFTPFIPSEnabledSet", Platform::instance().fips, enable);
}

int VELTFTPASCIIEnabledGet(void) {
    return getNumber("VELTFTPASCIIEnabledGet", Platform::instance().ascii);
}

int VELTFTPASCIIEnabledSet(int enable) {
    return setNumber("VELTFTPASCIIEnabledSet", Platform::instance().ascii, enable);
}

int VELTFTPUmaskEnabledGet(void) {
    return getNumber("VELTFTPUmaskEnabledGet", Platform::instance().umask);
}

int VELTFTPUmaskEnabledSet(bool enable) {
    auto& platform = Platform::instance();
    if (const auto failure = platform.enter("VELTFTPUmaskEnabledSet", arguments(enable))) {
        return *failure;
    }
    platform.umask = enable ? 1 : 0;
    return 0;
}

int VELTFTPDefaultPassivePortGet(VELT_FTP_PORT_RANGE* out) {
    auto& platform = Platform::instance();
    if (const auto failure = platform.enter("VELTFTPDefaultPassivePortGet", "")) {
        return *failure;
    }
    *out = platform.defaultRange;
    return 0;
}
