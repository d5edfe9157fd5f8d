// What the built module shows to the dynamic linker.

#include "tests/abi/elf_file.h"

#include <dlfcn.h>
#include <gtest/gtest.h>

#include <algorithm>
#include <fstream>
#include <initializer_list>
#include <set>
#include <string>

namespace {

using Names = std::set<std::string>;

Names contractSymbols() {
    std::ifstream file(CONTRACT_SYMBOLS);
    Names names;
    for (std::string line; std::getline(file, line);) {
        if (!line.empty() && line.front() != '#') {
            names.insert(line);
        }
    }
    return names;
}

bool startsWithOneOf(const std::string& text, std::initializer_list<const char*> beginnings) {
    return std::any_of(beginnings.begin(), beginnings.end(),
                       [&text](const char* beginning) { return text.starts_with(beginning); });
}

/// The libraries that any program may need; the dynamic linker's name differs between architectures.
bool isOrdinary(const std::string& library) {
    return startsWithOneOf(
        library, {"libjsoncpp.so.", "libstdc++.so.", "libgcc_s.so.", "libc.so.", "libm.so.", "ld-linux"});
}

bool isSanitizerRuntime(const std::string& library) {
    return startsWithOneOf(library, {"libasan", "libubsan", "libtsan"});
}

TEST(Exports, AreTheTableAndTheFunctionThatHandsItOutAndNothingElse) {
    EXPECT_EQ(readElf(MODULE_PATH).defined, (Names{"GetAPITable", "gTable"}));
}

TEST(Exports, TheSonameIsTheFileName) {
    EXPECT_EQ(readElf(MODULE_PATH).soname, "VELT.Core.FileServ.FTP.so");
    EXPECT_TRUE(std::string(MODULE_PATH).ends_with("/VELT.Core.FileServ.FTP.so"));
}

TEST(Exports, NoPlatformLibraryIsNamed) {
    for (const std::string& library : readElf(MODULE_PATH).needed) {
        EXPECT_TRUE(isOrdinary(library) || isSanitizerRuntime(library)) << library;
    }
}

TEST(Exports, EveryNameOfTheContractIsUsedByTheModule) {
    const Names undefined = readElf(MODULE_PATH).undefined;
    for (const std::string& name : contractSymbols()) {
        EXPECT_TRUE(undefined.contains(name)) << name;
    }
}

TEST(Exports, ThePlatformOfThisTestDefinesEveryNameOfTheContract) {
    const Names names = contractSymbols();
    EXPECT_EQ(names.size(), 60U);
    for (const std::string& name : names) {
        EXPECT_NE(dlsym(RTLD_DEFAULT, name.c_str()), nullptr) << name;
    }
}

} // namespace
