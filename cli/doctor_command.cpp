#include "base/printable.h"
#include "cli/command.h"
#include "cli/failure.h"
#include "cli/health_count.h"
#include "cli/json_io.h"

#include <CLI/CLI.hpp>

#include <ostream>

namespace velt::cli {

namespace {

void writeFinding(Context& context, const Json::Value& finding) {
    context.console.out << printable(textAt(finding, "severity")) << ": "
                        << printable(textAt(finding, "sentence")) << " [" << printable(textAt(finding, "id"))
                        << "]\n    " << printable(textAt(finding, "mend")) << '\n';
}

void diagnose(Context& context) {
    const Json::Value health = context.api.get("/api/health");
    const HealthCount count = countFindings(health);
    if (!context.wroteJson(health)) {
        for (const Json::Value& finding : health["findings"]) {
            writeFinding(context, finding);
        }
        if (count.grave() == 0) {
            context.console.out << (health["findings"].empty() ? "All is well.\n"
                                                               : "Nothing else is wrong.\n");
        }
    }
    if (count.grave() > 0) {
        context.exitCode = ExitCode::unhealthy;
    }
}

} // namespace

void addDoctorCommand(CLI::App& app, Command& chosen) {
    CLI::App* doctor = app.add_subcommand("doctor", "Find what is wrong with the server, and what mends it");
    onWords(doctor, chosen, diagnose);
}

} // namespace velt::cli
