// Tests of veltd in which its system calls fail.
#ifndef VELT_TESTS_SYSTEM_SUPPORT_WATCHED_VELTD_H
#define VELT_TESTS_SYSTEM_SUPPORT_WATCHED_VELTD_H

#include "tests/host/client.h"
#include "tests/support/fault_sweep.h"
#include "tests/system/support/host_service.h"

#include <set>
#include <string>

namespace velt::test {

class WatchedVeltd : public HostService {
protected:
    /// A state root that veltd has used, and no veltd.
    void SetUp() override;

    static constexpr unsigned short veltdPort = 8443;

    /// Turns this process, a child of the test, into veltd with these further arguments. Returns when that
    /// fails.
    static std::string becomeVeltd(const Words& further);

    /// Whether it answers; otherwise it has ended.
    static bool answers(pid_t veltd);

    /// What it wrote to its standard error.
    static std::string words();

    /// As root on the Unix socket.
    static Answer ask(const std::string& method, const std::string& target, const std::string& body = "");

    /// Whether it is a call of veltd itself.
    static bool isVeltds(const SeenCall& call);

    /// The files below the state root, but for those that come and go with the database of the log, and for
    /// scratch folders: the next start removes one that could not be removed.
    static std::set<std::string> files();
};

/// A sentence that can be shown to an administrator.
bool isSentence(const std::string& text);

} // namespace velt::test

#endif
