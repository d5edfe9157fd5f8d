// Everything that a change of settings may touch, at one moment, and what lies between two of them.
#ifndef VELT_TESTS_SYSTEM_SUPPORT_SYSTEM_MOMENT_H
#define VELT_TESTS_SYSTEM_SUPPORT_SYSTEM_MOMENT_H

#include <json/value.h>

#include <map>
#include <string>
#include <vector>

namespace velt::test {

/// What is stored, what runs, what is open, and what was written down.
struct SystemMoment {
    Json::Value settings;                       ///< the document of all settings
    std::map<std::string, std::string> files;   ///< below the state root, without the database
    std::map<std::string, std::string> daemons; ///< "ftp" and "sftp": the process that listens; "" for none
    std::vector<std::string> listening;         ///< sockets of this world
    std::vector<std::string> firewall;          ///< what the packet filter lets in: "21", "3000-3100"
    std::vector<std::string> events;            ///< "ftpd stop", oldest first
    std::vector<std::string> log;               ///< the modules' own sentences, oldest first
    std::size_t changes = 0;                    ///< how many the history has
};

/// As it is now, by the interface on the socket and by what there is to see.
SystemMoment systemNow();

/// What differs, by name; empty when they are the same.
std::vector<std::string> differences(const SystemMoment& one, const SystemMoment& other);

/// What happened in between, as a plan would say it ("hand over ftp"), sorted.
std::vector<std::string> effectsBetween(const SystemMoment& before, const SystemMoment& after);

/// The settings that differ, as a plan would list them.
Json::Value changesBetween(const SystemMoment& before, const SystemMoment& after);

} // namespace velt::test

#endif
