// Settings and places to render in tests.
#ifndef VELT_TESTS_STANDALONE_DAEMONS_PROFTPD_EXAMPLE_H
#define VELT_TESTS_STANDALONE_DAEMONS_PROFTPD_EXAMPLE_H

#include "standalone/daemons/proftpd/proftpd_configuration.h"

#include <cstring>

namespace velt::test {

inline FtpSettings plainSettings() {
    FtpSettings settings = defaultFtpSettings();
    settings.record.service_flags = VELT_FTP_SERVICE_PLAIN;
    settings.record.user_chroot = 1;
    settings.ascii = true;
    return settings;
}

inline ProftpdPlaces places() {
    ProftpdPlaces places;
    places.moduleFolder = "/usr/libexec/velt";
    places.runFolder = "/run/velt/ftp";
    places.loginProgram = "/usr/libexec/velt/velt-login-view";
    places.stateRoot = "/";
    places.loginRoot = "/run/velt/ftp/root";
    places.anonymousShare = "/run/velt/ftp/configurations/0/anonymous";
    places.certificate = "/etc/velt/tls/server.crt";
    places.certificateKey = "/etc/velt/tls/server.key";
    return places;
}

} // namespace velt::test

#endif
