#pragma once

// Whole numbers of 128 bits, to state exactly what the library rounds.

#ifndef __SIZEOF_INT128__
#include <boost/multiprecision/cpp_int.hpp>
#endif

namespace kz::test {

#ifdef __SIZEOF_INT128__
__extension__ typedef __int128 Wide;
#else
// Compilers for 32-bit processors have none of their own.
using Wide = boost::multiprecision::int128_t;
#endif

} // namespace kz::test
