/// @file
/// Which cases or tables the words of a command line select.
#pragma once

#include <algorithm>
#include <iterator>
#include <string>
#include <vector>

#include "case.hpp"

namespace kz::bench {

/// Whether a word selects a thing: it is its name, or the beginning of the names of several.
template <class Thing>
bool stands_for(const std::string& word, const Thing& one, const std::vector<Thing>& all)
{
    const auto is_word = [&](const Thing& other) { return other.name == word; };
    return std::any_of(all.begin(), all.end(), is_word) ? is_word(one)
                                                        : one.name.rfind(word, 0) == 0;
}

/// The things that any of these words select; all when there are no words.
template <class Thing>
std::vector<Thing> chosen(const std::vector<Thing>& all, const std::vector<std::string>& words)
{
    std::vector<Thing> chosen;
    std::copy_if(all.begin(), all.end(), std::back_inserter(chosen), [&](const Thing& one) {
        return words.empty() || std::any_of(words.begin(), words.end(), [&](const auto& word) {
                   return stands_for(word, one, all);
               });
    });
    require(!chosen.empty(), "nothing has such a name");
    return chosen;
}

} // namespace kz::bench
