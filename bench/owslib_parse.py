#!/usr/bin/python3
"""Throughput of OWSLib reading a WMS 1.1.1 capabilities document from memory.

usage: owslib_parse.py FILE N
"""
import statistics
import sys
import time
import warnings

from owslib.wms import WebMapService


def main():
    if len(sys.argv) != 3:
        sys.exit(__doc__.strip().splitlines()[-1])
    path, iterations = sys.argv[1], int(sys.argv[2])
    with open(path, "rb") as f:
        data = f.read()
    # Duplicate layer names draw a warning per parse; they are not what is measured.
    warnings.simplefilter("ignore")
    # The URL is never contacted when the document is given.
    url = "http://127.0.0.1/wms"
    wms = WebMapService(url, version="1.1.1", xml=data)  # untimed warm-up
    secs = []
    for _ in range(iterations):
        t0 = time.perf_counter()
        wms = WebMapService(url, version="1.1.1", xml=data)
        secs.append(time.perf_counter() - t0)
    mb = len(data) / 1e6
    best, median = min(secs), statistics.median(secs)
    print(f"file: {path} ({len(data)} bytes), {iterations} iterations")
    print(f"named layers: {len(wms.contents)} (distinct names)")
    print(f"parse: best {best * 1e3:.2f} ms ({mb / best:.1f} MB/s), "
          f"median {median * 1e3:.2f} ms ({mb / median:.1f} MB/s)")


if __name__ == "__main__":
    main()
