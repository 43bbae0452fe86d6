#pragma once

/// To be called first of all, before anything is opened. Gives a process that was started without standard
/// input, output or error the null device instead. Otherwise the next file or socket that is opened gets the
/// number of the missing stream, and whatever is printed goes into it.
void openMissingStandardStreams();
