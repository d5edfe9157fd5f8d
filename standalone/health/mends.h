// Words that findings use for what mends them.
#ifndef VELT_STANDALONE_HEALTH_MENDS_H
#define VELT_STANDALONE_HEALTH_MENDS_H

#include "standalone/daemons/daemon.h"

#include <filesystem>
#include <string>
#include <string_view>

namespace velt {

/// "veltctl restart ftp".
std::string restartOf(const Daemon& daemon);

/// "systemctl restart veltd", or "Restart veltd." where veltd is no unit of systemd's.
std::string restartOfHost();

/// What to do before that, in words without a full stop at the end, and that.
std::string thenRestartHost(const std::string& first);

/// "Correct FILE, then run: veltctl doctor".
std::string correct(const std::filesystem::path& file);

/// The text as one word of a command: in single quotes where a shell would take it for something else.
std::string shellWord(std::string_view text);

} // namespace velt

#endif
