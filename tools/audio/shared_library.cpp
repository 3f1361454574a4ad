#include "audio/shared_library.hpp"

#include <dlfcn.h>

namespace audio {

namespace {

/// What the loader says of its last failure.
std::string loader_text()
{
    const char* const text = ::dlerror(); // NOLINT(concurrency-mt-unsafe): each thread has its own
    return text == nullptr ? "no reason is known" : text;
}

} // namespace

SharedLibrary::SharedLibrary(const char* name)
    : name_(name), handle_(::dlopen(name, RTLD_LAZY | RTLD_LOCAL))
{
    if (handle_ == nullptr) {
        throw LibraryError(loader_text());
    }
}

SharedLibrary::Symbol SharedLibrary::operator[](const char* name) const
{
    void* const address = ::dlsym(handle_, name);
    if (address == nullptr) {
        throw LibraryError(std::string(name_) + " has no " + name);
    }
    return Symbol(address);
}

} // namespace audio
