// Troubles of real services, and what mends them.
#ifndef VELT_TESTS_SYSTEM_SUPPORT_HEALTH_SERVICE_H
#define VELT_TESTS_SYSTEM_SUPPORT_HEALTH_SERVICE_H

#include "tests/system/support/host_service.h"

#include <sys/types.h>

#include <filesystem>
#include <string>
#include <vector>

namespace velt::test {

/// A port of this world that another program has until this ends.
class TakenPort {
public:
    enum class As {
        listener,
        bound
    };
    explicit TakenPort(int port, As as = As::listener);
    ~TakenPort();
    TakenPort(const TakenPort&) = delete;
    TakenPort& operator=(const TakenPort&) = delete;

private:
    int descriptor_;
};

/// A program of this name that listens on all addresses until this ends.
class NamedListener {
public:
    NamedListener(const char* program, int port);
    ~NamedListener();
    NamedListener(const NamedListener&) = delete;
    NamedListener& operator=(const NamedListener&) = delete;

private:
    pid_t process_;
};

class HealthService : public HostService {
protected:
    /// What veltctl doctor says now: errors and warnings as "id: mend" lines, without those of the machine
    /// that runs the tests.
    static std::string diagnosis();

    /// Does what the lines of this id say, by the very command, as an administrator would. What is to be done
    /// by hand before it is the test's to do.
    void mend(const std::string& diagnosis, const std::string& id);

    struct Certificate {
        std::string text;
        std::string key;
    };
    static Certificate makeCertificate();
    static void putInPlace(const std::string& certificate, const std::string& key);

    static void setFirewall(const std::string& lines);

private:
    void obey(std::string command);
};

/// The folder's programs can be replaced while one lives, for this world only.
class ReplaceablePrograms {
public:
    explicit ReplaceablePrograms(std::filesystem::path folder);
    /// Nothing may run from there any more.
    ~ReplaceablePrograms();
    ReplaceablePrograms(const ReplaceablePrograms&) = delete;
    ReplaceablePrograms& operator=(const ReplaceablePrograms&) = delete;

    /// As an upgrade does: a new file takes the place of the old one.
    void replace(const std::string& program) const;

private:
    std::filesystem::path folder_;
};

} // namespace velt::test

#endif
