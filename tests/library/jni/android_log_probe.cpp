#include <mutex>

#include <android/log.h>

#include "platform_probe.hpp"

namespace kz::test {

namespace {

std::mutex log_mutex;
LogLines log_lines;

} // namespace

CapturedLog::CapturedLog()
{
    log_lines.clear();
    __android_log_set_minimum_priority(ANDROID_LOG_VERBOSE);
    __android_log_set_logger([](const __android_logger_data* about, const char* message) {
        const std::lock_guard lock(log_mutex);
        log_lines.push_back({about->priority, about->tag, message});
    });
}

CapturedLog::~CapturedLog() { __android_log_set_logger(__android_log_stderr_logger); }

LogLines CapturedLog::lines() const
{
    const std::lock_guard lock(log_mutex);
    return log_lines;
}

} // namespace kz::test
