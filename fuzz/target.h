// What the fuzz targets have in common: each gets bytes that anybody may have sent or left in a file.
#ifndef VELT_FUZZ_TARGET_H
#define VELT_FUZZ_TARGET_H

#include <cstddef>
#include <cstdint>
#include <cstdio>
#include <cstdlib>
#include <string>

// The name is libFuzzer's. Returns 0; a finding is a crash.
extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size);

namespace velt::fuzz {

inline std::string textOf(const std::uint8_t* data, std::size_t size) {
    return {reinterpret_cast<const char*>(data), size};
}

/// Ends the program unless the promise holds for this input.
inline void check(bool holds, const char* promise) {
    if (!holds) {
        std::fprintf(stderr, "broken: %s\n", promise);
        std::abort();
    }
}

} // namespace velt::fuzz

#endif
