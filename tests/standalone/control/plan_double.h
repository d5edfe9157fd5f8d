// Stands in for the rendering of configurations: what the services start is the test daemon.
#ifndef VELT_TESTS_STANDALONE_CONTROL_PLAN_DOUBLE_H
#define VELT_TESTS_STANDALONE_CONTROL_PLAN_DOUBLE_H

#include <atomic>
#include <string>
#include <vector>

namespace velt::test {

/// May be set while others, such as the watch of the services, look at it.
class Switch {
public:
    Switch() = default;
    Switch(const Switch& other) : on_(other.isOn()) {}
    Switch& operator=(const Switch& other) {
        if (this != &other) {
            *this = other.isOn();
        }
        return *this;
    }
    Switch& operator=(bool on) {
        on_ = on;
        return *this;
    }
    ~Switch() = default;

    bool isOn() const { return on_; }

private:
    std::atomic<bool> on_{false};
};

/// How the next plans are made; the ports and the rest follow from the stored settings.
struct PlanDouble {
    bool takesRights = false;             ///< as if each change of the FTP settings took rights away
    Switch refuse;                        ///< as if the daemon's own test had refused the configuration
    int crashingRate = -1;                ///< an FTP daemon with this upload rate does not start
    std::vector<std::string> ftpOptions;  ///< further arguments of the FTP daemon
    std::vector<std::string> sftpOptions; ///< of the SFTP daemon
};

PlanDouble& planDouble();

/// How many plans of the FTP daemon were made so far, in all threads.
int ftpPlans();

} // namespace velt::test

#endif
