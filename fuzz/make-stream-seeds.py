#!/usr/bin/env python3
"""Writes the seed corpus of fuzz_stream: real snapshot streams, taken from the
stand-in engine of a build through its C interface.

    fuzz/make-stream-seeds.py BUILD_DIR [OUT_DIR]

OUT_DIR defaults to fuzz/corpus/stream beside this script.
"""
import ctypes
import json
import os
import pathlib
import shutil
import sys
import tempfile

INSTANCE, DATABASE, APPLICATION = 0x10001, 0x10009, 0x1000A


class MonRequest(ctypes.Structure):
    _fields_ = [("objectCount", ctypes.c_uint32), ("reserved", ctypes.c_uint32),
                ("objectType", ctypes.c_uint32), ("engineArea", ctypes.c_uint8 * 36)]


class MonSizeRequest(ctypes.Structure):
    _fields_ = [("request", ctypes.POINTER(MonRequest)),
                ("estimate", ctypes.POINTER(ctypes.c_uint32)),
                ("streamVersion", ctypes.c_uint32), ("partition", ctypes.c_int32),
                ("selector", ctypes.c_uint32)]


class MonSnapshotRequest(ctypes.Structure):
    _fields_ = [("request", ctypes.POINTER(MonRequest)), ("output", ctypes.c_void_p),
                ("buffer", ctypes.c_void_p), ("streamVersion", ctypes.c_uint32),
                ("bufferSize", ctypes.c_uint32), ("flags", ctypes.c_uint32),
                ("partition", ctypes.c_int32), ("engineWord", ctypes.c_void_p),
                ("selector", ctypes.c_uint32)]


class Sqlca(ctypes.Structure):
    _fields_ = [("head", ctypes.c_char * 12), ("sqlcode", ctypes.c_int32),
                ("rest", ctypes.c_char * 120)]


def take(app, object_type):
    request = MonRequest(objectCount=1, objectType=object_type)
    estimate = ctypes.c_uint32(0)
    ca = Sqlca()
    size_request = MonSizeRequest(ctypes.pointer(request), ctypes.pointer(estimate), 7, -1, 0)
    rc = app.vrxGetSnapshotSize(9050000, ctypes.byref(size_request), ctypes.byref(ca))
    if rc != 0 or ca.sqlcode != 0:
        return None
    buffer = ctypes.create_string_buffer(estimate.value)
    snapshot = MonSnapshotRequest(request=ctypes.pointer(request),
                                  buffer=ctypes.cast(buffer, ctypes.c_void_p),
                                  streamVersion=7, bufferSize=estimate.value, partition=-1)
    rc = app.vrxGetSnapshot(9050000, ctypes.byref(snapshot), ctypes.byref(ca))
    if rc != 0 or ca.sqlcode != 0:
        return None
    return buffer.raw


# Small instances for the corners the demo does not show.
SMALL = {
    "corners": {
        "pools": [{"id": 3, "current": -1, "bufferPool": "System 8k buffer pool"},
                  {"id": 60, "maximum": "0x7FFFFFFFFFFFFFFF"}, {"id": 0}],
        "databases": [{"name": "", "pools": []},
                      {"name": "SAMPLE2", "pools": [{"id": 20, "current": 1}]},
                      {"name": "SAMPLE", "pools": [{"id": 5, "highWater": 2}]}],
        "applications": [{"number": 1, "database": "SAMPLE2", "pools": []},
                         {"number": 2, "database": "SAMPLE", "pools": [{"id": 2, "current": 3}]},
                         {"number": 3, "database": "SAMPLE2", "pools": []}],
        "privateMemory": [{"number": 0, "pools": [{"id": 15, "current": 4}]}],
    },
}


def main():
    build = pathlib.Path(sys.argv[1]).resolve()
    out = pathlib.Path(sys.argv[2]) if len(sys.argv) > 2 else (
        pathlib.Path(__file__).resolve().parent / "corpus" / "stream")
    out.mkdir(parents=True, exist_ok=True)
    scratch = pathlib.Path(tempfile.mkdtemp(prefix="vrxmtrk-seeds-"))
    try:
        demo = build / "share" / "vrxmtrk" / "demo" / "instance.json"
        instances = {"demo": json.loads(demo.read_text()), **SMALL}
        os.environ["VRX_INSTANCE_DIR"] = str(scratch)
        (scratch / "instance.json").write_text("{}")
        app = ctypes.CDLL(str(build / "lib" / "libvrxapp64.so"))
        kinds = {"instance": INSTANCE, "database": DATABASE, "application": APPLICATION}
        written = set()
        for name, content in instances.items():
            for registry in ("", "VRXMEMTRK=1\n"):
                (scratch / "instance.json").write_text(json.dumps(content))
                (scratch / "registry").write_text(registry)
                for kind, object_type in kinds.items():
                    stream = take(app, object_type)
                    if stream is None or stream in written:
                        continue
                    written.add(stream)
                    suffix = "-internal" if registry else ""
                    (out / f"{name}-{kind}{suffix}.bin").write_bytes(stream)
    finally:
        shutil.rmtree(scratch)


if __name__ == "__main__":
    main()
