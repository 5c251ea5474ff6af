#!/usr/bin/python3
"""A standard SOAP client (zeep) loads the WSDL of two API versions without a single
warning, builds typed requests from it, and finds in each schema exactly the members
its version sees.

    wsdl_check.py PATH-OF-TARN-CATALOG
"""
import json
import logging
import subprocess
import sys
import tempfile
import warnings

import zeep
from lxml import etree

NS = "urn:tarnd3"


class Recorder(logging.Handler):
    """Every warning zeep logs, kept to fail on."""

    def __init__(self):
        super().__init__(logging.WARNING)
        self.records = []

    def emit(self, record):
        self.records.append(self.format(record))


def run(catalog, *args):
    return subprocess.run([catalog, *args], check=True, capture_output=True).stdout


def load(catalog, version, folder):
    path = f"{folder}/{version}.wsdl"
    with open(path, "wb") as out:
        out.write(run(catalog, "wsdl", "--api-version", version))
    return zeep.Client(path)


def element_names(client, type_name):
    return {name for name, _ in client.get_type(f"{{{NS}}}{type_name}").elements}


def main():
    catalog = sys.argv[1]
    warnings.simplefilter("error")
    recorder = Recorder()
    logging.getLogger().addHandler(recorder)
    logging.getLogger().setLevel(logging.WARNING)

    dump = json.loads(run(catalog, "dump", "--json"))
    sees = {v["name"]: set(v["includes"]) for v in dump["versions"]}
    failures = []

    with tempfile.TemporaryDirectory() as folder:
        clients = {v: load(catalog, v, folder) for v in ("tarn.version.version8", "tarn.version.version1")}
    v8, v1 = clients["tarn.version.version8"], clients["tarn.version.version1"]

    # A typed request, as a client would build it.
    ref = v8.get_type(f"{{{NS}}}ManagedObjectReference")
    message = v8.create_message(
        v8.service, "DebugAcquireLock", target=ref("stresser-1", moType="tarn.LockStresser"),
        objects=[ref("vm-7", moType="tarn.vmprov.Action")], mode="xall", holdDurationMillis=250, iters=3,
        durationBetweenItersMillis=40)
    text = etree.tostring(message).decode()
    for piece in ('moType="tarn.LockStresser"', ">stresser-1<", ">xall<", ">250<", ">40<"):
        if piece not in text:
            failures.append(f"the DebugAcquireLock request lacks {piece}: {text}")

    # References are typed as such, whatever managed type they name.
    request = {name: element.type.name for name, element in
               v8.get_element(f"{{{NS}}}DebugAcquireLock").type.elements}
    if request.get("objects") != "ManagedObjectReference":
        failures.append(f"DebugAcquireLock's objects are typed {request.get('objects')}")

    # Each version's schema holds exactly the members it sees.
    checked = 0
    for t in dump["types"]:
        if t["kind"] not in (16, 17) or not t["name"].startswith("tarn."):
            continue
        for version, client in clients.items():
            if t["version"] not in sees[version]:
                continue
            names = element_names(client, t["name"])
            for p in t["properties"]:
                if (p["version"] in sees[version]) != (p["name"] in names):
                    failures.append(f"{version}: {t['name']}.{p['name']} ({p['version']}) wrongly present or absent")
                checked += 1
    if checked < 100:
        failures.append(f"only {checked} properties were checked")
    # Operations too: a property read of version6 is absent from version1's service.
    operations = {v: set(c.service._operations) for v, c in clients.items()}
    if "TarnServiceInstance.hostPicker" not in operations["tarn.version.version8"]:
        failures.append("version8 lacks TarnServiceInstance.hostPicker")
    if "TarnServiceInstance.hostPicker" in operations["tarn.version.version1"]:
        failures.append("version1 has TarnServiceInstance.hostPicker, which it does not see")
    if "TarnServiceInstance.debugManager" not in operations["tarn.version.version1"]:
        failures.append("version1 lacks TarnServiceInstance.debugManager")

    failures += [f"zeep warned: {r}" for r in recorder.records]
    for f in failures:
        print(f)
    print(f"wsdl_check: {checked} properties and {sum(map(len, operations.values()))} operations checked")
    print(f"{1 if not failures else 0} passed, {1 if failures else 0} failed")
    return 1 if failures else 0


if __name__ == "__main__":
    sys.exit(main())
