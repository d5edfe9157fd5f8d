// The contract's operations on the FTP settings.
#include "ftp/ftp_library.h"
#include "standalone/control/change_settings.h"
#include "standalone/core/boundary.h"
#include "standalone/core/last_error.h"
#include "standalone/settings/record_merge.h"
#include "standalone/settings/settings_store.h"

namespace velt {

namespace {

template<class Value> int readSetting(Value FtpSettings::*setting) {
    return atBoundary([&]() -> Result<int> {
        const Result<FtpSettings> settings = loadFtpFile();
        if (!settings)
            return settings.error();
        return static_cast<int>((*settings).*setting);
    });
}

template<class Value> int writeSetting(Value FtpSettings::*setting, Value value) {
    return atBoundary(
        [&] { return changeFtpSettings([&](FtpSettings& settings) { settings.*setting = value; }); });
}

LastSeen<_tag_VELT_FTP_CONF_>& lastSeenRecord() {
    thread_local LastSeen<_tag_VELT_FTP_CONF_> seen;
    return seen;
}

Result<> readRecord(_tag_VELT_FTP_CONF_& record) {
    lastSeenRecord().forget();
    const Result<FtpSettings> settings = loadFtpFile();
    if (!settings)
        return settings.error();
    record = settings->record;
    lastSeenRecord().note(record);
    return {};
}

Result<> storeRecord(const _tag_VELT_FTP_CONF_& record) {
    const Result<> result = changeFtpSettings([&record](FtpSettings& settings) {
        settings.record = lastSeenRecord().merge(settings.record, record);
    });
    // Not what was stored in the end: the caller goes on with its own copy.
    if (result)
        lastSeenRecord().note(record);
    return result;
}

int noPlaceFor(const char* what) {
    return fail(ErrorNumber::invalid, std::string("There is no place for ") + what + ".");
}

} // namespace

} // namespace velt

int VELTFTPConfGet(_tag_VELT_FTP_CONF_* out) {
    if (out == nullptr)
        return velt::noPlaceFor("the FTP settings");
    return velt::atBoundary([out] { return velt::readRecord(*out); });
}

int VELTFTPConfSet(_tag_VELT_FTP_CONF_ conf) {
    return velt::atBoundary([&conf] { return velt::storeRecord(conf); });
}

int VELTFTPTimeOutGet(void) {
    return velt::readSetting(&velt::FtpSettings::timeout);
}

int VELTFTPTimeOutSet(int timeout) {
    return velt::writeSetting(&velt::FtpSettings::timeout, timeout);
}

int VELTFTPUseUTF8Get(void) {
    return velt::readSetting(&velt::FtpSettings::useUtf8);
}

int VELTFTPUseUTF8Set(int enable) {
    return velt::writeSetting(&velt::FtpSettings::useUtf8, enable != 0);
}

int VELTFTPFIPSEnabledGet(void) {
    return velt::readSetting(&velt::FtpSettings::fipsOnly);
}

int VELTFTPFIPSEnabledSet(int enable) {
    return velt::writeSetting(&velt::FtpSettings::fipsOnly, enable != 0);
}

int VELTFTPASCIIEnabledGet(void) {
    return velt::readSetting(&velt::FtpSettings::ascii);
}

int VELTFTPASCIIEnabledSet(int enable) {
    return velt::writeSetting(&velt::FtpSettings::ascii, enable != 0);
}

int VELTFTPUmaskEnabledGet(void) {
    return velt::readSetting(&velt::FtpSettings::umask);
}

int VELTFTPUmaskEnabledSet(bool enable) {
    return velt::writeSetting(&velt::FtpSettings::umask, enable);
}

int VELTFTPDefaultPassivePortGet(VELT_FTP_PORT_RANGE* out) {
    if (out == nullptr)
        return velt::noPlaceFor("the default passive range");
    *out = velt::defaultPassiveRange;
    return 0;
}
