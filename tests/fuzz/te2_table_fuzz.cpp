// Any text in the place of the display's TE2 table.
#include <string>

#include "fuzz/FuzzCheck.h"
#include "simhub/Te2Table.h"

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
  const std::string text(data, data + size);
  const std::optional<int> edge = simhub::parseTe2FallingEdge(text);
  if (!edge) return 0;
  fuzz::check(*edge >= 0 && *edge <= simhub::kMaxTe2Delay, "an edge is in range");
  fuzz::check(simhub::parseTe2FallingEdge(text + " 1500") == edge, "what follows makes no difference");
  return 0;
}
