#include "host/module/platform_request.h"

#include <utility>

namespace velt::host {

PlatformRequest::PlatformRequest(const std::string& actor, const std::string& address) {
    clearLastError();
    setRequestActor(actor, address);
    setEffectReport([this](Effect effect, std::string_view subject, const Result<>& outcome,
                           std::chrono::nanoseconds) { note(effect, subject, bool(outcome)); });
}

PlatformRequest::~PlatformRequest() {
    setEffectReport({});
    setRequestActor("", "");
}

PlatformReport PlatformRequest::finish() {
    const auto sessions = services_.finish(); // may still stop a service, which is reported like the rest
    setEffectReport({});
    report_.sessions = sessions.valueOr({});
    report_.sentence = sessions ? lastErrorSentence() : sessions.error().message;
    report_.conflict = lastPortConflict();
    return std::move(report_);
}

void PlatformRequest::note(Effect effect, std::string_view subject, bool done) {
    switch (effect) {
    case Effect::store:
        report_.stored = report_.stored || done;
        report_.storeFailed = report_.storeFailed || !done;
        report_.changed = report_.changed || done;
        break;
    case Effect::runKey:
        report_.changed = report_.changed || done;
        break;
    case Effect::start:
        if (done) {
            report_.started.emplace_back(subject);
        }
        [[fallthrough]];
    case Effect::stop:
        // A start or stop that failed half-way has changed the daemon, too.
        report_.changed = true;
        break;
    default:
        break;
    }
}

} // namespace velt::host
