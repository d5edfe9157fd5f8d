// The files that administrators edit. The first byte chooses one.
#include "fuzz/target.h"
#include "standalone/core/paths.h"
#include "standalone/core/state_root.h"
#include "standalone/firewall/firewall_settings.h"
#include "standalone/journal/log_retention.h"
#include "standalone/settings/settings.h"
#include "tests/support/temporary_folder.h"

#include <array>
#include <functional>

namespace {

struct File {
    std::string_view path;
    std::function<bool()> isClear; ///< reads it; whether it was read, or refused with a reason
};

template<auto load> bool loads() {
    const auto settings = load();
    return settings || !settings.error().message.empty();
}

/// What is read must be what the daemon's configuration can be made of, or be told from it.
bool readsFtp() {
    const auto settings = velt::loadFtpSettings();
    if (!settings) {
        return !settings.error().message.empty();
    }
    const auto checked = velt::checkFtpSettings(*settings);
    return checked || !checked.error().message.empty();
}

} // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    static const velt::test::TemporaryFolder folder;
    static const std::array<File, 5> files{{
        {velt::paths::ftpSettings, readsFtp},
        {velt::paths::sftpSettings, loads<velt::loadSftpSettings>},
        {velt::paths::networkSettings, loads<velt::loadNetworkSettings>},
        {velt::paths::firewallSettings, loads<velt::loadFirewallSettings>},
        {velt::paths::logRetention, loads<velt::loadRetention>},
    }};
    if (size == 0) {
        return 0;
    }
    velt::setStateRoot(folder.path());
    const File& file = files[data[0] % files.size()];
    folder.write(std::string(file.path), velt::fuzz::textOf(data + 1, size - 1));
    velt::fuzz::check(file.isClear(), "a file is read, or refused with a reason");
    return 0;
}
