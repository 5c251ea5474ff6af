#!/usr/bin/python3
"""A SOAP client we did not write (zeep, from Debian) calls the worked example's
server through the WSDL that server serves: a property read, a method taking an
array of managed object references, a snapshot tree (data objects with nested
optional arrays) saved and read back, the SecurityConfigFault of
reloadSslCertificate, a member the requested version does not see, and a privileged
member without and with the privilege.

    zeep_example.py PATH-OF-TARN-EXAMPLE
"""
import subprocess
import sys

import requests
import zeep
from zeep.transports import Transport

NS = "urn:tarnd3"


def start(program):
    server = subprocess.Popen([program, "serve"], stdout=subprocess.PIPE, text=True)
    found = {}
    for line in server.stdout:
        key, _, value = line.partition(": ")
        found[key] = value.strip()
        if key == "token":
            break
    return server, found["url"], found["token"]


def client(url, version, token=None):
    session = requests.Session()
    if token:
        session.headers["Authorization"] = "Bearer " + token
    return zeep.Client(f"{url}?wsdl&version={version}", transport=Transport(session=session))


def fault_class(call):
    """The wire name of the fault a call fails with, from the fault's detail."""
    try:
        call()
    except zeep.exceptions.Fault as fault:
        return fault.detail[0].tag.replace("{%s}" % NS, "")
    return None


def snapshot(t, name, sid, children):
    return t("tarn.vmprov.SnapshotState")(
        snapshot=t("ManagedObjectReference")(f"snapshot-{sid}", moType="VirtualMachineSnapshot"), name=name, id=sid,
        config=t("cairn.vm.ConfigInfo")(), childSnapshot=children)


def names(snapshots):
    return [(s.name, names(s.childSnapshot)) for s in snapshots or []]


def main():
    server, url, token = start(sys.argv[1])
    failures = []

    def check(condition, what):
        if not condition:
            failures.append(what)

    try:
        v8 = client(url, "tarn.version.version8", token)
        t = lambda name: v8.get_type(f"{{{NS}}}{name}")
        ref = t("ManagedObjectReference")
        service = v8.service
        root = ref("service-instance", moType="tarn.ServiceInstance")

        # A property read.
        locks = service["TarnServiceInstance.lockStresser"](target=root)
        check((locks.moType, locks._value_1) == ("tarn.LockStresser", "lock-stresser"), f"lockStresser read {locks}")

        # A method taking an array of managed object references.
        others = [ref("debug-manager", moType="tarn.DebugManager"), ref("security-manager", moType="tarn.SecurityManager")]
        check(service.DebugAcquireLock(target=locks, objects=others, mode="s", holdDurationMillis=1, iters=2,
                                       durationBetweenItersMillis=1) is None, "DebugAcquireLock answered something")

        # Data objects with nested optional arrays, through anyType with their xsi:type.
        store = service["TarnServiceInstance.dbSerializer"](target=root)
        tree = [snapshot(t, "base", 1, [snapshot(t, "base.1", 11, [snapshot(t, "base.1.1", 111, [])]),
                                        snapshot(t, "base.2", 12, [])])]
        state = t("tarn.vmprov.VmState")(
            vm=ref("vm-7", moType="VirtualMachine"), vmPathName="/store-1/vm-7/config", powerState="suspended",
            config=t("cairn.vm.ConfigInfo")(), layoutEx=t("cairn.vm.FileLayoutEx")(),
            capability=t("cairn.vm.Capability")(), rootSnapshot=tree)
        service.SaveDataObject(target=store, id=7, dataObject=zeep.xsd.AnyObject(t("tarn.vmprov.VmState"), state))
        back = service.LoadDataObject(target=store, id=7, strataType="tarn.vmprov.VmState")
        check(names(back.rootSnapshot) == names(tree), f"the snapshot tree came back as {names(back.rootSnapshot)}")
        check((back.vmPathName, back.powerState, back.vm.moType) == ("/store-1/vm-7/config", "suspended",
                                                                      "VirtualMachine"), f"the state came back as {back}")

        # The fault of reloadSslCertificate, as its own class.
        security = service["TarnServiceInstance.security"](target=root)
        check(fault_class(lambda: service.UpdateSSLCertificate(target=security)) == "tarn.fault.SecurityConfigFault",
              "reloadSslCertificate did not fail with a SecurityConfigFault")

        # A member version1 does not see: absent from its WSDL, and refused by the server.
        v1 = client(url, "tarn.version.version1", token)
        check("TarnServiceInstance.security" not in v1.service._operations, "version1's WSDL has the security read")
        envelope = v8.create_message(service, "TarnServiceInstance.security", target=root)
        answer = v1.transport.post_xml(url, envelope, {"SOAPAction": '"urn:tarnd3/1.0"',
                                                       "Content-Type": "text/xml; charset=utf-8"})
        check(answer.status_code == 500 and b"strata.wire.UnknownMethod" in answer.content,
              f"version1 was served the security read: {answer.status_code} {answer.content[:300]}")

        # A privileged member: refused to an anonymous caller, served to the operator.
        anonymous = client(url, "tarn.version.version8")
        check(fault_class(lambda: anonymous.service["TarnServiceInstance.debugManager"](target=root)) ==
              "strata.wire.NotAuthorized", "an anonymous caller read the debug manager")
        debug = service["TarnServiceInstance.debugManager"](target=root)
        check(debug._value_1 == "debug-manager", f"the operator read the debug manager as {debug}")
    except Exception as e:  # everything unexpected is a failure with its story
        failures.append(f"{type(e).__name__}: {e}")
    finally:
        server.terminate()
        server.wait(timeout=30)

    for f in failures:
        print(f)
    print(f"{1 if not failures else 0} passed, {1 if failures else 0} failed")
    return 1 if failures else 0


if __name__ == "__main__":
    sys.exit(main())
