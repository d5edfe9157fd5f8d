#include "standalone/change/settings_change.h"

#include "base/file.h"
#include "standalone/change/change_program.h"
#include "standalone/change/closed_ranges.h"
#include "standalone/change/run_change.h"
#include "standalone/core/error_number.h"
#include "standalone/core/paths.h"
#include "standalone/core/state_lock.h"
#include "standalone/core/state_root.h"
#include "standalone/core/unfinished_change.h"
#include "standalone/settings/confinement_settings.h"
#include "standalone/settings/lost_rights.h"
#include "standalone/settings/settings.h"

#include <algorithm>
#include <iterator>
#include <optional>
#include <set>
#include <utility>

namespace velt {

namespace {

/// What holds back all that the thread does. What is made last ends first.
struct Staging {
    Staging(StateLock lockOfState, StagedFiles stagedFiles, const IntendedPorts& intended)
        : lock(std::move(lockOfState)), files(std::move(stagedFiles)), ports(intended) {}

    StateLock lock;
    StagedFiles files;
    WithIntendedPorts ports;
    DaemonRequests requests;
    HeldJournal journal;
};

/// What was stored at the beginning, as far as it could be read: damaged settings are for the request to
/// find.
struct Former {
    OpenPorts openPorts;
    std::optional<FtpSettings> ftp;
    std::optional<SftpTerms> sftp;
};

/// Of the settings that this thread sees. Nothing where they cannot be read: the daemon's start will tell.
std::optional<FtpSettings> ftpNow() {
    auto ftp = loadFtpSettings();
    return ftp ? std::optional(std::move(*ftp)) : std::nullopt;
}

std::optional<SftpTerms> sftpNow() {
    auto ftp = ftpNow();
    const auto confinement = loadConfinementSettings();
    return ftp && confinement ? std::optional(SftpTerms{std::move(*ftp), *confinement}) : std::nullopt;
}

Former readFormer() {
    return {openPorts().valueOr({}), ftpNow(), sftpNow()};
}

template<class Settings>
bool takesRightsOf(const std::optional<Settings>& former, const std::optional<Settings>& next) {
    return former && next && takesRights(*former, *next);
}

/// A rule may bind whoever is logged in now.
bool changesRules(const std::vector<StagedFile>& files) {
    return std::ranges::find(files, paths::chrootRules, &StagedFile::name) != files.end();
}

class StagedChange final : public SettingsChange {
public:
    StagedChange(Former former, std::unique_ptr<Staging> staging)
        : former_(std::move(former)), staging_(std::move(staging)) {}

    Result<ChangeOutcome> plan(SessionPolicy policy) override {
        VELT_ASSIGN_OR_RETURN(const auto request, collect(policy));
        const auto program = programOf(request);
        VELT_RETURN_IF_ERROR(checkPorts(program));
        ChangeOutcome outcome;
        for (const ProgramStep& each : program) {
            if (each.step) {
                outcome.steps.push_back(*each.step);
            }
            outcome.sessionsEnded += each.sessionsEnded;
        }
        outcome.warnings = closedRangeWarnings(request, program);
        return outcome;
    }

    ChangeOutcome commit(SessionPolicy policy) override {
        const auto request = collect(policy);
        const auto program = request ? programOf(*request) : std::vector<ProgramStep>();
        if (const auto checked = request ? checkPorts(program) : Result<>(request.error()); !checked) {
            staging_.reset();
            return {{}, checked.error()};
        }
        auto warnings = closedRangeWarnings(*request, program);
        StateLock lock = std::move(staging_->lock);
        staging_.reset();
        ChangeOutcome outcome = runChange(*request, program, std::move(lock));
        std::ranges::move(warnings, std::back_inserter(outcome.warnings));
        return outcome;
    }

private:
    /// The daemons whose sessions may do what the staged settings or rules do not allow.
    std::set<const Daemon*> losingRights(const std::vector<StagedFile>& files) const {
        const bool otherRules = changesRules(files);
        const auto sftp = sftpNow();
        std::set<const Daemon*> losing;
        if (otherRules || takesRightsOf(former_.ftp, ftpNow())) {
            losing.insert(&ftpDaemon);
        }
        if ((otherRules && sftp && sftp->confinement.sftp) || takesRightsOf(former_.sftp, sftp)) {
            losing.insert(&sftpDaemon);
        }
        return losing;
    }

    Result<StagedRequest> collect(SessionPolicy policy) const {
        StagedRequest request;
        VELT_ASSIGN_OR_RETURN(request.files, staging_->files.changes());
        request.wishes = staging_->requests.wishes();
        request.madeByStarts = staging_->requests.missingKeys();
        request.firewall = staging_->requests.firewall();
        request.openBefore = former_.openPorts;
        VELT_ASSIGN_OR_RETURN(request.openAfter, openPorts());
        request.journal = staging_->journal.items();
        request.policy = policy;
        request.losingRights = losingRights(request.files);
        return request;
    }

    Former former_;
    std::unique_ptr<Staging> staging_;
};

Result<> restoreAll(const std::vector<StagedFile>& files) {
    for (const StagedFile& file : files) {
        VELT_RETURN_IF_ERROR(restore(file));
    }
    return {};
}

/// A change must not begin with settings that are half of another one.
Result<> settleFormerChange() {
    if (!changeWasLeft()) {
        return {};
    }
    VELT_ASSIGN_OR_RETURN(const auto files, unfinishedChange());
    if (std::ranges::all_of(files, isAsBefore)) {
        return {};
    }
    VELT_RETURN_IF_ERROR(restoreAll(files));
    return Error(ErrorNumber::store,
                 "An earlier change could be taken back only in part. Its settings are taken "
                 "back now: look at them, and try again.");
}

} // namespace

Result<std::unique_ptr<SettingsChange>> SettingsChange::begin(const IntendedPorts& ports) {
    VELT_ASSIGN_OR_RETURN(auto lock, StateLock::take());
    VELT_RETURN_IF_ERROR(settleFormerChange());
    Former former = readFormer();
    VELT_ASSIGN_OR_RETURN(auto files, StagedFiles::begin());
    auto staging = std::make_unique<Staging>(std::move(lock), std::move(files), ports);
    return std::unique_ptr<SettingsChange>(
        std::make_unique<StagedChange>(std::move(former), std::move(staging)));
}

Result<bool> undoUnfinishedChange() {
    VELT_ASSIGN_OR_RETURN(const auto lock, StateLock::take());
    VELT_ASSIGN_OR_RETURN(const auto files, unfinishedChange());
    VELT_RETURN_IF_ERROR(restoreAll(files));
    VELT_RETURN_IF_ERROR(forgetChange());
    return !files.empty();
}

} // namespace velt
