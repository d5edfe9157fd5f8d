// The administrator-log entries of a changed FTP configuration record.

#include "ftp/ftp.h"
#include "platform/adminlog.h"

#include <cstdio>
#include <cstring>

namespace {

constexpr int logCategory = 2;
constexpr int logLevel = 1;
constexpr unsigned eventServiceEnabled = 0x11B00002;
constexpr unsigned eventServiceDisabled = 0x11B00006;
constexpr unsigned eventUploadRateChanged = 0x11B00008;
constexpr unsigned eventDownloadRateChanged = 0x11B00009;
constexpr unsigned eventPassiveRangeChanged = 0x11B0000A;
constexpr unsigned eventPortChanged = 0x11B00012;
constexpr unsigned eventServiceStarted = 0x11B00013;
constexpr unsigned eventPlainOnlyChanged = 0x11B00019;
constexpr unsigned eventExternalAddressSwitched = 0x11B00020;
constexpr unsigned eventUtf8SupportSwitched = 0x11B00021;
constexpr unsigned eventConnectionLimitChanged = 0x11B00022;

/// The texts of one entry. A longer text is cut.
struct EntryTexts {
    char oldText[32] = {};
    char newText[32] = {};
};

void addEntry(unsigned event, const char* arg1 = "", const char* arg2 = "") {
    VELTLogSet1(logCategory, logLevel, event, arg1, arg2, "", "");
}

void printRange(char (&text)[32], const _tag_VELT_FTP_CONF_& conf, const VELT_FTP_PORT_RANGE& defaultRange) {
    std::snprintf(text, sizeof(text), "%d - %d",
                  conf.passive_port_min != 0 ? conf.passive_port_min : defaultRange.first,
                  conf.passive_port_max != 0 ? conf.passive_port_max : defaultRange.last);
}

void logPort(const _tag_VELT_FTP_CONF_& oldConf, const _tag_VELT_FTP_CONF_& newConf) {
    if (std::strcmp(oldConf.portnum, newConf.portnum) != 0) {
        addEntry(eventPortChanged, oldConf.portnum, newConf.portnum);
    }
}

void logPassiveRange(const _tag_VELT_FTP_CONF_& oldConf, const _tag_VELT_FTP_CONF_& newConf) {
    if (oldConf.passive_port_min == newConf.passive_port_min &&
        oldConf.passive_port_max == newConf.passive_port_max) {
        return;
    }
    VELT_FTP_PORT_RANGE defaultRange{};
    VELTFTPDefaultPassivePortGet(&defaultRange);
    EntryTexts texts;
    printRange(texts.oldText, oldConf, defaultRange);
    printRange(texts.newText, newConf, defaultRange);
    addEntry(eventPassiveRangeChanged, texts.oldText, texts.newText);
}

void logExternalAddress(const _tag_VELT_FTP_CONF_& oldConf, const _tag_VELT_FTP_CONF_& newConf) {
    if (oldConf.use_ext_ip != newConf.use_ext_ip) {
        addEntry(eventExternalAddressSwitched, newConf.use_ext_ip != 0 ? "ON" : "OFF");
    }
}

// Only plain FTP alone, the exact value 1, is looked at: leaving it writes "Enabled", reaching it "Disabled".
void logPlainOnly(const _tag_VELT_FTP_CONF_& oldConf, const _tag_VELT_FTP_CONF_& newConf) {
    if (oldConf.service_flags != newConf.service_flags && (oldConf.service_flags == VELT_FTP_SERVICE_PLAIN ||
                                                           newConf.service_flags == VELT_FTP_SERVICE_PLAIN)) {
        addEntry(eventPlainOnlyChanged,
                 oldConf.service_flags == VELT_FTP_SERVICE_PLAIN ? "Enabled" : "Disabled");
    }
}

void logRate(unsigned event, int oldRate, int newRate) {
    if (oldRate != newRate) {
        EntryTexts texts;
        std::snprintf(texts.oldText, sizeof(texts.oldText), "%d KB/s", oldRate);
        std::snprintf(texts.newText, sizeof(texts.newText), "%d KB/s", newRate);
        addEntry(event, texts.oldText, texts.newText);
    }
}

void logConnectionLimit(const _tag_VELT_FTP_CONF_& oldConf, const _tag_VELT_FTP_CONF_& newConf) {
    if (oldConf.max_conn_per_ip == newConf.max_conn_per_ip) {
        return;
    }
    EntryTexts texts;
    std::snprintf(texts.newText, sizeof(texts.newText), "%d", newConf.max_conn_per_ip);
    addEntry(eventConnectionLimitChanged, newConf.max_conn_per_ip != 0 ? texts.newText : "Off");
}

void logUtf8Support(const _tag_VELT_FTP_CONF_& oldConf, const _tag_VELT_FTP_CONF_& newConf) {
    if (oldConf.support_utf8 != newConf.support_utf8) {
        addEntry(eventUtf8SupportSwitched, newConf.support_utf8 != 0 ? "On" : "Off");
    }
}

} // namespace

void FTPServiceHandler::LogChanges(int wasEnabled, int nowEnabled, _tag_VELT_FTP_CONF_* oldConf,
                                   _tag_VELT_FTP_CONF_* newConf) {
    if (wasEnabled != nowEnabled) {
        addEntry(nowEnabled != 0 ? eventServiceEnabled : eventServiceDisabled);
    }
    if (nowEnabled == 0) {
        return;
    }
    logPort(*oldConf, *newConf);
    logPassiveRange(*oldConf, *newConf);
    logExternalAddress(*oldConf, *newConf);
    logPlainOnly(*oldConf, *newConf);
    logRate(eventDownloadRateChanged, oldConf->maxdownloadrate, newConf->maxdownloadrate);
    logRate(eventUploadRateChanged, oldConf->maxuploadrate, newConf->maxuploadrate);
    logConnectionLimit(*oldConf, *newConf);
    logUtf8Support(*oldConf, *newConf);
    if (wasEnabled != nowEnabled) {
        addEntry(eventServiceStarted);
    }
}
