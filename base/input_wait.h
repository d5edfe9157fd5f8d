// Waiting for input in a process that has signals to handle.
#ifndef VELT_BASE_INPUT_WAIT_H
#define VELT_BASE_INPUT_WAIT_H

#include <chrono>

namespace velt {

/// Waits until the descriptor has input or its other end is gone. False when the deadline passes first, and
/// with an unusable descriptor. A signal that the process handles meanwhile does not end the wait.
bool waitForInput(int descriptor, std::chrono::steady_clock::time_point deadline);

} // namespace velt

#endif
