#include "growth/growth.hpp"

namespace kz::bench {

std::vector<Growth> all_growths()
{
    return {
        {"grow_duration", grow_duration}, {"grow_silence", grow_silence},
        {"grow_windows", grow_windows},   {"grow_frames", grow_frames},
        {"grow_block", grow_block},       {"grow_threads", grow_threads},
        {"memory", grow_memory},          {"serialize_blocks", grow_document},
    };
}

std::string number(double value, int decimals)
{
    std::array<char, 64> text{};
    std::snprintf(text.data(), text.size(), "%.*f", decimals, value);
    return text.data();
}

std::string in_time(double seconds)
{
    struct Scale {
        double seconds;
        const char* name;
    };
    for (const Scale scale : {Scale{1, " s"}, Scale{1e-3, " ms"}, Scale{1e-6, " µs"}}) {
        if (seconds >= scale.seconds) {
            const double value = seconds / scale.seconds;
            return number(value, value < 10 ? 2 : (value < 100 ? 1 : 0)) + scale.name;
        }
    }
    return number(seconds * 1e9, 1) + " ns";
}

} // namespace kz::bench
