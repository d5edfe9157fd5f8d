#include "tests/support/fake_platform/ftp_record.h"

#include "tests/support/fake_platform/text.h"

#include <cstring>

namespace fake {

namespace {

struct NumberField {
    const char* name;
    int32_t _tag_VELT_FTP_CONF_::*member;
};

using Conf = _tag_VELT_FTP_CONF_;

constexpr NumberField numberFields[] = {
    {"use_ext_ip", &Conf::use_ext_ip},
    {"enable_flow_ctrl", &Conf::enable_flow_ctrl},
    {"maxuploadrate", &Conf::maxuploadrate},
    {"maxdownloadrate", &Conf::maxdownloadrate},
    {"anonymous", &Conf::anonymous},
    {"anonymous_chroot", &Conf::anonymous_chroot},
    {"passive_port_min", &Conf::passive_port_min},
    {"passive_port_max", &Conf::passive_port_max},
    {"service_flags", &Conf::service_flags},
    {"support_utf8", &Conf::support_utf8},
    {"max_conn_per_ip", &Conf::max_conn_per_ip},
    {"reserved", &Conf::reserved},
    {"enable_fxp", &Conf::enable_fxp},
    {"user_chroot", &Conf::user_chroot},
};

template<size_t size> std::string textOf(const char (&field)[size]) {
    return std::string(field, strnlen(field, size));
}

template<size_t size>
void addText(std::string& shown, const char* name, const char (&stored)[size], const char (&fresh)[size]) {
    if (std::memcmp(stored, fresh, size) == 0) {
        return;
    }
    const std::string text = textOf(fresh);
    shown += (shown.empty() ? "" : ", ") + std::string(name) + ": " + quoted(text);
    if (text == textOf(stored)) {
        shown += " (other bytes after its end)";
    }
}

} // namespace

std::string differences(const Conf& stored, const Conf& fresh) {
    std::string shown;
    addText(shown, "portnum", stored.portnum, fresh.portnum);
    addText(shown, "anonymous_chroot_share", stored.anonymous_chroot_share, fresh.anonymous_chroot_share);
    for (const auto& [name, member] : numberFields) {
        if (stored.*member != fresh.*member) {
            shown += (shown.empty() ? "" : ", ") + std::string(name) + ": " + render(fresh.*member);
        }
    }
    return "{" + shown + "}";
}

} // namespace fake
