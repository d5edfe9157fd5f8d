// Taking a state root into use.
#ifndef VELT_STANDALONE_CONTROL_OPEN_STATE_H
#define VELT_STANDALONE_CONTROL_OPEN_STATE_H

#include "base/result.h"

#include <filesystem>

namespace velt {

/// Chooses the root folder of all stored state ("/" in production), and writes the default settings where
/// there are none yet: both services off. Settings that are there already stay, also when they are damaged:
/// that shows when they are read. To be called once, before any other operation of the library and while the
/// process has one thread only.
Result<> openState(const std::filesystem::path& root);

} // namespace velt

#endif
