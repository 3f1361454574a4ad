/// @file
/// What the C++ library of Emscripten 3.1.6 lacks of C++20, as far as the sources use it: -include
/// puts it before each of them. A later Emscripten has all of it.
#pragma once

#include <version>

#if defined(_LIBCPP_VERSION) && _LIBCPP_VERSION < 14000

#include <algorithm>
#include <cstring>
#include <functional>
#include <iterator>

// Adding to this namespace is what a later library does in the place of this file.
namespace std {

template <class To, class From>
constexpr To bit_cast(const From& from) noexcept
{
    return __builtin_bit_cast(To, from);
}

namespace ranges {

template <class Range, class Value>
constexpr auto find(Range&& range, const Value& value)
{
    return std::find(std::begin(range), std::end(range), value);
}

template <class Range, class Predicate>
constexpr bool any_of(Range&& range, Predicate predicate)
{
    return std::any_of(std::begin(range), std::end(range), predicate);
}

template <class Range, class Predicate>
constexpr auto count_if(Range&& range, Predicate predicate)
{
    return std::count_if(std::begin(range), std::end(range), predicate);
}

template <class Range, class Value>
constexpr auto count(Range&& range, const Value& value)
{
    return std::count(std::begin(range), std::end(range), value);
}

template <class Range, class Output>
constexpr Output copy(Range&& range, Output output)
{
    return std::copy(std::begin(range), std::end(range), output);
}

template <class Range, class Output, class Change>
constexpr Output transform(Range&& range, Output output, Change change)
{
    return std::transform(std::begin(range), std::end(range), output, change);
}

template <class Range, class Less = std::less<>, class Projection>
constexpr auto max_element(Range&& range, Less less, Projection projection)
{
    return std::max_element(std::begin(range), std::end(range), [&](const auto& a, const auto& b) {
        return std::invoke(less, std::invoke(projection, a), std::invoke(projection, b));
    });
}

} // namespace ranges
} // namespace std

#endif
