// /api/settings: all settings as one document.
#ifndef VELT_HOST_API_ALL_SETTINGS_H
#define VELT_HOST_API_ALL_SETTINGS_H

#include "host/api/changes.h"
#include "host/api/openapi.h"
#include "host/api/route.h"

#include <json/value.h>

#include <string>
#include <vector>

namespace velt::host {

/// Strict where the rows are lenient: what cannot be, or would be ignored, is refused with its field, and
/// nothing is changed. Thread-safe if reads and writes are ordered as its routes say.
class AllSettings {
public:
    /// All of these outlive it.
    AllSettings(const ModuleTable& table, const OpenApi& openApi, Changes& changes);

    /// It outlives its routes.
    std::vector<Route> routes();

    /// Makes `wanted` what is stored, as a whole. `before` is what this request has read; `way` goes into the
    /// history.
    HttpResponse store(const Json::Value& before, const Json::Value& wanted, const std::string& way,
                       const ChangeOptions& options, const Call& call);

private:
    HttpResponse get(const Call& call) const;
    HttpResponse change(const Call& call, bool isPatch);
    std::optional<HttpResponse> ask(const Json::Value& before, const Json::Value& wanted,
                                    const Call& call) const;

    const ModuleTable& table_;
    const OpenApi& openApi_;
    Changes& changes_;
};

} // namespace velt::host

#endif
