#include "host/api/wrong_tokens.h"

#include "standalone/standalone.h"

#include <exception>

namespace velt::host {

WrongTokens::WrongTokens(HostLog& log, std::size_t maxSources)
    : log_(log), waiting_([this](const std::string& address) { count(address); }, {maxSources, mostOfOne}) {}

void WrongTokens::note(const std::string& address) {
    waiting_.add(sourceOfLogin(address), address);
}

void WrongTokens::count(const std::string& address) {
    try {
        // Those that came while the ban was being made must not make it again.
        if (!currentBanOf(address)) {
            noteFailedLogin("veltd", address);
        }
    } catch (const std::exception& error) {
        log_.write(std::string("cannot count a wrong token: ") + error.what());
    }
}

} // namespace velt::host
