// What an operation gives: its value, or the reason why there is none.
#ifndef VELT_BASE_RESULT_H
#define VELT_BASE_RESULT_H

#include <string>
#include <type_traits>
#include <utility>
#include <variant>

namespace velt {

/// The kind of an error. Each program names its own; 0 is an error whose message says all there is to know.
enum class ErrorNumber : int;

/// A place in the source. (Not every compiler that builds this has std::source_location.)
struct SourcePlace {
    const char* file = "";
    int line = 0;

    /// The place of the call; as a default argument, that of the caller's call.
    static constexpr SourcePlace current(const char* file = __builtin_FILE(), int line = __builtin_LINE()) {
        return {file, line};
    }
};

/// Why an operation failed.
struct Error {
    ErrorNumber number{};
    std::string message; ///< a sentence that says what failed and why
    SourcePlace where;   ///< where it was noticed

    Error(ErrorNumber kind, std::string sentence, SourcePlace place = SourcePlace::current())
        : number(kind), message(std::move(sentence)), where(place) {}
    explicit Error(std::string sentence, SourcePlace place = SourcePlace::current())
        : Error(ErrorNumber{}, std::move(sentence), place) {}
};

/// A value, or the Error that says why there is no value. An operation that can fail but has no value to give
/// returns a Result<>. Ask for the value only after a success, and for the error only after a failure.
///
///     VELT_ASSIGN_OR_RETURN(const std::string text, readFile(path));
template<class Value = void> class [[nodiscard]] Result {
    template<class From>
    static constexpr bool isMadeOf =
        std::is_convertible_v<From, Value> && !std::is_same_v<std::remove_cvref_t<From>, Value> &&
        !std::is_same_v<std::remove_cvref_t<From>, Error>;

public:
    Result(Value value) : outcome_(std::move(value)) {}
    Result(Error error) : outcome_(std::move(error)) {}
    /// From anything that converts to the value, such as std::nullopt or a literal.
    template<class From>
    requires(isMadeOf<From>)
        // NOLINTNEXTLINE(bugprone-forwarding-reference-overload): never a Result, as required
        Result(From&& value)
        : outcome_(Value(std::forward<From>(value))) {}

    explicit operator bool() const { return std::holds_alternative<Value>(outcome_); }
    Value& operator*() { return std::get<Value>(outcome_); }
    const Value& operator*() const { return std::get<Value>(outcome_); }
    Value* operator->() { return &std::get<Value>(outcome_); }
    const Value* operator->() const { return &std::get<Value>(outcome_); }
    Value valueOr(Value otherwise) const { return *this ? **this : std::move(otherwise); }
    friend bool operator==(const Result& result, const Value& value) { return result && *result == value; }
    Error& error() { return std::get<Error>(outcome_); }
    const Error& error() const { return std::get<Error>(outcome_); }

private:
    std::variant<Value, Error> outcome_;
};

template<> class [[nodiscard]] Result<void> {
public:
    Result() = default;
    Result(Error error) : outcome_(std::move(error)) {}

    explicit operator bool() const { return std::holds_alternative<std::monostate>(outcome_); }
    Error& error() { return std::get<Error>(outcome_); }
    const Error& error() const { return std::get<Error>(outcome_); }

private:
    std::variant<std::monostate, Error> outcome_;
};

} // namespace velt

// A name of its own for each use, since an expression may hold a lambda that uses these macros too.
#define VELT_RESULT_NAME_OF(number) veltResult##number
#define VELT_RESULT_NAME(number) VELT_RESULT_NAME_OF(number)

/// Declares a variable with the value of a Result, or returns its error, unchanged, from the function, which
/// has to give a Result as well. Two statements: not for the branch of an `if` without braces.
#define VELT_ASSIGN_OR_RETURN(declaration, ...)                                                              \
    VELT_ASSIGN_OR_RETURN_BY(VELT_RESULT_NAME(__COUNTER__), declaration, __VA_ARGS__)
#define VELT_ASSIGN_OR_RETURN_BY(result, declaration, ...)                                                   \
    auto result = (__VA_ARGS__);                                                                             \
    if (!result)                                                                                             \
        return std::move(result.error());                                                                    \
    declaration = std::move(*result)

/// Returns the error of a Result<>, unchanged, from the function, which has to give a Result as well. What
/// gives a value does not compile: it may be a lock, which would end at once.
#define VELT_RETURN_IF_ERROR(...) VELT_RETURN_IF_ERROR_BY(VELT_RESULT_NAME(__COUNTER__), __VA_ARGS__)
#define VELT_RETURN_IF_ERROR_BY(result, ...)                                                                 \
    do {                                                                                                     \
        if (velt::Result<> result = (__VA_ARGS__); !result)                                                  \
            return std::move(result.error());                                                                \
    } while (false)

#endif
