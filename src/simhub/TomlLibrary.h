// toml++, header-only, without exceptions.
//
// Its assertions are about its input too: "[[[" would end the process, or with some compilers be assumed
// away. With the assertions off, the parser goes on to report an error.
#pragma once

// clang-format off: the order matters
#define TOML_HEADER_ONLY 1
#define TOML_EXCEPTIONS 0
#define TOML_ASSERT(expr) static_assert(true)
#include <toml++/impl/preprocessor.h>
#undef TOML_ASSERT_ASSUME
#define TOML_ASSERT_ASSUME(expr) static_assert(true)
#include <toml++/toml.h>
// clang-format on
