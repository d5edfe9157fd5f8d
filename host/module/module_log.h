// What modules write to the system log while they serve a request.
//
// The process defines syslog itself: each line goes to the system log, and is kept for the request that the
// thread serves. The program that links this exports its symbols, so that loaded modules find them first.
#ifndef VELT_HOST_MODULE_MODULE_LOG_H
#define VELT_HOST_MODULE_MODULE_LOG_H

#include <string>
#include <vector>

namespace velt::host {

/// Collects the lines of the thread that made it, for its lifetime. They may be nested.
class ModuleLog {
public:
    ModuleLog();
    ~ModuleLog();
    ModuleLog(const ModuleLog&) = delete;
    ModuleLog& operator=(const ModuleLog&) = delete;

    /// The lines so far, without newline at the end.
    const std::vector<std::string>& lines() const { return lines_; }

    void add(std::string line) { lines_.push_back(std::move(line)); }

private:
    std::vector<std::string> lines_;
    ModuleLog* outer_;
};

/// The last line that gives a reason, without the source and line number in front: "Port conflict."; "" when
/// there is none. The line that repeats the request's parameters gives none.
std::string reasonIn(const std::vector<std::string>& lines);

} // namespace velt::host

#endif
