#include "b_exception.h"

#include "b_log.h"

namespace base {

exception::exception(string text, const char* file, const char* function, int line)
    : text_(std::move(text)), file_(file), function_(function), line_(line) {}

exception::exception(const exception&) = default;
exception& exception::operator=(const exception&) = default;
exception::~exception() = default;

const char* exception::what() const noexcept {
    return text_.c_str();
}

void exception::report(ILog& log) const {
    log.log(logSystem, logError, "{}\n    File: {} ({})\nFunction: {}", text_, file_, line_,
            function_);
    reportCallStack(log);
}

void exception::reportCallStack(ILog& log) const {
    if (callStack_.empty())
        return;
    log.log(logSystem, logError, "Call stack:");
    log.log(logSystem, logError, callStack_);
}

api_exception::api_exception(string text, int code, const char* file, const char* function,
                             int line)
    : exception(std::move(text), file, function, line), code_(code) {}

api_exception::~api_exception() = default;

void api_exception::report(ILog& log) const {
    log.log(logSystem, logError, "{}({})\n    File: {} ({})\nFunction: {}\n", what(), code_, file(),
            line(), function());
    reportCallStack(log);
}

invalid_argument::~invalid_argument() = default;

wrong_password::~wrong_password() = default;

switch_exception::switch_exception(const char* file, const char* function, int line)
    : exception("Unhandled case in switch statement.", file, function, line) {}
switch_exception::~switch_exception() = default;

string_conversion_exception::string_conversion_exception(const char* file, const char* function,
                                                         int line)
    : exception("Invalid string conversion", file, function, line) {}
string_conversion_exception::~string_conversion_exception() = default;

unsupported_interface::unsupported_interface(const char* file, const char* function, int line)
    : exception("Unsupported interface.", file, function, line) {}
unsupported_interface::~unsupported_interface() = default;

} // namespace base
