// veltd under load: the real one with the module and the supervisors, in a world of the test's own, but with
// daemons that start at once and serve nothing.
//
// The tests are short unless the environment has VELT_LOAD=long. What they measure is told on standard
// output; limits that are a matter of the machine are kept in the long form only.
#ifndef VELT_TESTS_LOAD_LOAD_SERVICE_H
#define VELT_TESTS_LOAD_LOAD_SERVICE_H

#include "tests/host/client.h"
#include "tests/system/support/host_service.h"

#include <string>

namespace velt::test {

/// Whether this is the long form; and one of two values accordingly.
bool isLong();
template<class Value> Value inLongForm(Value value, Value otherwise) {
    return isLong() ? value : otherwise;
}

/// What the processes of this world have, but for the test itself.
struct Holdings {
    int processes = 0;
    int threads = 0;
    int descriptors = 0;
    int files = 0;            ///< below the state root, but for the events, of which a few old files are kept
    long hostKilobytes = 0;   ///< of memory, of veltd
    long othersKilobytes = 0; ///< of all others
};

class LoadService : public HostService {
public:
    /// A connection as root on the Unix socket.
    static Client asRoot();

protected:
    /// Puts the stand-ins in the place of both daemons, and switches both services on.
    void SetUp() override;

    /// Takes note of the processes that have ended.
    void reap() const;
    Holdings holdings() const;

    /// A set of FTP settings as JSON members, such as "\"timeout\":5", with FTP on.
    static Answer setFtp(Client& client, const std::string& members);
    static Answer post(Client& client, const std::string& path, const std::string& body);
    static Json::Value get(Client& client, const std::string& path);
};

std::ostream& operator<<(std::ostream& out, const Holdings& holdings);

} // namespace velt::test

#endif
