#!/usr/bin/env python3
"""Writes the seed corpora of the development server's fuzz targets with
Python's own gzip. Run with the build's scrambling key (MAPCORE_UPLOAD_SCRAMBLE_KEY
in the build folder's CMakeCache.txt) as the argument; the output is checked in,
so run it again only to change the seeds."""
import gzip
import os
import sys

ROOT = os.path.join(os.path.dirname(os.path.abspath(__file__)), "corpus")
KEY = sys.argv[1].encode("ascii")

DOCUMENT = (b'<?xml version="1.0" encoding="windows-1251" ?>\n'
            b'<wifipool uuid="dev-1" app_version="325" app_platform="android" clid="0" manufacter="ACME" '
            b'model="Phone"><chunk type="normal" time="04122026:175951" connection="wifi">'
            b'<request-timings ><r type="startup" lat="48.1"  lon="11.5"><u size="120"></u>'
            b'<d size="512" time="1200"></d></r></request-timings>'
            b'<gps lat="48.135050" lon="11.586600" speed="12.000000" course="90.000000"></gps>'
            b'<cellinfos network_type="UNKNOWN" radio_type="NONE"><cellinfo cellid="23011" lac="4021" '
            b'operatorid="26201" countrycode="262" sigstr="-85" age="0"></cellinfo></cellinfos>'
            b'<bssids ><bssid name="aG9tZQ==" channel="0" sigstr="-48" age="0">001A2B3C4D5E</bssid></bssids>'
            b'</chunk><chunk type="error" time="04122026:175955" connection="none"><bssids ></bssids></chunk>'
            b'</wifipool>')


def put(target, name, data):
    folder = os.path.join(ROOT, target)
    os.makedirs(folder, exist_ok=True)
    with open(os.path.join(folder, name), "wb") as out:
        out.write(data)


def gz(data):
    return gzip.compress(data, mtime=0)


def scramble(data):
    return bytes(b ^ KEY[i % len(KEY)] for i, b in enumerate(data))


def upload_seeds():
    put("DevServerUpload", "as-sent", b"\x00" + scramble(gz(DOCUMENT)))
    put("DevServerUpload", "gzip", b"\x01" + gz(DOCUMENT))
    put("DevServerUpload", "two-members", b"\x01" + gz(DOCUMENT[:200]) + gz(DOCUMENT[200:]))
    put("DevServerUpload", "truncated", b"\x01" + gz(DOCUMENT)[:-20])
    put("DevServerUpload", "document", b"\x02" + DOCUMENT)
    put("DevServerUpload", "markup", b"\x02<?xml version='1.0'?><!-- c --><wifipool a='1'><![CDATA[<x>]]>"
        b"<chunk type=\"t\"/><?pi x?></wifipool>")
    put("DevServerUpload", "nested", b"\x02<wifipool>" + b"<a>" * 40 + b"</a>" * 40 + b"</wifipool>")
    put("DevServerUpload", "doctype", b"\x02<!DOCTYPE wifipool><wifipool></wifipool>")


def query_seeds():
    put("DevServerQuery", "wifi", b"\x00uuid=u&wifinetworks=001a2b3c4d5e:-71,001A2B3C4D5F:-80")
    put("DevServerQuery", "cell", b"\x00uuid=u&lac=4021&cellid=23011&operatorid=26201&countrycode=262"
        b"&signalstrength=-85")
    put("DevServerQuery", "cell-mnc-only", b"\x00lac=7713&cellid=20961&operatorid=01&countrycode=250")
    put("DevServerQuery", "malformed", b"\x00wifinetworks=abc,:&cellid=-1")
    put("DevServerQuery", "config", b"\x01# radios\nuuid_prefix = d-\nscan_timeout = 2\nhost.tiles = http://t/\n"
        b"wifi = 00:1a:2b:3c:4d:5e 48.1 11.5 40\ncell = 262 1 4021 23011 48.1 11.5 1500\n")
    put("DevServerQuery", "config-bad", b"\x01wifi = 001a2b3c4d5e 91 0 1\n")


if __name__ == "__main__":
    upload_seeds()
    query_seeds()
