// The loaded modules and their rows.
#ifndef VELT_HOST_MODULE_MODULE_TABLE_H
#define VELT_HOST_MODULE_MODULE_TABLE_H

#include "platform/webapi.h"

#include <filesystem>
#include <map>
#include <stdexcept>
#include <string>
#include <string_view>
#include <tuple>
#include <vector>

namespace velt::host {

/// A module cannot be loaded; what() is a sentence for the administrator.
class LoadError : public std::runtime_error {
public:
    using std::runtime_error::runtime_error;
};

struct Row {
    std::string api;
    int version;
    std::string method;
    VELT::APIEntryFunction entry;

    /// Whether the method only reads: "get", "list", "load", and names that begin with "get_" or "list_".
    bool reads() const;

    /// Whether GET may call it: it reads and needs no parameters ("list" does).
    bool callableByGet() const;

    /// "VELT.Core.FileServ.FTP v3 get"
    std::string name() const;
};

/// Filled at the start, then constant and safe to use from any thread. Keeps the modules loaded.
class ModuleTable {
public:
    ModuleTable() = default;
    ~ModuleTable();
    ModuleTable(const ModuleTable&) = delete;
    ModuleTable& operator=(const ModuleTable&) = delete;

    /// Loads a module and adds its rows. Throws LoadError, also for a row that exists already.
    void load(const std::filesystem::path& file);

    /// Null when there is no such row.
    const Row* find(std::string_view api, int version, std::string_view method) const;

    /// All rows, by API, version and method.
    std::vector<const Row*> rows() const;

private:
    struct Entry {
        Row row;
        std::string file;
    };

    using Key = std::tuple<std::string, int, std::string>;

    void addRows(const VELT::APITableRow* table, const std::string& file);

    std::map<Key, Entry> rows_;
    std::vector<void*> modules_;
};

} // namespace velt::host

#endif
