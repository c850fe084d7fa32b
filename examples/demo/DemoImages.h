#pragma once

#include <string>

// Pictures the demo makes for itself with libpng and libjpeg. Main thread.
namespace demo {

// A package at packagePath holding "marker.png": a 100 × 60 RGBA ring whose
// edge fades out, so it shows blending.
bool packMarkerPng(const std::string& packagePath);
// A 64 × 64 colour gradient as a JPEG file at the platform path.
bool writePhotoJpeg(const char* path);

}  // namespace demo
