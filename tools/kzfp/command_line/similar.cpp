// Names are short, so the plain table of distances serves.

#include "kzfp/command_line/similar.hpp"

#include <algorithm>
#include <vector>

namespace kzfp {

size_t edit_distance(std::string_view a, std::string_view b)
{
    std::vector<std::vector<size_t>> table(a.size() + 1, std::vector<size_t>(b.size() + 1));
    for (size_t i = 0; i <= a.size(); ++i) {
        for (size_t j = 0; j <= b.size(); ++j) {
            if (i == 0 || j == 0) {
                table[i][j] = i + j;
                continue;
            }
            const size_t other = a[i - 1] == b[j - 1] ? 0 : 1;
            table[i][j] =
                std::min({table[i - 1][j] + 1, table[i][j - 1] + 1, table[i - 1][j - 1] + other});
            if (i > 1 && j > 1 && a[i - 1] == b[j - 2] && a[i - 2] == b[j - 1]) {
                table[i][j] = std::min(table[i][j], table[i - 2][j - 2] + 1);
            }
        }
    }
    return table[a.size()][b.size()];
}

std::string most_similar(std::string_view word, std::span<const std::string> names)
{
    constexpr size_t kLongest = 64;
    size_t least = word.size() / 3 + 1;
    std::string meant;
    for (const std::string& name : names) {
        const size_t distance = word.size() > kLongest ? least : edit_distance(word, name);
        if (distance < least) {
            least = distance;
            meant = name;
        }
    }
    return meant;
}

} // namespace kzfp
