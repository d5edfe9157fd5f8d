// A change of the settings in a line, for the logs.
#ifndef VELT_HOST_API_CHANGE_SUMMARY_H
#define VELT_HOST_API_CHANGE_SUMMARY_H

#include "host/api/settings_document.h"

#include <string>
#include <vector>

namespace velt::host {

/// "/ftp/timeout from 300 to 600, /chroot_rules (removed user anna /docs; added user anna /home)". Of many
/// rules only the first are named, and how many more there are.
std::string summaryOf(const std::vector<FieldChange>& changes);

} // namespace velt::host

#endif
