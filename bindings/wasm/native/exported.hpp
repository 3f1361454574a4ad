/// @file
/// How functions are exported to JavaScript.
#pragma once

#include <cstdint>

/// Marks a function that JavaScript calls, by its name. Its numbers of 64 bits would need BigInts:
/// sizes are of 32 bits, as addresses are.
#define KZ_EXPORTED(name) extern "C" __attribute__((export_name(#name), used))

namespace kzwasm {

/// What a call that gives several numbers leaves for JavaScript to read, at a fixed address.
struct Numbers {
    double values[10];
};

Numbers& numbers() noexcept;

/// Keeps the status of a call; failure_text() then has its sentence.
///
/// @return Whether it succeeded.
bool take_library_status(uint32_t status) noexcept;
bool take_catalogue_status(uint32_t status) noexcept;

} // namespace kzwasm
