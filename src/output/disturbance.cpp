#include "output/disturbance.hpp"

// Placeholders until the disturbance output lands; the model reader still
// refuses it, so nothing reaches them.
void InitOutputDisturbance() {}
void CreateOutputDisturbance() {}
void UpdateOutputDisturbance(int32_t /*step*/) {}
void WriteOutputDisturbance(int32_t /*step*/) {}
void CloseOutputDisturbance() {}
