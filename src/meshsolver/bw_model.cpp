#include "meshsolver/bw_model.hpp"

BwModel gBwModel;

void ResetBwModel() {
    gBwModel = BwModel{};
}
