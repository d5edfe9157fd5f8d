#include "tests/support/fault_sweep.h"

#include "tests/support/waiting.h"

#include <gtest/gtest.h>

#include <unistd.h>

#include <algorithm>
#include <array>
#include <cerrno>
#include <cstdlib>
#include <cstring>
#include <map>
#include <mutex>
#include <set>
#include <string_view>
#include <vector>

namespace velt::test {
namespace {

/// The same for calls that mean the same in two runs: numbers of processes and ports, and names that were
/// made up, do not count.
std::string labelOf(const SeenCall& call) {
    std::string label = call.program + ": " + call.name + " ";
    constexpr std::string_view madeUp = "/test.";
    std::string subject = call.subject;
    if (const auto at = subject.find(madeUp); at != std::string::npos) {
        subject.replace(at + madeUp.size(), 6, "#");
    }
    for (const char character : subject) {
        const bool digit = character >= '0' && character <= '9';
        if (!digit) {
            label += character;
        } else if (label.back() != '#') {
            label += '#';
        }
    }
    return label;
}

constexpr const char* beginMark = "/begin of the faults";
constexpr const char* endMark = "/end of the faults";

struct Fault {
    std::string label;
    int occurrence = 0; ///< which of those with this label, from 0
    int error = 0;
};

/// Tells calls apart while a run goes on.
class Counter {
public:
    explicit Counter(const FaultSweep& sweep) : sweep_(sweep), begun_(!sweep.hasBegin) {}

    /// The call's label and occurrence; no label for one that is not failed.
    Fault next(const SeenCall& call) {
        begun_ = begun_ || call.subject == beginMark;
        over_ = over_ || call.subject == endMark;
        if (!begun_ || over_ || call.subject == beginMark ||
            !(sweep_.counts ? sweep_.counts(call) : !isLoading(call))) {
            return {};
        }
        const std::string label = labelOf(call);
        return {label, counts_[label]++, call.error};
    }

private:
    const FaultSweep& sweep_;
    std::map<std::string, int> counts_;
    bool begun_;
    bool over_ = false;
};

bool triesAll() {
    return std::getenv("VELT_ALL_FAULTS") != nullptr;
}

using Look = std::function<void(const ChildEnd& end)>;

ChildEnd askServer(const FaultSweep& sweep, CallWatch::Decide decide) {
    const auto began = Clock::now();
    sweep.server->decideBy(std::move(decide));
    ChildEnd end{true, 0, sweep.act()};
    sweep.server->decideBy({});
    end.inTime = Clock::now() - began <= sweep.limit;
    return end;
}

/// Does the operation once, and looks at what has become of it.
void runOnce(const FaultSweep& sweep, CallWatch::Decide decide, const Look& look) {
    sweep.prepare();
    if (sweep.server != nullptr) {
        look(askServer(sweep, std::move(decide)));
        return;
    }
    CallWatch watch(sweep.act, std::move(decide));
    if (sweep.meanwhile) {
        sweep.meanwhile(watch.child());
    }
    const ChildEnd end = watch.finish(sweep.limit);
    watch.decideBy({});
    look(end);
}

std::vector<Fault> learnFaults(const FaultSweep& sweep) {
    std::vector<Fault> all;
    Counter counter(sweep);
    const auto note = [&](const SeenCall& call) {
        if (Fault fault = counter.next(call); !fault.label.empty()) {
            all.push_back(std::move(fault));
        }
        return 0;
    };
    runOnce(sweep, note, [&](const ChildEnd& end) {
        SCOPED_TRACE("no fault");
        EXPECT_TRUE(end.inTime);
        sweep.check({"no fault", {}, end});
    });
    return all;
}

/// With the errors that this call also fails with.
std::vector<Fault> withFurtherErrors(const std::vector<Fault>& faults) {
    std::vector<Fault> all;
    for (const Fault& fault : faults) {
        const std::set<int> errors{fault.error, EIO, ENOMEM, EINTR};
        for (const int error : errors) {
            all.push_back({fault.label, fault.occurrence, error});
        }
    }
    return all;
}

std::vector<Fault> chooseFaults(const std::vector<Fault>& all, Share share) {
    std::map<std::string, int> last;
    for (const Fault& fault : all) {
        last[fault.label] = fault.occurrence;
    }
    std::vector<Fault> chosen;
    std::ranges::copy_if(all, std::back_inserter(chosen), [&](const Fault& fault) {
        const bool isLast = fault.occurrence == last[fault.label];
        return share == Share::all || fault.occurrence == 0 || (share == Share::firstAndLast && isLast);
    });
    return chosen;
}

std::vector<Fault> sampled(const std::vector<Fault>& all, std::size_t oneOf) {
    const char* load = std::getenv("VELT_LOAD");
    if (load != nullptr && std::string_view(load) == "long") {
        return all;
    }
    std::vector<Fault> chosen;
    for (std::size_t i = oneOf / 2; i < all.size(); i += oneOf) {
        chosen.push_back(all[i]);
    }
    return chosen;
}

/// Whether the call came.
bool runWith(const Fault& fault, const FaultSweep& sweep) {
    SweptRun run{
        fault.label + " (" + std::to_string(fault.occurrence) + "): " + std::strerror(fault.error), {}, {}};
    std::mutex mutex; // of run.call and of came
    bool came = false;
    Counter counter(sweep);
    const auto failOne = [&](const SeenCall& call) {
        const Fault here = counter.next(call);
        const std::lock_guard lock(mutex);
        if (came || here.label != fault.label || here.occurrence != fault.occurrence) {
            return 0;
        }
        came = true;
        run.call = call;
        return fault.error;
    };
    runOnce(sweep, failOne, [&](const ChildEnd& end) {
        const std::lock_guard lock(mutex);
        SCOPED_TRACE(run.fault);
        EXPECT_TRUE(end.inTime);
        run.end = end;
        if (came) {
            sweep.check(run);
        }
    });
    return came;
}

} // namespace

void beginFaults() {
    (void)::access(beginMark, F_OK);
}

void endFaults() {
    (void)::access(endMark, F_OK);
}

bool isLoading(const SeenCall& call) {
    constexpr std::array<std::string_view, 6> folders{"/lib",        "/usr/lib",  "/etc/ld.so",
                                                      "/usr/share/", "/proc/sys", "/sys"};
    return std::ranges::any_of(folders,
                               [&call](std::string_view folder) { return call.subject.starts_with(folder); });
}

int sweepFaults(const FaultSweep& sweep) {
    int tried = 0;
    const auto all = learnFaults(sweep);
    const auto chosen =
        triesAll() ? withFurtherErrors(all) : sampled(chooseFaults(all, sweep.share), sweep.oneOf);
    for (const Fault& fault : chosen) {
        tried += runWith(fault, sweep) ? 1 : 0;
    }
    testing::Test::RecordProperty("faults", tried);
    return tried;
}

} // namespace velt::test
