// Which services the stored settings ask for, as opposed to those that run.
//
// A "get" may tell the state of the moment, while every "set" has to name the wanted one: a client that
// changes one setting alone needs to know what is stored, or it would switch off for good what is just down.
#ifndef VELT_HOST_STORED_SWITCHES_H
#define VELT_HOST_STORED_SWITCHES_H

#include <optional>

namespace velt::host {

struct StoredSwitches {
    bool ftp = false;
    bool ftps = false;
    bool sftp = false;
};

/// Nothing when the platform cannot read one of the settings. May be called from any thread.
std::optional<StoredSwitches> readStoredSwitches();

} // namespace velt::host

#endif
