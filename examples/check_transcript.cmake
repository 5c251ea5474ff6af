# Runs the example (PROGRAM, a command and its arguments) and checks that it exits
# with 0 and that its transcript tells the whole walk: navigation, planting, reading
# back, removal, locks, the snapshot tree and the fault.
execute_process(COMMAND ${PROGRAM} RESULT_VARIABLE code OUTPUT_VARIABLE transcript ERROR_VARIABLE errors)
message("${transcript}")
if(NOT code EQUAL 0)
  message(FATAL_ERROR "tarn-example exited with ${code}\n${errors}")
endif()
set(expected
  "server: hosting tarn.ServiceInstance:service-instance"
  "client: ServiceInstance.debugManager -> tarn.DebugManager:debug-manager"
  "server: log mark: example client connected"
  "client: DebugManager.faultManager -> tarn.faultInjector.FaultInjectionManager:fault-injection-manager"
  "client: addFault -> key 1"
  "client: addFault -> key 2"
  "client: 2 fault(s) planted"
  "client:   fault 1 'fail the copy halfway' on name 'vmprov.CopyVmFiles' at 50%: throws strata.MethodFault (\"disk full\")"
  "client:   fault 2 'refuse the power-on' on name 'vmprov.PowerOnVm' at 90%: throws tarn.fault.SecurityConfigFault (\"certificate expired\")"
  "client: removeFault(1) -> true"
  "client: removeFault(1) again -> false"
  "client: faults read asynchronously:\nclient: 1 fault(s) planted\nclient:   fault 2 "
  "client: acquireLock x on 2 objects, twice -> done"
  "server: saved a tarn.vmprov.VmState under 7"
  "client: loadDataObject(7) -> a VmState of 5 snapshots, equal to the one saved: true"
  "client: reloadSslCertificate failed with tarn.fault.SecurityConfigFault: no SSL certificate is configured"
  "client: done")
foreach(line IN LISTS expected)
  string(FIND "${transcript}" "${line}" at)
  if(at EQUAL -1)
    message(FATAL_ERROR "the transcript lacks: ${line}")
  endif()
endforeach()
if(NOT errors STREQUAL "")
  message(FATAL_ERROR "tarn-example wrote to stderr:\n${errors}")
endif()
