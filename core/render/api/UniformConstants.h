#pragma once

namespace Render {
namespace API {

// Names of the constants a device understands; others go to the program.
struct UniformConstants {
    static const char* const UNIFORM_COLOR;
    static const char* const UNIFORM_AMBIENT;
    static const char* const UNIFORM_POINT_SIZE;
    static const char* const UNIFORM_LINE_SIZE;
    static const char* const UNIFORM_MATRIX_WVP;
    static const char* const UNIFORM_TEXTURE_SCALE;
};

}  // namespace API
}  // namespace Render
