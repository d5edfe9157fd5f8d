// What the dynamic linker sees of a shared object (elf(5)).
#ifndef VELT_TESTS_ABI_ELF_FILE_H
#define VELT_TESTS_ABI_ELF_FILE_H

#include <set>
#include <string>

struct ElfFile {
    std::string soname;
    std::set<std::string> needed;
    std::set<std::string> defined;   ///< names that its dynamic symbol table defines
    std::set<std::string> undefined; ///< names that it expects others to define, weak ones left out
};

/// Reads a 64-bit shared object; throws std::runtime_error when it is none.
ElfFile readElf(const std::string& path);

#endif
