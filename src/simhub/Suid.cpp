#include "simhub/Suid.h"

namespace simhub {

std::uint64_t hashText(std::string_view text, std::uint64_t seed) {
  std::uint64_t hash = 0xcbf29ce484222325 ^ seed;
  for (const char c : text) hash = (hash ^ static_cast<unsigned char>(c)) * 0x100000001b3;
  // FNV leaves the high bits of short texts alike; the finalizer of splitmix64 spreads them.
  hash = (hash ^ (hash >> 30)) * 0xbf58476d1ce4e5b9;
  hash = (hash ^ (hash >> 27)) * 0x94d049bb133111eb;
  return hash ^ (hash >> 31);
}

Suid suidForName(std::string_view name) { return {hashText(name, 0x68696768), hashText(name, 0x6c6f77)}; }

}  // namespace simhub
