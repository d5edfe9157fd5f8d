// The FTP configuration record as the journal shows it.
#ifndef VELT_TESTS_SUPPORT_FAKE_PLATFORM_FTP_RECORD_H
#define VELT_TESTS_SUPPORT_FAKE_PLATFORM_FTP_RECORD_H

#include "ftp/ftp_library.h"

#include <string>

namespace fake {

/// The fields of `fresh` that differ from `stored`, in the order of the record:
/// {portnum: "2121", service_flags: 3}. A text whose bytes differ only after its NUL is shown with a note.
std::string differences(const _tag_VELT_FTP_CONF_& stored, const _tag_VELT_FTP_CONF_& fresh);

} // namespace fake

#endif
