#include "standalone/journal/statement.h"

namespace velt {

int Statement::prepare(sqlite3* database, const char* sql) {
    return sqlite3_prepare_v3(database, sql, -1, SQLITE_PREPARE_PERSISTENT, &statement_, nullptr);
}

void Statement::bind(int parameter, const std::string& text) {
    sqlite3_bind_text64(statement_, parameter, text.data(), text.size(), SQLITE_TRANSIENT, SQLITE_UTF8);
}

int Statement::run() {
    int result = SQLITE_ROW;
    while (result == SQLITE_ROW) {
        result = step();
    }
    reset();
    return result;
}

std::string Statement::text(int column) {
    const auto* const text = sqlite3_column_text(statement_, column);
    if (text == nullptr) {
        return {};
    }
    return {reinterpret_cast<const char*>(text),
            static_cast<std::size_t>(sqlite3_column_bytes(statement_, column))};
}

} // namespace velt
