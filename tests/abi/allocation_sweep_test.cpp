// Each allocation that the module makes for a full request fails in turn: the framework gets the exception
// and no answer, and no handle is left. Only the module's own allocations fail, those of the fake platform do
// not.

#include "tests/support/full_requests.h"
#include "tests/support/handler_test.h"

#include <dlfcn.h>
#include <execinfo.h>

#include <array>
#include <cstdlib>
#include <cstring>
#include <new>
#include <span>
#include <utility>

namespace {

long untilFailure = 0; ///< allocations of the module; 0: none fails
const void* moduleBase = nullptr;
const void* programBase = nullptr;

const void* baseOf(const void* address) {
    Dl_info object{};
    return dladdr(address, &object) != 0 ? object.dli_fbase : nullptr;
}

/// Whether the module asks for the memory, perhaps through a library, and not the program. `caller` is where
/// the allocation returns to.
bool isForTheModule(const void* caller) {
    std::array<void*, 24> frames{};
    const int count = backtrace(frames.data(), static_cast<int>(frames.size()));
    bool isCaller = false;
    for (const void* const frame : std::span(frames).first(static_cast<std::size_t>(count))) {
        isCaller = isCaller || frame == caller;
        const void* const base = isCaller ? baseOf(frame) : nullptr;
        if (base != nullptr && (base == moduleBase || base == programBase)) {
            return base == moduleBase;
        }
    }
    return false;
}

bool failsNow(const void* caller) {
    if (untilFailure == 0) {
        return false;
    }
    const long left = std::exchange(untilFailure, 0); // what this asks for itself does not fail
    const bool counts = isForTheModule(caller);
    untilFailure = counts ? left - 1 : left;
    return counts && left == 1;
}

} // namespace

void* operator new(std::size_t size) {
    void* const memory = failsNow(__builtin_return_address(0)) ? nullptr : std::malloc(size == 0 ? 1 : size);
    if (memory == nullptr) {
        throw std::bad_alloc();
    }
    return memory;
}

void operator delete(void* memory) noexcept {
    std::free(memory);
}

void operator delete(void* memory, std::size_t /*size*/) noexcept {
    std::free(memory);
}

namespace {

class AllocationSweep : public HandlerTest {
protected:
    void SetUp() override {
        HandlerTest::SetUp();
        module_ = dlopen(MODULE_PATH, RTLD_NOW | RTLD_LOCAL);
        ASSERT_NE(module_, nullptr) << dlerror();
        moduleBase = baseOf(dlsym(module_, "gTable"));
        programBase = baseOf(&moduleBase);
        ASSERT_NE(moduleBase, programBase);
    }
    void TearDown() override {
        HandlerTest::TearDown();
        dlclose(module_);
    }

    /// The loaded module's function for the request, whose name begins with that of a row's function.
    VELT::APIEntryFunction entryOf(std::string_view request) const {
        static constexpr std::array<std::string_view, 16> rows{"FTPGet",
                                                               "FTPSet",
                                                               "FTPGetV2",
                                                               "FTPSetV2",
                                                               "FTPGetV3",
                                                               "FTPSetV3",
                                                               "FTPSecurityGet",
                                                               "FTPSecuritySet",
                                                               "FTPSecurityShareGet",
                                                               "FTPChrootUserList",
                                                               "FTPChrootUserAdd",
                                                               "FTPChrootUserDelete",
                                                               "FTPChrootUserLoad",
                                                               "FTPChrootUserSave",
                                                               "SFTPGet",
                                                               "SFTPSet"};
        const auto* const table = static_cast<const VELT::APITableRow*>(dlsym(module_, "gTable"));
        VELT::APIEntryFunction found = nullptr;
        std::size_t length = 0;
        for (std::size_t i = 0; i < rows.size(); ++i) {
            if (request.starts_with(rows.at(i)) && rows.at(i).size() > length) {
                length = rows.at(i).size();
                found = table[i].entry;
            }
        }
        return found;
    }

    /// Whether the nth allocation of the request failed; false when it makes fewer.
    bool failsAt(long nth, const FullRequest& full) {
        startAfresh();
        full.prepare(platform);
        fake::Request request(json(full.params));
        fake::Response response;
        const auto entry = entryOf(full.name);
        bool threw = false;
        untilFailure = nth;
        try {
            entry(&request, &response);
        } catch (const std::bad_alloc&) {
            threw = true;
        }
        untilFailure = 0;
        EXPECT_EQ(response.answers.size(), threw ? 0U : 1U);
        EXPECT_EQ(platform.handleErrors(), Lines{});
        return threw;
    }

private:
    void* module_ = nullptr;
};

// Some requests allocate nothing.
TEST_F(AllocationSweep, EachFailureReachesTheFrameworkAndLeavesNoHandle) {
    long failures = 0;
    for (const FullRequest& request : fullRequests()) {
        for (long nth = 1;; ++nth) {
            SCOPED_TRACE(std::string(request.name) + ", allocation " + std::to_string(nth));
            if (!failsAt(nth, request)) {
                break;
            }
            ++failures;
        }
    }
    EXPECT_GT(failures, 100);
}

} // namespace
