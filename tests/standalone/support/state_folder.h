// A state root of a test's own.
#ifndef VELT_TESTS_STANDALONE_SUPPORT_STATE_FOLDER_H
#define VELT_TESTS_STANDALONE_SUPPORT_STATE_FOLDER_H

#include "standalone/core/state_root.h"
#include "tests/support/temporary_folder.h"

namespace velt::test {

class StateFolder : public TemporaryFolder {
public:
    StateFolder() { setStateRoot(path()); }
};

} // namespace velt::test

#endif
