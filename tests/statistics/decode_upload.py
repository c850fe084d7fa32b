#!/usr/bin/env python3
"""Decodes one Wi-Fi pool upload independently of the library.

Usage: decode_upload.py DATA_FILE KEY
Unscrambles the "data" field with the key text, gunzips it and parses the XML
with the standard library. Writes the document text, a line "--", then the
model attribute and the chunk types as the parser read them. Exits 1 when any
step fails.
"""
import gzip
import sys
import xml.etree.ElementTree as ElementTree


def main():
    with open(sys.argv[1], "rb") as data_file:
        scrambled = data_file.read()
    key = sys.argv[2].encode("ascii")
    compressed = bytes(b ^ key[i % len(key)] for i, b in enumerate(scrambled))
    document = gzip.decompress(compressed)
    root = ElementTree.fromstring(document)
    sys.stdout.buffer.write(document)
    print("\n--")
    print(root.get("model"))
    print(" ".join(chunk.get("type") for chunk in root.findall("chunk")))


if __name__ == "__main__":
    try:
        main()
    except Exception as error:  # any failure is a wrong upload
        print(error, file=sys.stderr)
        sys.exit(1)
