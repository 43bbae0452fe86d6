// Numbers from the command line. Each parser returns 0; ssc::kInvalid when the number is out of the type's
// range; or ssc::kMalformed when characters are left behind it (trailing blanks too). The value is stored on
// success only; a null `out` makes it a syntax check. The empty text is accepted as 0: scripts pass it for
// "none".
#pragma once

/// Decimal, hexadecimal ("0x10") or octal ("010"). What does not fit 32 bits is cut to its lower 32 bits.
[[nodiscard]] int parseInt(const char* text, int* out);

/// "nan" and "inf" are numbers here: callers with a range exclude them.
[[nodiscard]] int parseFloat(const char* text, float* out);
[[nodiscard]] int parseDouble(const char* text, double* out);
