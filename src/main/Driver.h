#pragma once

#include "ssc/transport/Transport.h"

/// A whole run of the program: opens the log, parses the options in front of the command, connects, runs the
/// command's calibrator, and closes. The exit status: 0 or a negative result, of which the shell sees the
/// lowest byte.
/// "--help" and "--version" end the process here with status 0. `embeddedHub` makes the hub of
/// VANTLE_HUB=sim; a program without a simulator has none.
[[nodiscard]] int runVantle(int argc, char** argv, const ssc::EmbeddedHubFactory& embeddedHub = nullptr);
