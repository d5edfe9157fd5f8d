// veltd as a unit of a real systemd, administered by veltctl. All of these are for use inside the machine.
#ifndef VELT_TESTS_SYSTEM_SUPPORT_SYSTEMD_HOST_H
#define VELT_TESTS_SYSTEM_SUPPORT_SYSTEMD_HOST_H

#include <string>
#include <vector>

namespace velt::test {

/// The machine with all installed, its host at work, and a firewall of ours that drops. Alice may write to
/// the share public; guests to the share private, but for the modes of its folder.
void startHost();

/// What veltctl writes; a failure of it fails the test.
std::string done(const std::vector<std::string>& words, const std::string& input = {});

/// What it says when it is refused, which it has to be.
std::string refused(const std::vector<std::string>& words);

/// What a shell writes, its errors last.
std::string shell(const std::string& commands);

} // namespace velt::test

#endif
