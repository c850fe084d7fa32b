#!/usr/bin/env python3
"""Writes tunnel-drive.gpx, the demo's short drive: east along a road, into a
tunnel where the receiver loses its fix for 20 s, out again and round a bend
to the north. One point a second with speed, course and accuracy, and a few
metres of seeded noise, as a receiver would record it."""
import math
import random
import xml.etree.ElementTree as ET
from datetime import datetime, timedelta, timezone

GPX = "http://www.topografix.com/GPX/1/1"
MAPCORE = "urn:mapcore:gpx:1"
ET.register_namespace("", GPX)
ET.register_namespace("mapcore", MAPCORE)

EARTH_RADIUS = 6371000.0
random.seed(16)


def move(lat, lon, course, metres):
    d = metres / EARTH_RADIUS
    lat1, lon1, c = map(math.radians, (lat, lon, course))
    lat2 = math.asin(math.sin(lat1) * math.cos(d) + math.cos(lat1) * math.sin(d) * math.cos(c))
    lon2 = lon1 + math.atan2(math.sin(c) * math.sin(d) * math.cos(lat1), math.cos(d) - math.sin(lat1) * math.sin(lat2))
    return math.degrees(lat2), math.degrees(lon2)


# (seconds, speed m/s, course at start, course at end, recorded)
LEGS = [
    (15, 13.0, 90.0, 90.0, True),
    (20, 14.0, 90.0, 90.0, False),  # the tunnel
    (10, 13.0, 90.0, 90.0, True),
    (8, 9.0, 90.0, 10.0, True),  # the bend
    (12, 12.0, 10.0, 10.0, True),
]

lat, lon = 48.1351, 11.5820
start = datetime(2026, 5, 4, 8, 30, 0, tzinfo=timezone.utc)
second = 0
gpx = ET.Element(f"{{{GPX}}}gpx", version="1.1", creator="mapcore make_tunnel_drive.py")
trk = ET.SubElement(gpx, f"{{{GPX}}}trk")
ET.SubElement(trk, f"{{{GPX}}}name").text = "Demo drive through a tunnel"
seg = ET.SubElement(trk, f"{{{GPX}}}trkseg")
for seconds, speed, course0, course1, recorded in LEGS:
    for i in range(seconds):
        course = course0 + (course1 - course0) * i / seconds
        if recorded:
            noisy_lat, noisy_lon = move(lat, lon, random.uniform(0, 360), abs(random.gauss(0, 2.5)))
            pt = ET.SubElement(seg, f"{{{GPX}}}trkpt", lat=f"{noisy_lat:.7f}", lon=f"{noisy_lon:.7f}")
            ET.SubElement(pt, f"{{{GPX}}}ele").text = f"{520 + random.gauss(0, 1.5):.1f}"
            stamp = start + timedelta(seconds=second)
            ET.SubElement(pt, f"{{{GPX}}}time").text = stamp.strftime("%Y-%m-%dT%H:%M:%SZ")
            ext = ET.SubElement(pt, f"{{{GPX}}}extensions")
            ET.SubElement(ext, f"{{{MAPCORE}}}speed").text = f"{max(0.0, speed + random.gauss(0, 0.3)):.2f}"
            ET.SubElement(ext, f"{{{MAPCORE}}}course").text = f"{(course + random.gauss(0, 2)) % 360:.1f}"
            ET.SubElement(ext, f"{{{MAPCORE}}}accuracy").text = f"{random.uniform(5, 9):.1f}"
        lat, lon = move(lat, lon, course, speed)
        second += 1

ET.indent(gpx)
ET.ElementTree(gpx).write("tunnel-drive.gpx", encoding="UTF-8", xml_declaration=True)
