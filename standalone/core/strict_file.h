// Our own settings files: lines "key = value" that a person can read and edit, and a version.
//
// Unlike a file shared with other programs, such a file is read strictly: what is not understood is an error,
// since a setting that is passed over would be in force nowhere and visible everywhere. A file of an older
// version stays readable: a key that came later has its default there.
//
// A line may be blank or end in a comment, from a '#' outside double quotes to the end.
#ifndef VELT_STANDALONE_CORE_STRICT_FILE_H
#define VELT_STANDALONE_CORE_STRICT_FILE_H

#include "base/result.h"

#include <climits>
#include <cstddef>
#include <cstdint>
#include <filesystem>
#include <map>
#include <optional>
#include <string>
#include <string_view>

namespace velt {

/// The versions of a kind of file.
struct FileVersions {
    int newest = 1;
    bool required = true; ///< false: without a line "version = N" a file is of version 1
};

/// In place of the version in which a key came: the key may be left out of a file of any version.
inline constexpr int optionalKey = INT_MAX;

/// One file's keys. The functions that read a value give the default, too, when something is wrong; what that
/// was is the result of finish(), the first problem of several:
///
///     VELT_ASSIGN_OR_RETURN(StrictFile file, StrictFile::load(path));
///     settings.loopbackOnly = file.boolean("loopback_only", false);
///     VELT_RETURN_IF_ERROR(file.finish());
///
/// Errors name the file and, where there is one, the line.
class StrictFile {
public:
    /// The file at `path`. One that does not exist is taken for a file of version 0, in which each key has
    /// its default.
    static Result<StrictFile> load(const std::filesystem::path& path, FileVersions versions = {});

    /// The file with these contents; `name` stands for it in errors.
    static Result<StrictFile> parse(std::string name, std::string_view contents, FileVersions versions = {});

    /// The key's value as written, without the blanks around it. Nothing when the key is not there, which is
    /// a problem unless the file is older than `since`, the version in which the key came.
    std::optional<std::string> value(std::string_view key, int since = 1);

    /// A number of this range; the default without the key.
    std::int64_t number(std::string_view key, std::int64_t least, std::int64_t most, std::int64_t fallback,
                        int since = 1);

    /// 0 or 1.
    bool boolean(std::string_view key, bool fallback, int since = 1);

    /// A text in double quotes, of at most `limit` bytes.
    std::string text(std::string_view key, std::size_t limit, std::string fallback, int since = 1);

    /// Makes the value of `key` a problem: "KEY: expected EXPECTED".
    void refuse(std::string_view key, std::string_view expected);

    /// To be called last: a key that nobody asked for is a problem, too.
    Result<> finish();

private:
    struct Value {
        std::string text;
        int line = 0;
        bool asked = false;
    };

    explicit StrictFile(std::string name) : name_(std::move(name)) {}
    void readLine(std::string_view line, int number);
    Result<> readVersion(FileVersions versions);
    Error problemAt(int line, const std::string& what) const;
    void note(Error problem);

    std::string name_;
    int version_ = 0;
    std::map<std::string, Value, std::less<>> values_;
    std::optional<Error> problem_;
};

} // namespace velt

#endif
