#pragma once

#include <functional>
#include <string>

namespace simhub {

/// Takes one line that tells whoever runs the hub that something is wrong.
using Diagnostics = std::function<void(const std::string&)>;

}  // namespace simhub
