#!/usr/bin/env python3
"""Writes the seed corpora of the fuzz targets with Python's own zlib, gzip, zipfile and struct,
an implementation independent of ours. Run from the repository root; the output is checked in,
so run it again only to change the seeds."""
import base64
import gzip
import io
import os
import struct
import urllib.parse
import zipfile
import zlib

ROOT = os.path.join(os.path.dirname(os.path.abspath(__file__)), "corpus")


def put(target, name, data):
    folder = os.path.join(ROOT, target)
    os.makedirs(folder, exist_ok=True)
    with open(os.path.join(folder, name), "wb") as out:
        out.write(data)


def gz(data):
    # A fixed time stamp keeps the seeds the same from run to run.
    return gzip.compress(data, mtime=0)


STARTUP = b"""<?xml version="1.0" encoding="UTF-8"?>
<startup>
  <uuid>3f2a-77b1</uuid>
  <deviceid>dev-42</deviceid>
  <query_hosts>
    <host type="default">http://127.0.0.1:8080/</host>
    <host type="cellid">http://127.0.0.1:8081/</host>
    <host type="tiles">http://127.0.0.1:8082/t/</host>
  </query_hosts>
  <features>
    <feature name="wifipool" enabled="true" interval="3600"/>
    <feature name="voice" enabled="0">
      <item>de</item><item>en</item>
    </feature>
  </features>
</startup>
"""
LOCATION = b'<location><coordinates latitude="52.5200" longitude="13.4050" accuracy="35.5"/></location>'
LOCATION_BOUNDS = (b'<location><coordinates latitude="-33.86" longitude="151.2" '
                   b'nlatitude="-33.861" nlongitude="151.21"/></location>')
ERROR = b'<error code="404">not found &amp; &#x41;&lt;</error>'
ODD = (b'<?xml version="1.0" encoding="ISO-8859-1"?><!-- c --><a b=\'1\' c="x&quot;y">'
       b'<![CDATA[<raw>]]><b>-2147483649</b><b>4294967296</b><c>1e39</c><d/>\xe4\xf6</a>')
UTF8 = "<t lang=\"ja\">地図 – Straße 🗺</t>".encode("utf-8")


def xml_seeds():
    # First byte: bit 0 gzipped, bit 1 through a stream.
    for name, doc in [("startup", STARTUP), ("location", LOCATION), ("bounds", LOCATION_BOUNDS),
                      ("error", ERROR), ("odd", ODD), ("utf8", UTF8)]:
        put("XmlLoad", name + ".xml", b"\x00" + doc)
        put("XmlLoad", name + "-stream.xml", b"\x02" + doc)
    put("XmlLoad", "startup.xml.gz", b"\x01" + gz(STARTUP))
    put("XmlLoad", "location.xml.zlib", b"\x01" + zlib.compress(LOCATION))
    put("XmlLoad", "plain-marked-gzipped.xml", b"\x01" + ERROR)


def gzip_seeds():
    # Byte 0: exceptions on or off; bytes 1-4: piece sizes; then the compressed data.
    text = b"mapcore " * 64 + bytes(range(256))
    put("GzipInputStream", "gzip", b"\x01\x10\x40\x03\xff" + gz(text))
    put("GzipInputStream", "zlib", b"\x00\x08\x08\x08\x08" + zlib.compress(text, 9))
    put("GzipInputStream", "empty-gzip", b"\x00\x01\x02\x03\x04" + gz(b""))
    put("GzipInputStream", "plain", b"\x01\x05\x05\x05\x05" + b"not compressed at all")
    two = gz(b"first member ") + gz(b"second member")
    put("GzipInputStream", "two-members", b"\x00\x20\x20\x20\x20" + two)
    stored = zlib.compressobj(0, zlib.DEFLATED, 31)
    put("GzipInputStream", "stored-block", b"\x01\x30\x01\x30\x01" + stored.compress(text) + stored.flush())
    put("GzipInputStream", "truncated", b"\x01\x10\x10\x10\x10" + gz(text)[:-9])


def url_seeds():
    for name, text in [("plain", "abc-_.!~*'()"), ("spaces", "a b+c"),
                       ("escapes", "%41%4a%4B%e4%C3%A4%00x"), ("broken", "%%4%g1%"),
                       ("query", "q=" + urllib.parse.quote_plus("Straße & Weg/12?x=1"))]:
        put("UrlDecode", name, text.encode("utf-8"))


