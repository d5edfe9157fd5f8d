// The system log: calls of syslog, and what the compiler's fortification makes of them, are captured.
//
// <syslog.h> is not included: with fortification it defines syslog itself.

#include "tests/support/fake_platform/fake_platform.h"
#include "tests/support/fake_platform/text.h"

#include <cstdarg>
#include <cstdio>
#include <cstring>

namespace fake {

namespace {

/// One conversion of a format: its length modifiers and its letter.
struct Conversion {
    std::string length;
    char letter = 0;
};

std::vector<Conversion> conversionsOf(const char* format) {
    std::vector<Conversion> conversions;
    for (const char* p = std::strchr(format, '%'); p != nullptr; p = std::strchr(p, '%')) {
        ++p;
        p += std::strspn(p, "#0- +'123456789.");
        const size_t lengthSize = std::strspn(p, "hljzt");
        Conversion conversion{std::string(p, lengthSize), p[lengthSize]};
        p += lengthSize;
        if (conversion.letter == 0) {
            break;
        }
        ++p;
        // "%m" is the text of errno and takes no argument.
        if (conversion.letter != '%' && conversion.letter != 'm') {
            conversions.push_back(conversion);
        }
    }
    return conversions;
}

/// The arguments of one call, taken one by one in the order of the format's conversions.
class Arguments {
public:
    explicit Arguments(va_list& list) : list_(list) {}

    std::string takeText() {
        const char* text = va_arg(list_, const char*);
        return text == nullptr ? "" : text;
    }

    int takeInt() { return va_arg(list_, int); }

    std::string take(const Conversion& conversion) {
        switch (conversion.letter) {
        case 's':
            return render(va_arg(list_, const char*));
        case 'd':
        case 'i':
            return std::to_string(conversion.length.empty() ? va_arg(list_, int) : va_arg(list_, long));
        case 'u':
            return std::to_string(takeUnsigned(conversion));
        case 'x':
        case 'X':
            return render(Hex{takeUnsigned(conversion)});
        case 'c':
            return quoted(std::string(1, static_cast<char>(va_arg(list_, int))));
        default:
            throw std::invalid_argument("syslog format with an unknown conversion");
        }
    }

private:
    unsigned long takeUnsigned(const Conversion& conversion) {
        return conversion.length.empty() ? va_arg(list_, unsigned) : va_arg(list_, unsigned long);
    }

    va_list& list_;
};

std::string rendered(const char* format, va_list& list) {
    va_list forSize;
    va_copy(forSize, list);
    const int size = std::vsnprintf(nullptr, 0, format, forSize);
    va_end(forSize);
    std::string text(static_cast<size_t>(size > 0 ? size : 0) + 1, '\0');
    va_list forText;
    va_copy(forText, list);
    std::vsnprintf(text.data(), text.size(), format, forText);
    va_end(forText);
    text.pop_back();
    return text;
}

void capture(int priority, const char* format, va_list& list) {
    LogLine line{priority, format, "", 0, rendered(format, list)};
    auto conversions = conversionsOf(format);
    Arguments values(list);
    std::string shown = arguments(priority, format);
    if (line.format.starts_with("%s:%d ")) {
        line.source = values.takeText();
        line.line = values.takeInt();
        shown += ", " + quoted(line.source);
        if (line.line <= 0) {
            shown += ", line " + std::to_string(line.line);
        }
        conversions.erase(conversions.begin(), conversions.begin() + 2);
    }
    for (const Conversion& conversion : conversions) {
        shown += ", " + values.take(conversion);
    }
    auto& platform = Platform::instance();
    platform.logLines.push_back(line);
    platform.enter("syslog", shown);
}

} // namespace

} // namespace fake

extern "C" {

void syslog(int priority, const char* format, ...);
void __syslog_chk(int priority, int flag, const char* format, ...);

void syslog(int priority, const char* format, ...) {
    va_list list;
    va_start(list, format);
    fake::capture(priority, format, list);
    va_end(list);
}

void __syslog_chk(int priority, int, const char* format, ...) {
    va_list list;
    va_start(list, format);
    fake::capture(priority, format, list);
    va_end(list);
}

} // extern "C"
