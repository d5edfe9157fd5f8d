#include "host/module/module_table.h"

#include <dlfcn.h>

#include <utility>

namespace velt::host {

namespace {

using GetAPITable = const VELT::APITableRow* (*)();

bool isEnd(const VELT::APITableRow& row) {
    return row.api == nullptr && row.version == 0 && row.method == nullptr && row.entry == nullptr;
}

bool isComplete(const VELT::APITableRow& row) {
    return row.api != nullptr && row.method != nullptr && row.entry != nullptr;
}

std::string lastLoaderError() {
    const char* const error = dlerror(); // NOLINT(concurrency-mt-unsafe)
    return error == nullptr ? "unknown reason" : error;
}

} // namespace

bool Row::reads() const {
    return method == "get" || method == "list" || method == "load" || method.starts_with("get_") ||
           method.starts_with("list_");
}

bool Row::callableByGet() const {
    return reads() && method != "list";
}

std::string Row::name() const {
    return api + " v" + std::to_string(version) + " " + method;
}

ModuleTable::~ModuleTable() {
    for (void* module : modules_) {
        dlclose(module);
    }
}

void ModuleTable::load(const std::filesystem::path& file) {
    // A name without a slash would make dlopen search the library path.
    const std::string path = std::filesystem::absolute(file).string();
    void* const module = dlopen(path.c_str(), RTLD_NOW | RTLD_LOCAL);
    if (module == nullptr) {
        throw LoadError("Cannot load the module: " + lastLoaderError() + ".");
    }
    modules_.push_back(module);
    void* const symbol = dlsym(module, "GetAPITable");
    if (symbol == nullptr) {
        throw LoadError(path + " is not a module: it does not export GetAPITable.");
    }
    const auto getTable = reinterpret_cast<GetAPITable>(symbol); // NOLINT(*-reinterpret-cast)
    const VELT::APITableRow* const table = getTable();
    if (table == nullptr) {
        throw LoadError("The module " + path + " returns no API table.");
    }
    addRows(table, path);
}

void ModuleTable::addRows(const VELT::APITableRow* table, const std::string& file) {
    for (const VELT::APITableRow* row = table; !isEnd(*row); ++row) {
        if (!isComplete(*row)) {
            throw LoadError("Row " + std::to_string(row - table + 1) + " of the API table of " + file +
                            " is incomplete.");
        }
        Entry entry{{row->api, row->version, row->method, row->entry}, file};
        const std::string name = entry.row.name();
        const auto [place, added] =
            rows_.try_emplace(Key{row->api, row->version, row->method}, std::move(entry));
        if (!added) {
            std::string reason = "The row " + name + " is served twice: by ";
            reason.append(place->second.file).append(" and by ").append(file).append(".");
            throw LoadError(reason);
        }
    }
}

const Row* ModuleTable::find(std::string_view api, int version, std::string_view method) const {
    const auto found = rows_.find(Key{api, version, method});
    return found == rows_.end() ? nullptr : &found->second.row;
}

std::vector<const Row*> ModuleTable::rows() const {
    std::vector<const Row*> rows;
    rows.reserve(rows_.size());
    for (const auto& [key, entry] : rows_) {
        rows.push_back(&entry.row);
    }
    return rows;
}

} // namespace velt::host