def base64_seeds():
    for name, data in [("bytes", bytes(range(0, 256, 3))), ("one", b"a"), ("two", b"ab"),
                       ("text", b"mapcore settings")]:
        put("Base64Decode", name, base64.b64encode(data))
    put("Base64Decode", "lines", base64.encodebytes(bytes(range(200))))
    put("Base64Decode", "in-xml", b"QUJD\n REVG <tail>")
    put("Base64Decode", "junk", b"====*&^%QQ")


def settings_body(version):
    # The fuzz target's settings class: magic, version, then its fields.
    body = b"MCFZ" + struct.pack("<i", version)
    body += struct.pack("<?BbhqQf", True, 200, -3, -300, 7, 2**64 - 1, 1.5)
    title = "Karte €".encode("utf-8")
    body += struct.pack("<i", len(title)) + title
    body += bytes([5]) + b"short"
    if version >= 4:
        body += b"/data/maps\x00" + b"line one\r\n"
        body += struct.pack("<i3f", 3, 0.5, -2.25, 1e30)
    return body


def settings_seeds():
    # First byte: bit 0 compressed, bit 1 older versions accepted.
    put("SettingsFile", "plain-v4", b"\x00" + settings_body(4))
    put("SettingsFile", "gzip-v4", b"\x01" + gz(settings_body(4)))
    put("SettingsFile", "plain-v3-old-ok", b"\x02" + settings_body(3))
    put("SettingsFile", "gzip-v3-old-ok", b"\x03" + gz(settings_body(3)))
    put("SettingsFile", "newer-version", b"\x00" + settings_body(4).replace(b"\x04\x00", b"\x05\x00", 1))
    put("SettingsFile", "truncated", b"\x01" + gz(settings_body(4)[:30]))
    put("SettingsFile", "zlib-not-gzip", b"\x01" + zlib.compress(settings_body(4)))


def package(entries):
    out = io.BytesIO()
    with zipfile.ZipFile(out, "w") as archive:
        for name, data, method, extra in entries:
            info = zipfile.ZipInfo(name, date_time=(2026, 1, 1, 0, 0, 0))
            info.compress_type = method
            info.extra = extra
            archive.writestr(info, data)
    return out.getvalue()


def split(name, data, block, method=zipfile.ZIP_DEFLATED):
    # A resource larger than the block size: the entry itself, then name.part001 ...; the first
    # carries total size and block size as its extra field.
    parts = [data[i:i + block] for i in range(0, len(data), block)]
    entries = [(name, parts[0], method, struct.pack("<II", len(data), block))]
    for index, part in enumerate(parts[1:], start=1):
        entries.append(("%s.part%03d" % (name, index), part, method, b""))
    return entries


def package_seeds():
    text = b"".join(b"line %04d of the resource\n" % i for i in range(120))
    put("ResourcePackage", "plain.pak", package([
        ("a.txt", b"hello resource", zipfile.ZIP_DEFLATED, b""),
        ("img/b.png", bytes(range(256)), zipfile.ZIP_STORED, b""),
        ("empty", b"", zipfile.ZIP_STORED, b"")]))
    put("ResourcePackage", "split.pak", package(split("big.txt", text, 1000)))
    put("ResourcePackage", "split-stored.pak", package(split("big.bin", text, 700, zipfile.ZIP_STORED)))
    put("ResourcePackage", "bad-extra.pak", package([
        ("x", text[:500], zipfile.ZIP_DEFLATED, struct.pack("<II", 4000, 0)),
        ("y", text[:50], zipfile.ZIP_DEFLATED, struct.pack("<I", 9))]))
    missing_part = [e for e in split("m.txt", text, 900) if not e[0].endswith("part002")]
    put("ResourcePackage", "missing-part.pak", package(missing_part))


def readers_seeds():
    # Byte 0: exceptions and stream kind; byte 1: operation count; operations; data.
    data = settings_body(4)
    every = bytes(range(16))
    put("InputStreamReaders", "memory", b"\x00" + bytes([len(every)]) + every + data)
    put("InputStreamReaders", "file-exceptions", b"\x03" + bytes([len(every)]) + every + data)
    put("InputStreamReaders", "window", b"\x04\x08" + bytes([4, 8, 9, 10, 11, 0x2d, 0x3e, 0x1f]) + data)
    put("InputStreamReaders", "file-window", b"\x07\x06" + bytes([8, 8, 8, 0x5c, 5, 6]) + data)
    put("InputStreamReaders", "lines", b"\x00\x04" + bytes([11, 11, 11, 10]) + b"a\r\nb\nc\x00d")


if __name__ == "__main__":
    xml_seeds()
    gzip_seeds()
    url_seeds()
    base64_seeds()
    settings_seeds()
    package_seeds()
    readers_seeds()
