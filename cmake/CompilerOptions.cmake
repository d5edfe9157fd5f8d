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

if(VELT_SANITIZE)
    add_compile_options(-fsanitize=${VELT_SANITIZE} -fno-sanitize-recover=all -fno-omit-frame-pointer)
    add_link_options(-fsanitize=${VELT_SANITIZE})
endif()
