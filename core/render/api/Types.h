#pragma once

// The device-independent enumerations of the drawing interface. Their values
// index the translation tables of each device implementation.
namespace Render {
namespace API {

enum DeviceImplType : int { DEVICE_GLES1 = 0, DEVICE_GLES2 = 1, DEVICE_D3D10 = 2 };

enum BlendFunc : int {
    BLEND_SRC_COLOR = 0,
    BLEND_DST_COLOR = 1,
    BLEND_SRC_ALPHA = 2,
    BLEND_DST_ALPHA = 3,
    BLEND_ONE_MINUS_SRC_COLOR = 4,
    BLEND_ONE_MINUS_DST_COLOR = 5,
    BLEND_ONE_MINUS_SRC_ALPHA = 6,
    BLEND_ONE_MINUS_DST_ALPHA = 7,
    BLEND_ONE = 8,
    BLEND_ZERO = 9
};

enum CompareFunc : int {
    CMP_ALWAYS = 0,
    CMP_EQUAL = 1,
    CMP_GREATER = 2,
    CMP_GEQUAL = 3,
    CMP_LESS = 4,
    CMP_LEQUAL = 5,
    CMP_NEVER = 6,
    CMP_NOTEQUAL = 7
};

enum CullMode : int { CULL_BACK = 0, CULL_FRONT = 1, CULL_NONE = 2 };

enum PrimitiveType : int {
    PRIMITIVE_TRIANGLES = 0,
    PRIMITIVE_TRIANGLE_FAN = 1,
    PRIMITIVE_TRIANGLE_STRIP = 2,
    PRIMITIVE_LINES = 3,
    PRIMITIVE_LINE_STRIP = 4,
    PRIMITIVE_LINE_LOOP = 5,
    PRIMITIVE_POINTS = 6
};

// Vertex element types: component count and component type.
enum ElementType : int {
    TYPE_FLOAT1 = 0,
    TYPE_FLOAT2 = 1,
    TYPE_FLOAT3 = 2,
    TYPE_FLOAT4 = 3,
    TYPE_SHORT2 = 4,
    TYPE_SHORT3 = 5,
    TYPE_SHORT4 = 6,
    TYPE_UBYTE4 = 7
};

// FORMAT_PALETTE8_RGB8: a palette of 256 R, G, B entries (768 bytes)
// followed by one index byte per pixel.
enum TextureFormat : int {
    FORMAT_RGB = 0,
    FORMAT_RGBA = 1,
    FORMAT_ALPHA = 2,
    FORMAT_LUMINANCE = 3,
    FORMAT_PALETTE8_RGB8 = 4
};

// FILTER_TRILINEAR generates the mipmaps at upload.
enum TextureFilter : int { FILTER_NEAREST = 0, FILTER_LINEAR = 1, FILTER_TRILINEAR = 2 };

// Any value other than WRAP_REPEAT clamps to the edge.
enum TextureWrap : int { WRAP_CLAMP = 0, WRAP_REPEAT = 1 };

}  // namespace API
}  // namespace Render
