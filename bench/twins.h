// The records of the workloads and their protobuf twins, built from the same data,
// for the workloads of other files (the wire's) to share.
#pragma once

#include "kernite/Ref.h"
#include "tarn/vmprov.h"
#include "tarn_bench.pb.h"

namespace TarnBench {

// The snapshot tree of n nodes under a virtual machine, and a full location.
Kernite::Ref<Tarn::Vmprov::VmState> MakeVmState(int n);
Kernite::Ref<Tarn::Vmprov::VmLocation> MakeLocation();
void FillVmState(tarnbench::VmState* vm, int n);
void FillLocation(tarnbench::VmLocation* location);

}  // namespace TarnBench
