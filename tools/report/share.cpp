// E. B. Wilson: Probable inference, the law of succession, and statistical inference. Journal of
// the American Statistical Association 22 (1927), 209-212. Unlike the normal approximation it holds
// for shares of 0 and 1, which recognition often has.

#include "report/share.hpp"

#include <algorithm>
#include <cmath>

namespace report {

Share share_of(uint64_t part, uint64_t whole)
{
    if (whole == 0) {
        return {};
    }
    constexpr double z = 1.959964;
    const auto count = static_cast<double>(whole);
    const double share = std::min(1.0, static_cast<double>(part) / count);
    const double scale = 1 + z * z / count;
    const double middle = (share + z * z / (2 * count)) / scale;
    const double half =
        z / scale * std::sqrt(share * (1 - share) / count + z * z / (4 * count * count));
    return {.value = share,
            .low = std::clamp(middle - half, 0.0, share),
            .high = std::clamp(middle + half, share, 1.0)};
}

} // namespace report
