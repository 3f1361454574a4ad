/// @file
/// A store in memory: for catalogues that end with the program, and where there are no files.
#pragma once

#include <memory>

#include "catalogue/store/store.hpp"

namespace kzcat {

/// An empty catalogue, gone when the object goes.
std::unique_ptr<Store> make_memory_store(Profile profile = Profile::standard);

} // namespace kzcat
