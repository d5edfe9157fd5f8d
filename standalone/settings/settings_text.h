// The form of the stored settings: "key = value" lines that a person can read, below a version.
//
// Unlike a file shared with other programs, a settings file is read strictly: whatever is not understood is
// an error, since a setting passed over in silence would be in force nowhere and visible everywhere.
#ifndef VELT_STANDALONE_SETTINGS_SETTINGS_TEXT_H
#define VELT_STANDALONE_SETTINGS_SETTINGS_TEXT_H

#include <cstdint>
#include <map>
#include <span>
#include <string>
#include <string_view>

namespace velt {

/// The text in double quotes, with \" \\ and \xHH for what is not printable UTF-8.
std::string quotedText(std::string_view text);

/// Takes back quotedText; false when the text does not have that form.
bool readQuotedText(std::string_view quoted, std::string& text);

/// Reads one settings file. The first problem becomes the last error, with file and line, and makes ok()
/// false from then on; the values read afterwards are of no use.
class SettingsReader {
public:
    /// `file` is its name for error sentences. Reads the lines and checks "version": 1 to `newestVersion`.
    /// The contents outlive the reader.
    SettingsReader(std::string file, std::string_view contents, std::int32_t newestVersion);

    std::int32_t integer(const std::string& key);
    bool boolean(const std::string& key);
    /// Fills `bytes` with the quoted text, zeros behind it.
    void bytes(const std::string& key, std::span<char> bytes);
    /// To be called last: a key that nobody asked for is a problem too.
    bool finish();

    bool ok() const { return ok_; }

private:
    struct Value {
        std::string_view text;
        int line = 0;
        bool asked = false;
    };

    void readLine(std::string_view line, int number);
    const Value* ask(const std::string& key);
    void complain(const Value* value, const std::string& what);

    std::string file_;
    std::map<std::string, Value, std::less<>> values_;
    bool ok_ = true;
};

} // namespace velt

#endif
