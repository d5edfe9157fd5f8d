// A network of the test's own, with a second host in it.
#ifndef VELT_TESTS_STANDALONE_FIREWALL_PRIVATE_NETWORK_H
#define VELT_TESTS_STANDALONE_FIREWALL_PRIVATE_NETWORK_H

#include <sys/types.h>

namespace velt::test {

/// Moves this process into a network namespace, and lets a child in a namespace of its own be the host at the
/// other end of a cable: here is 192.0.2.1, there 192.0.2.2. Both namespaces end with their processes.
class PrivateNetwork {
public:
    PrivateNetwork();
    ~PrivateNetwork();
    PrivateNetwork(const PrivateNetwork&) = delete;
    PrivateNetwork& operator=(const PrivateNetwork&) = delete;

    /// False where this machine gives no namespaces.
    bool isThere() const { return neighbour_ > 0; }

    /// Whether the other host can connect to a port of this one.
    bool neighbourReaches(int port) const;

private:
    bool layCable() const;
    void beNeighbour() const;

    pid_t neighbour_ = -1;
    int requests_ = -1;
    int answers_ = -1;
};

/// Listens on all addresses of the private network, of both families.
class OpenPort {
public:
    explicit OpenPort(int port);
    ~OpenPort();
    OpenPort(const OpenPort&) = delete;
    OpenPort& operator=(const OpenPort&) = delete;

private:
    int descriptor_;
};

} // namespace velt::test

#endif
