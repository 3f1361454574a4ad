/// @file
/// Ctrl-C during long work: what is at hand is finished, and what is done is kept.
#pragma once

namespace kzfp {

/// From now on the first SIGINT or SIGTERM only makes interrupted() true; the second one ends the
/// process as usual.
void watch_for_interruption();

/// Whether the user wants an end. A command then finishes the file at hand and returns
/// ExitStatus::interrupted_by_user.
bool interrupted();

} // namespace kzfp
