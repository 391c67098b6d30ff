#pragma once

#include "b_config.h"
#include "b_containers.h"
#include "b_types.h"

#include <exception>

/// The exception family. Errors of programs and of the environment travel as these; data faults
/// become log lines.
namespace base {

class ILog;

/// An error with its text and the place that raised it. `file` is the subject of a source
/// ("b_stream"), not a path, `function` the qualified name of the operation.
class BASE1_API exception : public std::exception {
public:
    explicit exception(string text, const char* file = nullptr, const char* function = nullptr,
                       int line = 0);
    exception(const exception&);
    exception& operator=(const exception&);
    ~exception() override;
    const char* what() const noexcept override;
    /// Writes the error to `log`: text, file and line, function, and the call stack if there is
    /// one; on the system channel, level 2.
    virtual void report(ILog& log) const;

    const char* file() const noexcept { return file_; }
    const char* function() const noexcept { return function_; }
    int line() const noexcept { return line_; }

    /// The call stack at the place that raised the error; empty where nothing recorded it.
    const string& callStack() const noexcept { return callStack_; }
    void setCallStack(string text) { callStack_ = std::move(text); }

protected:
    /// The shared end of `report`: the call stack, if there is one.
    void reportCallStack(ILog& log) const;

private:
    string text_;
    const char* file_;
    const char* function_;
    int line_;
    string callStack_;
};

/// A call to the operating system failed. `what()` is the plain text; `report` adds the code.
class BASE1_API api_exception : public exception {
public:
    /// `code` is the value of `errno`.
    api_exception(string text, int code, const char* file = nullptr, const char* function = nullptr,
                  int line = 0);
    ~api_exception() override;
    void report(ILog& log) const override;
    int code() const noexcept { return code_; }

private:
    int code_;
};

class BASE1_API invalid_argument : public exception {
public:
    using exception::exception;
    ~invalid_argument() override;
};

class BASE1_API wrong_password : public exception {
public:
    using exception::exception;
    ~wrong_password() override;
};

/// "Unhandled case in switch statement."
class BASE1_API switch_exception : public exception {
public:
    explicit switch_exception(const char* file = nullptr, const char* function = nullptr,
                              int line = 0);
    ~switch_exception() override;
};

/// "Invalid string conversion"
class BASE1_API string_conversion_exception : public exception {
public:
    explicit string_conversion_exception(const char* file = nullptr, const char* function = nullptr,
                                         int line = 0);
    ~string_conversion_exception() override;
};

/// "Unsupported interface."
class BASE1_API unsupported_interface : public exception {
public:
    explicit unsupported_interface(const char* file = nullptr, const char* function = nullptr,
                                   int line = 0);
    ~unsupported_interface() override;
};

} // namespace base
