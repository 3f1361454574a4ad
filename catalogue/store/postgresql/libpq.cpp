/// @file
/// Opens libpq.

#include "catalogue/store/postgresql/libpq.hpp"

#include <string>

#include <dlfcn.h>

#include "catalogue/store/store.hpp"

namespace kzcat::postgresql {

namespace {

constexpr const char* kLibrary = "libpq.so.5"; // packaging/sbom.py looks for it in the program

/// What the loader says of its last failure.
std::string loader_text()
{
    const char* const text = ::dlerror(); // NOLINT(concurrency-mt-unsafe): each thread has its own
    return text == nullptr ? "no reason is known" : text;
}

StoreError no_library(const std::string& reason)
{
    return {StoreError::Kind::cannot_open,
            "catalogues on servers need PostgreSQL's client library, "
            "which cannot be used (" +
                reason + "); install it (Debian: libpq5)"};
}

/// Stays open until the program ends, since libraries that it opened in turn keep handlers of their
/// own.
void* opened()
{
    static void* const library = [] {
        void* const handle = ::dlopen(kLibrary, RTLD_NOW | RTLD_LOCAL);
        if (handle == nullptr) {
            throw no_library(loader_text());
        }
        return handle;
    }();
    return library;
}

} // namespace

void* libpq_address(const char* function)
{
    void* const address = ::dlsym(opened(), function);
    if (address == nullptr) {
        throw no_library(std::string(kLibrary) + " has no " + function);
    }
    return address;
}

} // namespace kzcat::postgresql
