// Which exception becomes which status. The text lies in a fixed place of each thread: reporting a
// failure needs no memory, so that a lack of memory can be reported too.

#include "catalogue/failure.hpp"

#include <cstdio>
#include <new>

#include "catalogue/model/document.hpp"
#include "catalogue/model/trail_file.hpp"
#include "catalogue/store/store.hpp"

namespace {

using kzcat::StoreError;

constexpr size_t kRoom = 1024;
thread_local char last_text[kRoom] = "";

void keep_text(const char* text) noexcept
{
    const int length = std::snprintf(last_text, kRoom, "%s", text);
    if (length >= static_cast<int>(kRoom)) {
        std::snprintf(last_text + kRoom - 4, 4, "...");
    }
}

kzcat_status keep(kzcat_status status, const char* text) noexcept
{
    keep_text(text);
    return status;
}

kzcat_status status_of(StoreError::Kind kind) noexcept
{
    using enum StoreError::Kind;
    switch (kind) {
    case cannot_open:
        return KZCAT_ERROR_CANNOT_OPEN;
    case newer_version:
        return KZCAT_ERROR_NEWER_VERSION;
    case other_profile:
        return KZCAT_ERROR_OTHER_PROFILE;
    case read_only:
        return KZCAT_ERROR_READ_ONLY;
    case busy:
        return KZCAT_ERROR_BUSY;
    case full:
        return KZCAT_ERROR_FULL;
    case damaged:
        return KZCAT_ERROR_DAMAGED;
    case not_found:
        return KZCAT_ERROR_NOT_FOUND;
    case invalid:
        return KZCAT_ERROR_INVALID_ARGUMENT;
    case failed:
        break;
    }
    return KZCAT_ERROR_FAILED;
}

struct Entry {
    kzcat_status status;
    const char* text;
};

constexpr Entry kTexts[] = {
    {KZCAT_OK, "Success."},
    {KZCAT_ERROR_MEMORY, "Memory is short: free some and repeat the call."},
    {KZCAT_ERROR_INVALID_ARGUMENT,
     "A pointer is null, a number out of range, or a reserved field not 0: pass what the call "
     "states."},
    {KZCAT_ERROR_CANNOT_OPEN,
     "The file is missing, may not be opened, or is no catalogue: correct the path, or let it be "
     "created."},
    {KZCAT_ERROR_NEWER_VERSION, "A later version wrote the catalogue: update this library."},
    {KZCAT_ERROR_OTHER_PROFILE,
     "The features are of another profile and cannot be compared: make them again from the sound."},
    {KZCAT_ERROR_READ_ONLY,
     "The catalogue may only be read: open it for writing, or change the permissions of its file "
     "and folder."},
    {KZCAT_ERROR_BUSY, "Another writer holds the catalogue: try again later."},
    {KZCAT_ERROR_FULL, "The disk or a quota is full: make room and repeat the call."},
    {KZCAT_ERROR_DAMAGED,
     "The catalogue is damaged: verify it, and merge what is whole into a new one."},
    {KZCAT_ERROR_NOT_FOUND, "There is no such track or source: list what there is."},
    {KZCAT_ERROR_NOT_READABLE,
     "The bytes are no trail or no query document, or damaged ones: make them again."},
    {KZCAT_ERROR_FORMAT,
     "The sample format, rate or number of channels cannot be used: see kzcat_format."},
    {KZCAT_ERROR_ORDER,
     "The builder or query was finished already, or is not finished yet: create another one, or "
     "finish it first."},
    {KZCAT_ERROR_ROOM, "The array is too small, and the size needed was reported: pass one of "
                       "that size."},
    {KZCAT_ERROR_CANCELLED, "The caller's function stopped the work: what was done before is kept, "
                            "and the call may be repeated."},
    {KZCAT_ERROR_FAILED, "The system failed: kzcat_get_error_text() has the reason."},
};

} // namespace

kzcat_status kzcat::report_failure() noexcept
{
    try {
        throw;
    } catch (const Failure& failure) {
        return keep(failure.status(), failure.what());
    } catch (const StoreError& error) {
        return keep(status_of(error.kind()), error.what());
    } catch (const TrailError& error) {
        return keep(KZCAT_ERROR_NOT_READABLE, error.what());
    } catch (const DocumentError& error) {
        return keep(KZCAT_ERROR_NOT_READABLE, error.what());
    } catch (const std::bad_alloc&) {
        return keep(KZCAT_ERROR_MEMORY, kzcat_status_text(KZCAT_ERROR_MEMORY));
    } catch (const std::length_error&) { // more than any memory holds
        return keep(KZCAT_ERROR_MEMORY, kzcat_status_text(KZCAT_ERROR_MEMORY));
    } catch (const std::exception& error) {
        return keep(KZCAT_ERROR_FAILED, error.what());
    } catch (...) { // what a caller's own function throws
        return keep(KZCAT_ERROR_FAILED, kzcat_status_text(KZCAT_ERROR_FAILED));
    }
}

const char* kzcat_get_error_text() noexcept { return last_text; }

const char* kzcat_status_text(kzcat_status status) noexcept
{
    for (const Entry& entry : kTexts) {
        if (entry.status == status) {
            return entry.text;
        }
    }
    return "This number is no status of the catalogue: pass one that a call has returned.";
}
