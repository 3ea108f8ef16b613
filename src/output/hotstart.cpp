#include "output/hotstart.hpp"

// Placeholder until the writer lands; the model reader still refuses
// hot-start output, so nothing reaches this.
void WriteOutputHotstart(int32_t /*step*/) {}
