/// @file
/// How functions are exported to JavaScript.
#pragma once

#include <cstdint>

/// Marks a function that JavaScript calls, by its name. Numbers of 64 bits would need BigInts
/// there: sizes have 32 bits, as addresses have. Compilers for processors only check these files.
#if defined(__wasm__)
#define KZ_EXPORTED(name) extern "C" __attribute__((export_name(#name), used))
#else
#define KZ_EXPORTED(name) extern "C" __attribute__((used))
#endif

namespace kzwasm {

/// What a call that gives several numbers leaves for JavaScript to read, at a fixed address.
struct Numbers {
    double values[10];
};

Numbers& numbers() noexcept;

/// Keeps the status of a call; status_text() then gives its sentence.
///
/// @return Whether it succeeded.
bool take_library_status(uint32_t status) noexcept;
bool take_catalogue_status(uint32_t status) noexcept;

} // namespace kzwasm
