#include "host/trial/trial.h"

#include "host/trial/credentials.h"
#include "host/trial/first_state.h"
#include "host/trial/report.h"
#include "host/trial/trial_error.h"
#include "host/trial/trial_folder.h"
#include "host/trial/trial_place.h"
#include "host/trial/trial_veltd.h"
#include "standalone/standalone.h"

#include <cstdio>
#include <exception>

namespace velt::host {

namespace {

constexpr int usageError = 2;

/// The record of the trial; an empty one when the trial is new.
TrialRecord checkedRecord(const TrialFolder& folder, const TrialPlace& place) {
    TrialRecord record = folder.record();
    if (!record.place.empty() && record.place != place.root) {
        throw TrialError(folder.name() + " was made at " + record.place.string() + " and is now at " +
                         place.root.string() + ". Stop the trial and remove " + folder.name() +
                         " to start over.");
    }
    return record;
}

/// Whether veltd runs with the programs of this build and knows the token. Stops any other, and its services.
bool runsAlready(bool sameBuild, bool hasToken) {
    const auto process = runningVeltd();
    if (process && !(sameBuild && hasToken)) {
        std::printf("%s; restarting it.\n", sameBuild ? "veltd needs a new token" : "veltd has been rebuilt");
        endVeltd();
        check(stopServices());
        return false;
    }
    // One that was killed may take a moment to end.
    if (!process || !waitForVeltd()) {
        return false;
    }
    std::printf("veltd is already running as process %d.\n", static_cast<int>(*process));
    return true;
}

void start(const TrialFolder& folder) {
    const TrialPlace place = findPlace(folder.path());
    TrialRecord record = checkedRecord(folder, place);
    const std::filesystem::path programs = programFolder();
    const std::string build = buildOf(programs);
    check(openState(folder.path()));
    auto token = storedToken();
    if (!runsAlready(record.build == build, token.has_value())) {
        linkPrograms();
        if (record.place.empty()) {
            makeFirstState(place.root);
        }
        if (!token) {
            token = makeToken();
        }
        // Stored before veltd runs, so that it is there if the start is interrupted.
        record = {place.root, chooseHttpPort(record.httpPort), build};
        folder.store(record);
        const pid_t started = launchVeltd(folder.path(), place, record.httpPort);
        std::printf("veltd is running as process %d.\n", static_cast<int>(started));
    }
    const std::string url = "http://127.0.0.1:" + std::to_string(record.httpPort);
    writeEnvironment(url, *token, programs);
    report(folder.name(), url, *token);
}

void stop(const TrialFolder& folder) {
    endVeltd();
    check(openState(folder.path()));
    check(stopServices());
}

} // namespace

int runTrial(const std::vector<std::string>& words) {
    std::setvbuf(stdout, nullptr, _IOLBF, 0); // keeps the order with standard error
    try {
        if (words.size() == 2 && words[0] == "start") {
            start(TrialFolder::forStart(words[1]));
            return 0;
        }
        if (words.size() == 2 && words[0] == "stop") {
            stop(TrialFolder::forStop(words[1]));
            return 0;
        }
        std::fprintf(stderr, "Usage: veltd trial start FOLDER\n"
                             "       veltd trial stop FOLDER\n");
        return usageError;
    } catch (const std::exception& error) {
        std::fprintf(stderr, "%s\n", error.what());
        return 1;
    }
}

} // namespace velt::host
