#include "host/trial/trial.h"

#include "host/trial/first_files.h"
#include "host/trial/report.h"
#include "host/trial/set_up.h"
#include "host/trial/trial_error.h"
#include "host/trial/trial_folder.h"
#include "host/trial/trial_place.h"
#include "host/trial/trial_veltd.h"

#include <sys/stat.h>
#include <unistd.h>

#include <cstdio>
#include <cstdlib>

namespace velt::host {

namespace {

constexpr int usageError = 2;

/// Starts veltd, unless one of the latest build is running, and waits until it answers.
void provideVeltd(const TrialFolder& folder, const TrialPlace& place, TrialRecord& record) {
    const std::string build = buildOf(programFolder());
    auto process = runningVeltd();
    if (process && record.build != build) {
        std::printf("veltd was built anew: it is started again.\n");
        stopVeltd(folder.path());
        process.reset();
    }
    if (process) {
        std::printf("veltd runs already, as process %d.\n", static_cast<int>(*process));
        waitForVeltd();
        return;
    }
    linkPrograms();
    makeFirstFiles(place.root);
    // Stored before veltd runs, so that it is there if the start is interrupted.
    record = {place.root, chooseHttpPort(record.httpPort), build, record.setUp};
    folder.store(record);
    const pid_t started = launchVeltd(folder.path(), place, record.httpPort);
    std::printf("veltd runs, as process %d.\n", static_cast<int>(started));
}

/// A user who became root by sudo gets what is needed to go on without it.
void giveToCaller() {
    const char* const user = std::getenv("SUDO_UID"); // NOLINT(concurrency-mt-unsafe)
    if (user == nullptr || ::geteuid() != 0) {
        return;
    }
    const auto id = static_cast<uid_t>(std::strtoul(user, nullptr, 10));
    for (const char* name : {".", environmentName, tokenName}) {
        if (::lchown(name, id, static_cast<gid_t>(-1)) != 0) {
            throw TrialError(std::string("Cannot give the file ") + name + " to the user who called sudo.");
        }
    }
}

void start(const TrialFolder& folder) {
    const TrialPlace place = findPlace(folder.path());
    TrialRecord record = folder.record();
    if (!record.place.empty() && record.place != place.root) {
        throw TrialError(folder.name() + " was made for " + record.place.string() + ", and this is " +
                         place.root.string() + ". Stop what runs and remove " + folder.name() +
                         " to begin anew.");
    }
    provideVeltd(folder, place, record);
    VeltdClient client(socketName);
    const std::string token = provideToken(client);
    if (!record.setUp) {
        makeFirstSettings(client);
        record.setUp = true;
        folder.store(record);
    }
    const std::string url = "http://127.0.0.1:" + std::to_string(record.httpPort);
    writeEnvironment(url, token, programFolder());
    giveToCaller();
    report(client, folder.name(), url, token);
}

} // namespace

int runTrial(const std::vector<std::string>& words) {
    ::umask(022);
    std::setvbuf(stdout, nullptr, _IOLBF, 0); // keeps the order with standard error
    try {
        if (words.size() == 2 && words[0] == "start") {
            start(TrialFolder::forStart(words[1]));
            return 0;
        }
        if (words.size() == 2 && words[0] == "stop") {
            stopVeltd(TrialFolder::forStop(words[1]).path());
            return 0;
        }
        std::fprintf(stderr, "Usage: veltd trial start FOLDER\n"
                             "       veltd trial stop FOLDER\n");
        return usageError;
    } catch (const TrialError& error) {
        std::fprintf(stderr, "%s\n", error.what());
        return 1;
    }
}

} // namespace velt::host
