// /api: the rows of the modules, listed and called.
#ifndef VELT_HOST_API_ROWS_H
#define VELT_HOST_API_ROWS_H

#include "host/api/changes.h"
#include "host/api/metrics.h"
#include "host/api/openapi.h"
#include "host/api/route.h"
#include "host/base/host_log.h"
#include "host/module/module_table.h"

#include <json/value.h>

#include <vector>

namespace velt::host {

/// Thread-safe if reads and writes are ordered as its routes say.
class Rows {
public:
    /// All of these outlive it.
    Rows(const ModuleTable& table, const OpenApi& openApi, Metrics& metrics, Changes& changes, HostLog& log);

    /// It outlives its routes.
    std::vector<Route> routes();

private:
    HttpResponse list() const;
    HttpResponse call(const Row& row, const Call& call);
    HttpResponse read(const Row& row, const Json::Value& parameters, const Call& call);
    HttpResponse change(const Row& row, const Json::Value& parameters, const Call& call);
    void note(const Row& row, const Outcome& outcome, int status, const Call& call);

    const ModuleTable& table_;
    const OpenApi& openApi_;
    Metrics& metrics_;
    Changes& changes_;
    HostLog& log_;
};

} // namespace velt::host

#endif
