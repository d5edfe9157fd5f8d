#include "tests/abi/elf_file.h"

#include <elf.h>

#include <cstring>
#include <fstream>
#include <iterator>
#include <stdexcept>
#include <vector>

namespace {

class Image {
public:
    explicit Image(const std::string& path) {
        std::ifstream file(path, std::ios::binary);
        bytes_.assign(std::istreambuf_iterator<char>(file), {});
        if (bytes_.size() < sizeof(Elf64_Ehdr) || std::memcmp(bytes_.data(), ELFMAG, SELFMAG) != 0 ||
            bytes_[EI_CLASS] != ELFCLASS64) {
            throw std::runtime_error(path + " is no 64-bit ELF file");
        }
    }

    template<typename T> T at(std::size_t offset) const {
        if (offset + sizeof(T) > bytes_.size()) {
            throw std::runtime_error("ELF file cut short");
        }
        T value{};
        std::memcpy(&value, bytes_.data() + offset, sizeof(T));
        return value;
    }

    std::string text(std::size_t offset) const { return {bytes_.data() + offset}; }

    /// The first section of a type.
    Elf64_Shdr section(Elf64_Word type) const {
        const auto header = at<Elf64_Ehdr>(0);
        for (std::size_t i = 0; i < header.e_shnum; ++i) {
            const auto section = sectionAt(i);
            if (section.sh_type == type) {
                return section;
            }
        }
        throw std::runtime_error("ELF section missing");
    }

    Elf64_Shdr sectionAt(std::size_t index) const {
        const auto header = at<Elf64_Ehdr>(0);
        return at<Elf64_Shdr>(header.e_shoff + index * header.e_shentsize);
    }

private:
    std::vector<char> bytes_;
};

void readSymbols(const Image& image, ElfFile& file) {
    const Elf64_Shdr table = image.section(SHT_DYNSYM);
    const Elf64_Shdr names = image.sectionAt(table.sh_link);
    for (std::size_t i = 1; i < table.sh_size / sizeof(Elf64_Sym); ++i) {
        const auto symbol = image.at<Elf64_Sym>(table.sh_offset + i * sizeof(Elf64_Sym));
        const std::string name = image.text(names.sh_offset + symbol.st_name);
        if (symbol.st_shndx != SHN_UNDEF) {
            file.defined.insert(name);
        } else if (ELF64_ST_BIND(symbol.st_info) != STB_WEAK) {
            file.undefined.insert(name);
        }
    }
}

void readDynamic(const Image& image, ElfFile& file) {
    const Elf64_Shdr table = image.section(SHT_DYNAMIC);
    const Elf64_Shdr names = image.sectionAt(table.sh_link);
    for (std::size_t i = 0; i < table.sh_size / sizeof(Elf64_Dyn); ++i) {
        const auto entry = image.at<Elf64_Dyn>(table.sh_offset + i * sizeof(Elf64_Dyn));
        if (entry.d_tag == DT_NEEDED) {
            file.needed.insert(image.text(names.sh_offset + entry.d_un.d_val));
        } else if (entry.d_tag == DT_SONAME) {
            file.soname = image.text(names.sh_offset + entry.d_un.d_val);
        }
    }
}

} // namespace

ElfFile readElf(const std::string& path) {
    const Image image(path);
    ElfFile file;
    readSymbols(image, file);
    readDynamic(image, file);
    return file;
}
