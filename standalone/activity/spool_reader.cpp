#include "standalone/activity/spool_reader.h"

#include "base/file.h"
#include "base/unique_fd.h"
#include "standalone/activity/record_line.h"
#include "standalone/activity/spool.h"
#include "standalone/activity/spool_text.h"
#include "standalone/core/paths.h"

#include <fcntl.h>
#include <sys/file.h>
#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <chrono>
#include <cstdlib>
#include <string>
#include <utility>

namespace velt {

static_assert(paths::spools == VELT_SPOOL_FOLDER);

struct SpoolReader::Spool {
    std::filesystem::path path;
    UniqueFd file;
    std::int64_t number = 0; ///< of the inode
    std::int64_t taken = 0;
    std::int64_t size = 0;
    bool last = false; ///< nobody writes to it any more
};

namespace {

constexpr std::string_view spoolName = VELT_SPOOL_NAME;

bool isFormer(const std::filesystem::path& path) {
    return path.filename() != spoolName;
}

/// Nothing when it cannot be read.
std::optional<std::string> readPart(int file, std::int64_t from, std::int64_t size) {
    std::string text(static_cast<std::size_t>(size), '\0');
    const ssize_t length = ::pread(file, text.data(), text.size(), from);
    if (length < 0) {
        return std::nullopt;
    }
    text.resize(static_cast<std::size_t>(length));
    return text;
}

/// What was taken over holds no room any more, where the file system can do that. A spool of which it cannot
/// is exchanged in time all the same.
void giveRoomBack(int file, std::int64_t upTo) {
    constexpr std::int64_t block = 4096;
    const std::int64_t whole = upTo / block * block;
    if (whole > 0) {
        static_cast<void>(::fallocate(file, FALLOC_FL_PUNCH_HOLE | FALLOC_FL_KEEP_SIZE, 0, whole));
    }
}

/// How much of a text in which no line ends is no record, and never will be.
std::int64_t unendedPart(const std::string& text, bool last) {
    return last || text.size() > std::size_t{velt_longest_line} ? static_cast<std::int64_t>(text.size()) : 0;
}

} // namespace

SpoolReader::SpoolReader(std::filesystem::path folder, OperationStore& store, Sizes sizes)
    : folder_(std::move(folder)), store_(store), sizes_(sizes) {}

/// Former ones first, in the order in which they were exchanged.
Result<std::vector<std::filesystem::path>> SpoolReader::spools() const {
    std::vector<std::filesystem::path> found;
    std::error_code error;
    for (std::filesystem::directory_iterator entry(folder_, error), end; !error && entry != end;
         entry.increment(error)) {
        const std::string name = entry->path().filename().string();
        if (name == spoolName || name.starts_with(std::string(spoolName) + '.')) {
            found.push_back(entry->path());
        }
    }
    if (error && error != std::errc::no_such_file_or_directory) {
        return cannot("list", folder_, error.value());
    }
    std::ranges::sort(found, {}, [](const auto& path) { return std::pair(!isFormer(path), path); });
    return found;
}

Result<SpoolReader::Taken> SpoolReader::take() {
    VELT_ASSIGN_OR_RETURN(const auto found, spools());
    Taken all;
    for (const auto& path : found) {
        VELT_RETURN_IF_ERROR(takeFrom(path, all));
    }
    return all;
}

Result<> SpoolReader::takeFrom(const std::filesystem::path& path, Taken& all) {
    Spool spool{path, UniqueFd(::open(path.c_str(), O_RDWR | O_NOFOLLOW | O_NONBLOCK | O_CLOEXEC))};
    struct stat status {};
    if (!spool.file || ::fstat(spool.file.get(), &status) < 0) {
        return errno == ENOENT ? Result<>() : cannot("open", path);
    }
    if (!S_ISREG(status.st_mode)) {
        return Error("The spool " + path.string() + " is no file.");
    }
    // Whoever wrote to a former one has done so before its lock is gone.
    spool.last = isFormer(path) && ::flock(spool.file.get(), LOCK_EX | LOCK_NB) == 0;
    if (spool.last && ::fstat(spool.file.get(), &status) < 0) {
        return cannot("read", path);
    }
    spool.number = static_cast<std::int64_t>(status.st_ino);
    spool.size = status.st_size;
    VELT_ASSIGN_OR_RETURN(spool.taken, store_.taken(spool.number));
    // Another file may have got the number of one that somebody removed.
    spool.taken = spool.taken > spool.size ? 0 : spool.taken;
    VELT_RETURN_IF_ERROR(takePart(spool, all));
    if (isFormer(path)) {
        return spool.last && spool.taken >= spool.size ? remove(spool) : Result<>();
    }
    return spool.size >= sizes_.largest ? exchange(spool) : Result<>();
}

Result<> SpoolReader::takePart(Spool& spool, Taken& all) {
    // In front of this there is nothing but the room that was given back.
    const std::int64_t data = ::lseek(spool.file.get(), spool.taken, SEEK_DATA);
    const std::int64_t from = std::max(spool.taken, data);
    if (from >= spool.size) {
        return {};
    }
    const auto text = readPart(spool.file.get(), from, std::min(sizes_.part, spool.size - from));
    if (!text) {
        return cannot("read", spool.path);
    }
    SpoolText read = parseSpool(*text);
    const std::int64_t taken =
        read.taken > 0 ? static_cast<std::int64_t>(read.taken) : unendedPart(*text, spool.last);
    if (taken == 0) {
        return {};
    }
    VELT_ASSIGN_OR_RETURN(auto records, store_.take(spool.number, from + taken, std::move(read.records)));
    spool.taken = from + taken;
    giveRoomBack(spool.file.get(), spool.taken);
    std::ranges::move(records, std::back_inserter(all.records));
    // What nobody will end is no record; a stretch that is passed over in parts counts at its end.
    const bool isCut = read.taken == 0 && spool.last && text->find_first_not_of('\0') != text->npos;
    all.damaged += read.damaged + (isCut ? 1 : 0);
    all.more = all.more || spool.taken < spool.size;
    return {};
}

/// The next session that opens the spool makes a new one.
Result<> SpoolReader::exchange(const Spool& spool) {
    const auto now = std::chrono::system_clock::now().time_since_epoch();
    std::filesystem::path former = spool.path;
    former += '.' + std::to_string(std::chrono::floor<std::chrono::microseconds>(now).count());
    return ::rename(spool.path.c_str(), former.c_str()) == 0 ? Result<>() : cannot("rename", spool.path);
}

Result<> SpoolReader::remove(const Spool& spool) {
    // If this is cut off, the file is taken over once more, and all its records are known.
    VELT_RETURN_IF_ERROR(store_.forget(spool.number));
    return ::unlink(spool.path.c_str()) == 0 ? Result<>() : cannot("remove", spool.path);
}

} // namespace velt
