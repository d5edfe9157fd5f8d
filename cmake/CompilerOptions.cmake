# velt_options: what every target of ours is compiled with.
add_library(velt_options INTERFACE)
target_compile_options(velt_options INTERFACE
    -Wall -Wextra -Wpedantic -Wshadow -Wconversion -Wsign-conversion -Wformat=2
    $<$<COMPILE_LANGUAGE:CXX>:-Wnon-virtual-dtor -Woverloaded-virtual>
    $<$<BOOL:${VELT_WARNINGS_AS_ERRORS}>:-Werror>)
if(CMAKE_CXX_COMPILER_ID STREQUAL "GNU" AND CMAKE_CXX_COMPILER_VERSION VERSION_LESS 13)
    # Optimising, g++ 12 takes a text that is put before a std::string for one that overlaps it.
    target_compile_options(velt_options INTERFACE -Wno-restrict)
endif()
target_include_directories(velt_options INTERFACE ${PROJECT_SOURCE_DIR})

# What makes a mistake in a program harder to use. scripts/check-hardening looks at what was built.
set(CMAKE_POSITION_INDEPENDENT_CODE ON) # which has programs loaded wherever the kernel likes
include(CheckPIESupported)
check_pie_supported(LANGUAGES CXX)
include(CheckCXXCompilerFlag)
foreach(flag stack-protector-strong stack-clash-protection cf-protection) # the last is for x86 processors only
    string(MAKE_C_IDENTIFIER VELT_HAS_${flag} known)
    check_cxx_compiler_flag(-f${flag} ${known})
    if(${known})
        target_compile_options(velt_options INTERFACE -f${flag})
    endif()
endforeach()
if(NOT VELT_SANITIZE)
    # Its checks of sizes are the optimiser's work. A distribution's compiler may have a level of its own.
    target_compile_options(velt_options INTERFACE
        "$<$<CONFIG:Release,RelWithDebInfo,MinSizeRel>:SHELL:-U_FORTIFY_SOURCE -D_FORTIFY_SOURCE=2>")
endif()
target_link_options(velt_options INTERFACE -Wl,-z,relro,-z,now,-z,noexecstack)

if(VELT_SANITIZE)
    add_compile_options(-fsanitize=${VELT_SANITIZE} -fno-sanitize-recover=all -fno-omit-frame-pointer)
    add_link_options(-fsanitize=${VELT_SANITIZE})
endif()
