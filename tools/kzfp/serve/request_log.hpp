/// @file
/// One line for each request, on standard error.
#pragma once

#include <mutex>
#include <string>

#include "kzfp/command_line/choice.hpp"
#include "kzfp/serve/exchange.hpp"

namespace kzfp::serve {

enum class LogFormat { text, json, none };

inline constexpr Choice<LogFormat> kLogFormats[] = {
    {"text", LogFormat::text, "a line for people"},
    {"json", LogFormat::json, "an object"},
    {"none", LogFormat::none, "nothing"},
};

/// The line says what was asked for and what came of it: nothing of the body, no parameters, no
/// tokens, and the other side's address only if that is wanted.
class RequestLog {
public:
    RequestLog(LogFormat format, bool addresses) : format_(format), addresses_(addresses) {}

    void write(const Exchange& exchange, bool sent);

private:
    const LogFormat format_;
    const bool addresses_;
    std::mutex mutex_;
};

} // namespace kzfp::serve
