#pragma once

#include <cstdio>

/// The whole usage text, in a single write.
void printUsage(std::FILE* stream);
/// Its first line.
void printShortUsage(std::FILE* stream);
void printVersion();
