#!/usr/bin/env python3
"""Encodes one Wi-Fi pool upload independently of the library.

Usage: encode_upload.py KEY BOUNDARY DOCUMENT_FILE [CUT]
Gzips the document with Python's gzip, XORs the bytes with the key text's
ASCII codes, and writes to stdout the multipart/form-data body that carries
them as the "data" part, followed by a "lang" part, with the given boundary.
CUT drops that many bytes from the end of the gzip data, for a damaged
upload.
"""
import gzip
import sys


def main():
    key = sys.argv[1].encode("ascii")
    boundary = sys.argv[2].encode("ascii")
    with open(sys.argv[3], "rb") as document_file:
        compressed = gzip.compress(document_file.read(), mtime=0)
    if len(sys.argv) > 4:
        compressed = compressed[:len(compressed) - int(sys.argv[4])]
    scrambled = bytes(b ^ key[i % len(key)] for i, b in enumerate(compressed))
    body = (b"--" + boundary + b"\r\n"
            b'Content-Disposition: form-data; name="data"\r\n'
            b"Content-Type: application/octet-stream\r\n\r\n" + scrambled + b"\r\n"
            b"--" + boundary + b"\r\n"
            b'Content-Disposition: form-data; name="lang"\r\n\r\n'
            b"en-US\r\n"
            b"--" + boundary + b"--\r\n")
    sys.stdout.buffer.write(body)


if __name__ == "__main__":
    main()
