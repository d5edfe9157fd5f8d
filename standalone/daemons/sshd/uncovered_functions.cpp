#include "standalone/daemons/sshd/uncovered_functions.h"

#include "base/file.h"
#include "standalone/core/error_number.h"

#include <elf.h>
#include <link.h>

#include <algorithm>
#include <array>
#include <cstdint>
#include <cstring>
#include <optional>
#include <set>
#include <string_view>

namespace velt {
namespace {

// Not among them: what works on a descriptor that is open for writing, and what a session cannot have the
// daemon do, such as labels of terminals and sockets for forwarding.
constexpr std::array<std::string_view, 79> changingFunctions{
    "__futimens64", "__futimes64",  "__lutimes64",   "__open64_2",   "__open_2",    "__openat64_2",
    "__openat_2",   "__utime64",    "__utimensat64", "__utimes64",   "__xmknod",    "__xmknodat",
    "acl_set_fd",   "acl_set_file", "chmod",         "chown",        "chroot",      "closefrom",
    "creat",        "creat64",      "fchmod",        "fchmodat",     "fchown",      "fchownat",
    "fopen",        "fopen64",      "fremovexattr",  "freopen",      "freopen64",   "fsetxattr",
    "futimens",     "futimes",      "futimesat",     "initgroups",   "lchmod",      "lchown",
    "link",         "linkat",       "listen",        "lremovexattr", "lsetxattr",   "lutimes",
    "mkdir",        "mkdirat",      "mkdtemp",       "mkfifo",       "mkfifoat",    "mknod",
    "mknodat",      "mkostemp",     "mkostemp64",    "mkostemps",    "mkostemps64", "mkstemp",
    "mkstemp64",    "mkstemps",     "mkstemps64",    "open",         "open64",      "open_by_handle_at",
    "openat",       "openat64",     "remove",        "removexattr",  "rename",      "renameat",
    "renameat2",    "rmdir",        "setxattr",      "symlink",      "symlinkat",   "syscall",
    "truncate",     "truncate64",   "unlink",        "unlinkat",     "utime",       "utimensat",
    "utimes",
};

/// A part of a file's text as the structures that stand there; nothing when it is not wholly within the file.
template<class Entry>
std::optional<std::vector<Entry>> entriesAt(const std::string& text, std::uint64_t offset,
                                            std::uint64_t size) {
    if (offset > text.size() || size > text.size() - offset) {
        return std::nullopt;
    }
    std::vector<Entry> entries(size / sizeof(Entry));
    std::memcpy(entries.data(), text.data() + offset, entries.size() * sizeof(Entry));
    return entries;
}

using Header = ElfW(Ehdr);
using Section = ElfW(Shdr);
using Symbol = ElfW(Sym);

std::optional<std::vector<Section>> sectionsOf(const std::string& text) {
    const auto header = entriesAt<Header>(text, 0, sizeof(Header));
    constexpr unsigned char wordSize = sizeof(void*) == 8 ? ELFCLASS64 : ELFCLASS32;
    if (!header || std::memcmp(header->front().e_ident, ELFMAG, SELFMAG) != 0 ||
        header->front().e_ident[EI_CLASS] != wordSize || header->front().e_shentsize != sizeof(Section)) {
        return std::nullopt;
    }
    return entriesAt<Section>(text, header->front().e_shoff, header->front().e_shnum * sizeof(Section));
}

std::optional<DynamicFunctions> functionsIn(const std::string& text) {
    const auto sections = sectionsOf(text);
    if (!sections) {
        return std::nullopt;
    }
    const auto table =
        std::ranges::find_if(*sections, [](const Section& each) { return each.sh_type == SHT_DYNSYM; });
    if (table == sections->end() || table->sh_link >= sections->size()) {
        return std::nullopt;
    }
    const Section& texts = (*sections)[table->sh_link];
    const auto names = entriesAt<char>(text, texts.sh_offset, texts.sh_size);
    const auto symbols = entriesAt<Symbol>(text, table->sh_offset, table->sh_size);
    if (!names || names->empty() || names->back() != '\0' || !symbols) {
        return std::nullopt;
    }
    DynamicFunctions functions;
    for (const Symbol& symbol : *symbols) {
        if (symbol.st_name >= names->size()) {
            return std::nullopt;
        }
        auto& list = symbol.st_shndx == SHN_UNDEF ? functions.imported : functions.offered;
        list.emplace_back(names->data() + symbol.st_name);
    }
    return functions;
}

} // namespace

Result<DynamicFunctions> dynamicFunctionsOf(const std::filesystem::path& file) {
    VELT_ASSIGN_OR_RETURN(const auto text, readFile(file));
    auto functions = functionsIn(text);
    return functions ? Result<DynamicFunctions>(std::move(*functions))
                     : Error(ErrorNumber::daemon, "Cannot tell which functions " + file.string() + " calls.");
}

Result<std::vector<std::string>> uncoveredFunctions(const std::vector<std::filesystem::path>& programs,
                                                    const std::filesystem::path& library) {
    VELT_ASSIGN_OR_RETURN(const auto wrappers, dynamicFunctionsOf(library));
    const std::set<std::string> offered(wrappers.offered.begin(), wrappers.offered.end());
    std::set<std::string> uncovered;
    for (const auto& program : programs) {
        VELT_ASSIGN_OR_RETURN(const auto functions, dynamicFunctionsOf(program));
        for (const std::string& name : functions.imported) {
            if (std::ranges::find(changingFunctions, name) != changingFunctions.end() &&
                !offered.contains(name)) {
                uncovered.insert(name);
            }
        }
    }
    return std::vector<std::string>(uncovered.begin(), uncovered.end());
}

} // namespace velt
