#include "input/model_setup.hpp"

#include "input/kvt_access.hpp"
#include "run/messages.hpp"

BasicSettings gBasic;

namespace {

void ReadBasicModelParameters(KvtHandle target) {
    const KvtHandle section = KvtOpenSection(target, "BASIC_MODEL_PARAMETERS");
    gBasic = BasicSettings{};
    KvtGetInteger(section, "NUMBER_OF_DIMENSIONS", gBasic.numberOfDimensions);
    if (gBasic.numberOfDimensions != 1 && gBasic.numberOfDimensions != 2)
        StopRun(Filled("ReadModelSetup: NUMBER_OF_DIMENSIONS must be 1 or 2, not %",
                       gBasic.numberOfDimensions));
    if (gBasic.numberOfDimensions == 1)
        KvtGetInteger(section, "DELETE_FEM_KVT_FILE", gBasic.deleteFemKvtFile);
    KvtGetInteger(section, "OPEN_LOG_FILE_AFTER_RUN", gBasic.openLogFileAfterRun);
}

}  // namespace

void ReadModelSetup(KvtHandle file, const std::string& /*fileName*/) {
    const KvtHandle target = KvtOpenTarget(file, kModelTarget);
    ReadBasicModelParameters(target);
    // The sections of the bathymetry, area, period, equations, processes and
    // outputs follow here in their fixed order as their readers are added.
}
