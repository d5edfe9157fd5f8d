// A state root with no settings in it, and a daemon that takes any.
#ifndef VELT_TESTS_STANDALONE_SETTINGS_SETTINGS_FIXTURE_H
#define VELT_TESTS_STANDALONE_SETTINGS_SETTINGS_FIXTURE_H

#include "standalone/contract/last_error.h"
#include "standalone/core/effects.h"
#include "tests/standalone/settings/fake_candidate.h"
#include "tests/standalone/support/state_folder.h"

#include <gtest/gtest.h>

#include <string>

namespace velt::test {

class SettingsTest : public ::testing::Test {
protected:
    SettingsTest() {
        fakeCandidate() = FakeCandidate();
        clearLastError();
    }
    ~SettingsTest() override { setEffectHook({}); }

    std::string place(const std::string& path) const { return root_.path().string() + path; }

    StateFolder root_;
};

} // namespace velt::test

#endif
