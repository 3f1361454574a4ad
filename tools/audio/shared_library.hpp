/// @file
/// Shared libraries that are opened when they are first needed: most runs need none of them, and
/// FFmpeg's and PortAudio's bring more than a hundred others along, which take longer to load than
/// a short clip takes to be recognised.
#pragma once

#include <string>

#include "audio/source.hpp"

namespace audio {

/// The library is not installed, or is not the one that the program was built for.
struct LibraryError : FileError {
    using FileError::FileError;
};

/// A library stays open until the program ends: libraries that it opened in turn keep threads and
/// handlers of their own.
class SharedLibrary {
public:
    /// A function or an object of the library; converts to a pointer to it.
    class Symbol {
    public:
        template <class T>
        operator T*() const // NOLINT(google-explicit-constructor): its type is where it goes
        {
            return reinterpret_cast<T*>(address_);
        }

    private:
        friend class SharedLibrary;
        explicit Symbol(void* address) : address_(address) {}
        void* address_;
    };

    /// `name` as the loader knows it, as libpng16.so.16; it outlives the object. Throws
    /// LibraryError.
    explicit SharedLibrary(const char* name);

    /// Throws LibraryError when the library has nothing of this name.
    Symbol operator[](const char* name) const;

private:
    const char* name_; ///< not a string: packaging/sbom.py looks for it in the program
    void* handle_;
};

} // namespace audio
