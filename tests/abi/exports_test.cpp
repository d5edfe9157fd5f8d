// What the built module shows to the dynamic linker.

#include "tests/abi/elf_file.h"

#include <dlfcn.h>
#include <gtest/gtest.h>

#include <fstream>
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

bool isSanitizerRuntime(const std::string& library) {
    return library.starts_with("libasan") || library.starts_with("libubsan") ||
           library.starts_with("libtsan");
}

TEST(Exports, AreTheTableAndTheFunctionThatHandsItOutAndNothingElse) {
    EXPECT_EQ(readElf(MODULE_PATH).defined, (Names{"GetAPITable", "gTable"}));
}

TEST(Exports, TheSonameIsTheFileName) {
    EXPECT_EQ(readElf(MODULE_PATH).soname, "VELT.Core.FileServ.FTP.so");
    EXPECT_TRUE(std::string(MODULE_PATH).ends_with("/VELT.Core.FileServ.FTP.so"));
}

TEST(Exports, NoPlatformLibraryIsNamed) {
    const Names ordinary = {"libjsoncpp.so.25", "libstdc++.so.6", "libgcc_s.so.1",
                            "libc.so.6",        "libm.so.6",      "ld-linux-x86-64.so.2"};
    for (const std::string& library : readElf(MODULE_PATH).needed) {
        EXPECT_TRUE(ordinary.contains(library) || isSanitizerRuntime(library)) << library;
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
