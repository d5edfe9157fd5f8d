# What most sources include is parsed once for each kind of target. Sources include what they use all the same: a build
# without VELT_PRECOMPILED_HEADERS has to compile as well.
option(VELT_PRECOMPILED_HEADERS "Precompile the headers that most sources include" OFF)

set(velt_common_headers
    <algorithm> <array> <cerrno> <chrono> <cstdint> <cstdio> <cstdlib> <cstring> <filesystem> <fstream> <functional>
    <map> <memory> <mutex> <optional> <set> <sstream> <stdexcept> <string> <string_view> <system_error> <thread>
    <utility> <vector> <json/json.h>)
list(TRANSFORM velt_common_headers REPLACE "(.+)" "$<$<COMPILE_LANGUAGE:CXX>:\\1>")

if(VELT_PRECOMPILED_HEADERS)
    # A compiler cache knows a precompiled header by what it was made of.
    add_compile_options("$<$<CXX_COMPILER_ID:GNU>:-fpch-preprocess>" "$<$<COMPILE_LANG_AND_ID:CXX,Clang>:SHELL:-Xclang -fno-pch-timestamp>")
endif()

# Precompiles the common headers for a target, and those that are named beside it.
function(velt_precompile_headers target)
    if(VELT_PRECOMPILED_HEADERS)
        list(TRANSFORM ARGN REPLACE "(.+)" "$<$<COMPILE_LANGUAGE:CXX>:\\1>")
        target_precompile_headers(${target} PRIVATE ${velt_common_headers} ${ARGN})
    endif()
endfunction()
