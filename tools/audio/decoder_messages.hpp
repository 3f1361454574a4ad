/// @file
/// What decoders and drivers print by themselves.
#pragma once

namespace audio {

/// From now on the lines that libmpg123 prints about damaged files, and the drivers about inputs
/// that are not there, are left out of the standard error stream: they name no file, and what
/// matters of them comes back as trouble() and errors. Only what is written through `stderr` is
/// looked at. Called before other threads are started.
void silence_decoders();

} // namespace audio
