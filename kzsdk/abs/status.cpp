/// @file
/// The sentence for each status: what went wrong, and what cures it. status.h says the same at each
/// name.
#include "kzsdk/abs/status.h"

namespace {

struct Entry {
    kz_status status;
    const char* text;
};

constexpr Entry kTexts[] = {
    {KZ_OK, "The call succeeded."},

    {KZ_ERROR_INVALID_ARGUMENT,
     "The start-up record is null or the check is 0: pass the record, and 1 for the check."},

    {KZ_XML_ERROR_MEMORY,
     "Memory for the tag tree is short: free some, or start the library up first."},
    {KZ_XML_ERROR_NOT_FOUND,
     "The path leads to no tag: correct it, or let the call create what is missing."},
    {KZ_XML_ERROR_INVALID_ARGUMENT,
     "A tag is null, or a name or path is null, empty or malformed: pass one that is not."},

    {KZ_DYN_BUF_ERROR_MEMORY,
     "Memory is short or the buffer would pass 2^32 - 1 bytes: free memory, append less, or start "
     "the library up first."},
    {KZ_DYN_BUF_ERROR_INVALID_ARGUMENT,
     "A pointer is null: pass a buffer and, even for 0 bytes, a text."},

    {KZ_MEM_ALREADY_ON,
     "The memory manager is already on, perhaps for another user: there is nothing left to do."},
    {KZ_MEM_NOT_ON,
     "The memory manager is off: start the library up first, and free before it is shut down."},

    {KZ_INIT_ERROR_NOT_HELD, "The library has no holder left to release: call kzinit_release() "
                             "only once for each kzinit_acquire()."},
    {KZ_INIT_ERROR_NO_RECORD,
     "The start-up record is null: pass one that kzconf_initialize_configuration() has cleared."},
    {KZ_INIT_ERROR_TOO_MANY_HOLDERS,
     "Too many users hold the library: call kzinit_release() once for each kzinit_acquire()."},

    {KZ_DISC_ERROR_MEMORY,
     "Memory is short, the directory cannot be opened, or the name does not fit: check the path, "
     "give the name more room, or free memory."},
    {KZ_DISC_ERROR_INVALID_ARGUMENT,
     "A pointer is null, a size is 0, or the system refused an argument: pass what disc.h states."},
    {KZ_DISC_ALREADY_ON, "The disc functions are already on: there is nothing left to do."},
    {KZ_DISC_NOT_ON, "The disc functions are off: call their initialize function first."},
    {KZ_DISC_ERROR_SYSTEM,
     "The system could not read the file or device: check that it is whole and connected."},
    {KZ_DISC_ERROR_ACCESS_DENIED,
     "Access to the file or device is denied: give the user the right to read it."},
    {KZ_DISC_ERROR_NOT_FOUND,
     "There is no such file, device or volume, or the origin of a seek is unknown: correct the "
     "path, insert another disc, or pass 0, 1 or 2 as the origin."},
    {KZ_DISC_ERROR_NO_SPACE, "The device has no space left: free some."},
    {KZ_DISC_ERROR_TOO_MANY_FILES, "The process has too many files open: close some."},
    {KZ_DISC_ERROR_BAD_DESCRIPTOR,
     "The descriptor is not open: use one that an open call returned and nobody has closed."},

    {KZ_FPX_ERROR_MEMORY,
     "Memory for the fingerprint is short: free some, or start the library up first."},
    {KZ_FPX_ERROR_INVALID_ARGUMENT,
     "A handle, a pointer to audio or a place for a result is null: pass one that is not."},
    {KZ_FPX_ERROR_RENDER,
     "Memory for the query document's text is short: free some and serialize again."},
    {KZ_FPX_ERROR_NO_INPUT_FORMAT,
     "No input format takes this encoding: convert the audio to 8- or 16-bit PCM, A-law or "
     "mu-law."},
    {KZ_FPX_ERROR_ROOM,
     "The array is too small for the values: pass one with room for the count that was reported."},
    {KZ_FPX_ERROR_NOT_ENOUGH_AUDIO,
     "The audio ended before the fingerprint was complete: use a longer recording."},
    {KZ_FPX_ERROR_NO_ALGORITHM,
     "There is no algorithm with this number: use KZ_FPX_ALGORITHM_FIXED or "
     "KZ_FPX_ALGORITHM_FLOAT."},

    {KZ_STREAM_ERROR_MEMORY,
     "Memory for the stream or its result is short: free some, and repeat the call."},
    {KZ_STREAM_ERROR_INVALID_ARGUMENT,
     "A pointer is null or a reserved field is not 0: pass what stream.h states, in settings that "
     "kz_stream_initialize_settings() has filled."},
    {KZ_STREAM_ERROR_NOT_STARTED,
     "The library was shut down under the stream: start it again, or free the stream."},
    {KZ_STREAM_ERROR_ALGORITHM,
     "The stream's algorithm is unknown: use KZ_FPX_ALGORITHM_FIXED or KZ_FPX_ALGORITHM_FLOAT."},
    {KZ_STREAM_ERROR_FORMAT,
     "The stream's sample format is unknown: use one of KZ_STREAM_FORMAT_PCM8 and the others."},
    {KZ_STREAM_ERROR_RATE,
     "The algorithm does not take the stream's rate: compare with stream.h, use "
     "KZ_STREAM_FORMAT_LINEAR8 instead of KZ_STREAM_FORMAT_PCM8, use the floating-point "
     "algorithm, or resample the sound."},
    {KZ_STREAM_ERROR_CHANNELS,
     "A stream has 1 to 65535 channels, in KZ_STREAM_FORMAT_PCM8 1 or 2: pass the sound's "
     "channel count, or use KZ_STREAM_FORMAT_LINEAR8."},
    {KZ_STREAM_ERROR_FINISHED, "The stream was finished: create another one for more sound."},
    {KZ_STREAM_ERROR_FAILED,
     "Memory was short while the stream took sound, so it cannot go on: free the stream and some "
     "memory, create another one, and feed it from the start."},

    {KZ_QV_ERROR_MEMORY,
     "Memory is short or the algorithm does not take the sample rate: compare the rate with the "
     "table in fpx.h, free memory, or start the library up first."},
    {KZ_QV_ERROR_INVALID_ARGUMENT,
     "A pointer is null, or a format, rate, channel count or byte count is not allowed: compare "
     "with the table in fpx.h, and add whole sample frames."},
    {KZ_QV_ERROR_EMPTY, "The fingerprint has no values: add audio before asking for the result."},
    {KZ_QV_FRAME_LIMIT_REACHED, "The fingerprint has all its frames: serialize it."},
    {KZ_QV_ERROR_INCOMPLETE,
     "The fingerprint is not complete: add audio until the complete flag is set."},
};

} // namespace

const char* kz_status_text(kz_status status) noexcept
{
    for (const Entry& entry : kTexts) {
        if (entry.status == status) {
            return entry.text;
        }
    }
    return "This is not a status code of this library: pass one that its calls returned.";
}
