// Joins the program to the simulated hub: what "sim" in the environment variable VANTLE_HUB means. A
// handset's program is built without it.
#pragma once

#include <cstdio>
#include <memory>
#include <string>

#include "ssc/transport/EmbeddedHub.h"

/// To be called first of all, before there are threads. Where VANTLE_HUB names the simulated hub: says so in
/// the first line on `err`, so that nobody takes a simulated calibration for a real one, and makes the folder
/// that VANTLE_ROOT names (set here when it is not) into a handset's file system. False, after a line on
/// `err`, when that cannot be done. True also where the hub is a real one.
[[nodiscard]] bool prepareSimulatedHandset(std::FILE* err);

/// Makes the hub that `description`, what stands behind "sim" in VANTLE_HUB, asks for: "", ":NAME" or
/// ":FILE", each with "?KEY=VALUE&KEY=VALUE…" behind it or not. %XX in a value is the character of that code.
/// 0, or kInvalid with the reason in `error`.
[[nodiscard]] int makeEmbeddedHub(const std::string& description, std::unique_ptr<ssc::EmbeddedHub>* hub,
                                  std::string* error);
