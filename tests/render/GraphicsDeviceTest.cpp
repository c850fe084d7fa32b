// The fixed-function device on the real GLES 1.1 context: every draw path and
// state block is checked on the pixels it leaves in the frame.
#include <algorithm>
#include <boost/make_shared.hpp>
#include <string>
#include <tuple>

#include "GlesTest.h"
#include "render/api/IndexBuffer.h"
#include "render/api/Program.h"
#include "render/api/Texture2D.h"
#include "render/api/VertexBuffer.h"
#include "render/api/VertexDeclaration.h"
#include "render/api/gles1/GraphicsDeviceImpl.h"
#include "render/api/gles1/ProgramImpl.h"

namespace {

using namespace Render::API;

struct Vertex {
    float x, y, z;
    std::uint8_t r, g, b, a;
    float u, v;
};

const Math::Color kBlack(0, 0, 0, 255);
const Math::Color kGreen(0, 255, 0, 255);

VertexDeclaration declaration(bool colour, bool texCoord) {
    VertexDeclaration d;
    d.stride = sizeof(Vertex);
    d.elements.push_back({VertexDeclaration::USAGE_POSITION, TYPE_FLOAT3, 0});
    if (colour) {
        d.elements.push_back({VertexDeclaration::USAGE_COLOR, TYPE_UBYTE4, 12});
    }
    if (texCoord) {
        d.elements.push_back({VertexDeclaration::USAGE_TEXCOORD, TYPE_FLOAT2, 16});
    }
    return d;
}

std::vector<Vertex> vertices(std::initializer_list<std::pair<float, float>> points, Math::Color c = kGreen,
                             float z = 0) {
    std::vector<Vertex> out;
    for (const auto& p : points) {
        out.push_back({p.first, p.second, z, c.r, c.g, c.b, c.a, 0, 0});
    }
    return out;
}

// One primitive type: its vertices (the first is never drawn, every draw
// starts at 1), and pixels it must and must not cover.
struct Shape {
    PrimitiveType type;
    std::vector<Vertex> points;
    std::vector<std::pair<int, int>> on;
    std::vector<std::pair<int, int>> off;
};

std::vector<Shape> shapes() {
    const std::pair<float, float> junk{63.5f, 63.5f};
    return {
        {PRIMITIVE_TRIANGLES,
         vertices({junk, {16, 16}, {48, 16}, {48, 48}, {16, 16}, {48, 48}, {16, 48}}),
         {{32, 32}, {20, 44}, {44, 20}},
         {{4, 4}, {63, 63}}},
        {PRIMITIVE_TRIANGLE_FAN,
         vertices({junk, {16, 16}, {48, 16}, {48, 48}, {16, 48}}),
         {{32, 32}, {20, 44}, {44, 20}},
         {{4, 4}, {63, 63}}},
        {PRIMITIVE_TRIANGLE_STRIP,
         vertices({junk, {16, 16}, {48, 16}, {16, 48}, {48, 48}}),
         {{32, 32}, {20, 44}, {44, 20}},
         {{4, 4}, {63, 63}}},
        {PRIMITIVE_LINES,
         vertices({junk, {8, 32.5f}, {56, 32.5f}}),
         {{32, 32}, {10, 32}},
         {{32, 20}, {63, 63}}},
        {PRIMITIVE_LINE_STRIP,
         vertices({junk, {8.5f, 8.5f}, {8.5f, 32.5f}, {32.5f, 32.5f}, {32.5f, 8.5f}}),
         {{8, 20}, {20, 32}, {32, 20}},
         {{20, 8}, {20, 20}}},
        // The closing segment from the last point back to the first tells a loop from a strip.
        {PRIMITIVE_LINE_LOOP,
         vertices({junk, {8.5f, 8.5f}, {8.5f, 32.5f}, {32.5f, 32.5f}, {32.5f, 8.5f}}),
         {{8, 20}, {20, 32}, {32, 20}, {20, 8}},
         {{20, 20}, {63, 63}}},
        {PRIMITIVE_POINTS, vertices({junk, {32, 32}}), {{32, 32}, {31, 31}}, {{36, 36}, {63, 63}}},
    };
}

enum Source { CLIENT_ARRAYS, BUFFERS };

class DrawPathTest : public GlesTest, public ::testing::WithParamInterface<std::tuple<int, Source, bool>> {};

TEST_P(DrawPathTest, DrawsTheShapeWithTheVertexColours) {
    const Shape shape = shapes()[std::get<0>(GetParam())];
    const bool buffers = std::get<1>(GetParam()) == BUFFERS;
    const bool indexed = std::get<2>(GetParam());
    // Indexed draws go through the vertices backwards, index 0 unused.
    std::vector<Vertex> points = shape.points;
    std::vector<unsigned short> indices(1, 0);
    if (indexed) {
        std::reverse(points.begin() + 1, points.end());
        for (size_t i = points.size() - 1; i > 0; --i) {
            indices.push_back(static_cast<unsigned short>(i));
        }
    }
    const VertexDeclaration decl = declaration(true, false);
    const int count = static_cast<int>(points.size()) - 1;
    frame([&] {
        useOrtho();
        device->clearTarget(kBlack);
        device->setConstant(UniformConstants::UNIFORM_POINT_SIZE, 4.0f);
        device->setVertexDeclaration(decl);
        if (buffers) {
            device->setVertexBuffer(
                device->createVertexBuffer(points.size() * sizeof(Vertex), points.data()));
            device->setIndexBuffer(device->createIndexBuffer(indices.size(), indices.data()));
        } else {
            device->setVertexBufferUP(points.data(), points.size() * sizeof(Vertex));
            device->setIndexBufferUP(indices.data(), indices.size());
        }
        if (indexed) {
            device->drawIndexedPrimitives(shape.type, 1, count);
        } else {
            device->drawPrimitives(shape.type, 1, count);
        }
        for (const auto& p : shape.on) {
            EXPECT_EQ(pixel(p.first, p.second), kGreen) << "at " << p.first << "," << p.second;
        }
        for (const auto& p : shape.off) {
            EXPECT_EQ(pixel(p.first, p.second), kBlack) << "at " << p.first << "," << p.second;
        }
    });
}

INSTANTIATE_TEST_SUITE_P(EveryPrimitive, DrawPathTest,
                         ::testing::Combine(::testing::Range(0, 7), ::testing::Values(CLIENT_ARRAYS, BUFFERS),
                                            ::testing::Bool()));

class GraphicsDeviceTest : public GlesTest {
protected:
    // A quad over [x0, x1] × [y0, y1] at depth z, drawn as a fan from client arrays.
    void quad(float x0, float y0, float x1, float y1, Math::Color c, float z = 0, bool clockwise = false) {
        quadVertices = clockwise ? vertices({{x0, y0}, {x0, y1}, {x1, y1}, {x1, y0}}, c, z)
                                 : vertices({{x0, y0}, {x1, y0}, {x1, y1}, {x0, y1}}, c, z);
        device->setVertexBufferUP(quadVertices.data(), quadVertices.size() * sizeof(Vertex));
        device->setVertexDeclaration(colourDeclaration);
        device->drawPrimitives(PRIMITIVE_TRIANGLE_FAN, 0, 4);
    }

    const VertexDeclaration colourDeclaration = declaration(true, false);
    std::vector<Vertex> quadVertices;
};

TEST_F(GraphicsDeviceTest, BlendStatesCombineAsGlDefines) {
    const Math::Color halfRed(255, 0, 0, 128);
    struct Case {
        BlendState state;
        Math::Color expected;
    } cases[] = {{BlendState(), Math::Color(255, 0, 0, 128)},
                 {BlendState::OPAQUE, Math::Color(255, 0, 0, 128)},
                 {BlendState::ALPHA_BLEND, Math::Color(128, 0, 127, 191)},
                 {BlendState::ADDITIVE, Math::Color(128, 0, 255, 255)}};
    for (const Case& c : cases) {
        frame([&] {
            useOrtho();
            device->setBlendState(BlendState::OPAQUE);
            device->clearTarget(Math::Color(0, 0, 255, 255));
            device->setBlendState(c.state);
            quad(0, 0, kSize, kSize, halfRed);
            Math::Color got = pixel(32, 32);
            EXPECT_NEAR(got.r, c.expected.r, 1) << got;
            EXPECT_NEAR(got.g, c.expected.g, 1) << got;
            EXPECT_NEAR(got.b, c.expected.b, 1) << got;
        });
    }
}

TEST_F(GraphicsDeviceTest, DepthTestCompareAndWriteDecideWhichQuadStays) {
    // z 0.5 lies in front of z -0.5 under the projection.
    struct Case {
        DepthStencilState state;
        Math::Color expected;
    } cases[] = {{{true, true, CMP_LESS}, kGreen},
                 {{true, true, CMP_GREATER}, kBlack},
                 {{true, true, CMP_ALWAYS}, Math::Color(255, 0, 0, 255)},
                 {{true, false, CMP_LESS}, Math::Color(255, 0, 0, 255)},
                 {DepthStencilState(), Math::Color(255, 0, 0, 255)}};
    for (const Case& c : cases) {
        frame([&] {
            useOrtho();
            device->setDepthStencilState({true, true, CMP_ALWAYS});
            device->clearTarget(kBlack);
            device->clearDepth();
            device->setDepthStencilState(c.state);
            quad(0, 0, kSize, kSize, kGreen, 0.5f);
            quad(0, 0, kSize, kSize, Math::Color(255, 0, 0, 255), -0.5f);
            EXPECT_EQ(pixel(32, 32), c.expected)
                << c.state.depthTest << c.state.depthWrite << static_cast<int>(c.state.compare);
        });
    }
}

TEST_F(GraphicsDeviceTest, CullScissorAndViewportLimitWhatIsDrawn) {
    struct Case {
        CullMode cull;
        bool clockwise;
        bool drawn;
    } culls[] = {{CULL_BACK, false, true},
                 {CULL_BACK, true, false},
                 {CULL_FRONT, false, false},
                 {CULL_FRONT, true, true},
                 {CULL_NONE, true, true}};
    for (const Case& c : culls) {
        frame([&] {
            useOrtho();
            RasterizerState state;
            state.cullMode = c.cull;
            device->setRasterizerState(state);
            device->clearTarget(kBlack);
            quad(0, 0, kSize, kSize, kGreen, 0, c.clockwise);
            EXPECT_EQ(pixel(32, 32), c.drawn ? kGreen : kBlack) << c.cull << c.clockwise;
        });
    }
    frame([&] {
        useOrtho();
        device->setRasterizerState(RasterizerState());
        device->clearTarget(kBlack);
        RasterizerState scissored;
        scissored.scissorTest = true;
        device->setRasterizerState(scissored);
        device->setScissorRect({0, 0, 20, kSize});
        device->clearTarget(Math::Color(0, 0, 255, 255));
        quad(0, 0, kSize, kSize, kGreen);
        EXPECT_EQ(pixel(10, 32), kGreen);
        EXPECT_EQ(pixel(30, 32), kBlack);

        device->setRasterizerState(RasterizerState());
        device->clearTarget(kBlack);
        device->setViewport({0, 0, 32, 32});
        quad(0, 0, kSize, kSize, kGreen);
        EXPECT_EQ(pixel(31, 31), kGreen);
        EXPECT_EQ(pixel(33, 33), kBlack);
    });
}

TEST_F(GraphicsDeviceTest, APositionOnlyDeclarationDrawsInTheConstantColour) {
    const VertexDeclaration positionOnly = declaration(false, false);
    frame([&] {
        useOrtho();
        device->clearTarget(kBlack);
        quad(0, 0, kSize, kSize, kGreen);
        const float blue[] = {0, 0, 1, 1};
        device->setConstant(UniformConstants::UNIFORM_COLOR, blue, 4);
        device->setVertexDeclaration(positionOnly);
        device->drawPrimitives(PRIMITIVE_TRIANGLE_FAN, 0, 4);
        EXPECT_EQ(pixel(32, 32), Math::Color(0, 0, 255, 255));
        EXPECT_FALSE(glIsEnabled(GL_COLOR_ARRAY));
    });
}

// A textured quad over the whole target with texture coordinates 0..repeat.
class TextureDrawTest : public GraphicsDeviceTest {
protected:
    void drawTextured(const boost::shared_ptr<Texture2D>& texture, float repeat = 1) {
        useOrtho();
        device->clearTarget(kBlack);
        const float white[] = {1, 1, 1, 1};
        device->setConstant(UniformConstants::UNIFORM_COLOR, white, 4);
        quadVertices = vertices({{0, 0}, {kSize, 0}, {kSize, kSize}, {0, kSize}});
        const float uv[4][2] = {{0, 0}, {repeat, 0}, {repeat, repeat}, {0, repeat}};
        for (int i = 0; i < 4; ++i) {
            quadVertices[i].u = uv[i][0];
            quadVertices[i].v = uv[i][1];
        }
        device->setTexture(0, texture);
        device->setVertexBufferUP(quadVertices.data(), quadVertices.size() * sizeof(Vertex));
        device->setVertexDeclaration(textured);
        device->drawPrimitives(PRIMITIVE_TRIANGLE_FAN, 0, 4);
    }

    // The colours of the four quadrants: lower-left, lower-right, upper-left, upper-right.
    static std::vector<Math::Color> quadrants() {
        return {pixel(16, 16), pixel(48, 16), pixel(16, 48), pixel(48, 48)};
    }

    const VertexDeclaration textured = declaration(false, true);
};

TEST_F(TextureDrawTest, EveryFormatUploadsAndSamplesItsTexels) {
    const Math::Color red(255, 0, 0, 255);
    const Math::Color blue(0, 0, 255, 255);
    const Math::Color white(255, 255, 255, 255);
    const Math::Color gray(100, 100, 100, 255);
    std::vector<unsigned char> palette(768 + 4);
    const unsigned char entries[][3] = {{255, 0, 0}, {0, 0, 255}, {255, 255, 255}, {100, 100, 100}};
    for (int i = 0; i < 4; ++i) {
        std::copy(entries[i], entries[i] + 3, palette.begin() + 3 * (10 + i));
        palette[768 + i] = static_cast<unsigned char>(10 + i);
    }
    struct Case {
        TextureFormat format;
        std::vector<unsigned char> data;
        std::vector<Math::Color> expected;
    } cases[] = {
        {FORMAT_RGB, {255, 0, 0, 0, 0, 255, 255, 255, 255, 100, 100, 100}, {red, blue, white, gray}},
        {FORMAT_RGBA,
         {255, 0, 0, 255, 0, 0, 255, 255, 255, 255, 255, 255, 100, 100, 100, 255},
         {red, blue, white, gray}},
        {FORMAT_LUMINANCE, {255, 100, 0, 255}, {white, gray, kBlack, white}},
        {FORMAT_ALPHA,
         {255, 100, 0, 255},
         {white, Math::Color(255, 255, 255, 100), Math::Color(255, 255, 255, 0), white}},
        {FORMAT_PALETTE8_RGB8, palette, {red, blue, white, gray}},
    };
    for (const Case& c : cases) {
        frame([&] {
            boost::shared_ptr<Texture2D> texture = device->createTexture2D(
                2, 2, c.format, FILTER_NEAREST, WRAP_CLAMP, WRAP_CLAMP, c.data.data());
            ASSERT_TRUE(texture);
            EXPECT_EQ(texture->getFormat(), c.format);
            drawTextured(texture);
            EXPECT_EQ(quadrants(), c.expected) << "format " << c.format;
            texture->release();
        });
    }
}

TEST_F(TextureDrawTest, SubDataWithOddRowsLandsWhereAskedAndBindingsSurviveNewObjects) {
    frame([&] {
        std::vector<unsigned char> black(4 * 4 * 3, 0);
        boost::shared_ptr<Texture2D> texture =
            device->createTexture2D(4, 4, FORMAT_RGB, FILTER_NEAREST, WRAP_CLAMP, WRAP_CLAMP, black.data());
        // Rows of 3 pixels are 9 bytes: GL must not expect them padded.
        std::vector<unsigned char> green(3 * 2 * 3, 0);
        for (size_t i = 1; i < green.size(); i += 3) {
            green[i] = 255;
        }
        texture->setSubData(green.data(), 1, 2, 3, 2);
        device->setTexture(0, texture);
        // Creating objects binds and unbinds their own names.
        boost::shared_ptr<Texture2D> other =
            device->createTexture2D(2, 2, FORMAT_RGB, FILTER_NEAREST, WRAP_CLAMP, WRAP_CLAMP, nullptr);
        drawTextured(texture);
        EXPECT_EQ(quadrants(), (std::vector<Math::Color>{kBlack, kBlack, kGreen, kGreen}));
        EXPECT_EQ(pixel(20, 56), kGreen);
        EXPECT_EQ(pixel(8, 56), kBlack);
        texture->release();
        other->release();

        std::vector<Vertex> points = vertices({{0, 0}, {kSize, 0}, {kSize, kSize}, {0, kSize}});
        device->setTexture(0, boost::shared_ptr<Texture2D>());
        device->setVertexBuffer(device->createVertexBuffer(points.size() * sizeof(Vertex), points.data()));
        boost::shared_ptr<VertexBuffer> unrelated = device->createVertexBuffer(64, nullptr);
        device->clearTarget(kBlack);
        device->setVertexDeclaration(colourDeclaration);
        device->drawPrimitives(PRIMITIVE_TRIANGLE_FAN, 0, 4);
        EXPECT_EQ(pixel(32, 32), kGreen);
        unrelated->release();
    });
}

TEST_F(TextureDrawTest, FiltersWrapsAndTextureScaleSampleAsAsked) {
    const Math::Color red(255, 0, 0, 255);
    const unsigned char redGreen[] = {255, 0, 0, 0, 255, 0};
    frame([&] {
        // Coordinates 0..2 over a red-green texture: repeating gives the pair twice.
        boost::shared_ptr<Texture2D> repeat =
            device->createTexture2D(2, 1, FORMAT_RGB, FILTER_NEAREST, WRAP_REPEAT, WRAP_REPEAT, redGreen);
        drawTextured(repeat, 2);
        EXPECT_EQ(pixel(8, 8), red);
        EXPECT_EQ(pixel(24, 8), kGreen);
        EXPECT_EQ(pixel(40, 8), red);
        boost::shared_ptr<Texture2D> clamp =
            device->createTexture2D(2, 1, FORMAT_RGB, FILTER_NEAREST, WRAP_CLAMP, WRAP_CLAMP, redGreen);
        drawTextured(clamp, 2);
        EXPECT_EQ(pixel(8, 8), red);
        EXPECT_EQ(pixel(40, 8), kGreen);
        // The texture matrix halves the coordinates: one red-green pair again.
        device->setConstant(UniformConstants::UNIFORM_TEXTURE_SCALE, 0.5f);
        drawTextured(repeat, 2);
        EXPECT_EQ(pixel(24, 8), red);
        EXPECT_EQ(pixel(40, 8), kGreen);
        device->setConstant(UniformConstants::UNIFORM_TEXTURE_SCALE, 1.0f);

        // Trilinear sampling needs the mipmaps generated at upload; without
        // them the texture would be incomplete and draw white.
        std::vector<unsigned char> allRed(8 * 8 * 3, 0);
        for (size_t i = 0; i < allRed.size(); i += 3) {
            allRed[i] = 255;
        }
        boost::shared_ptr<Texture2D> mipmapped = device->createTexture2D(
            8, 8, FORMAT_RGB, FILTER_TRILINEAR, WRAP_CLAMP, WRAP_CLAMP, allRed.data());
        quadVertices.clear();
        drawTextured(mipmapped);
        EXPECT_EQ(pixel(32, 32), red);
        for (auto& t : {repeat, clamp, mipmapped}) {
            t->release();
        }
    });
}

TEST_F(GraphicsDeviceTest, ConstantsAreMatchedByTextAndMisuseIsRefused) {
    frame([&] {
        const std::string colourName = "aColor";
        const float colour[] = {1, 0, 0, 1};
        device->setConstant(colourName.c_str(), colour, 4);
        GLfloat current[4] = {};
        glGetFloatv(GL_CURRENT_COLOR, current);
        EXPECT_EQ(current[1], 0.0f);

        device->setConstant(UniformConstants::UNIFORM_COLOR, colour, 3);
        expectAssertion("count == 4");
        device->setConstant("aUnknown", 1.0f);
        expectAssertion("unknown constant");
        device->setConstant(UniformConstants::UNIFORM_AMBIENT, colour, 4);
        expectAssertion("no program for constant");
        device->setTexture(1, boost::shared_ptr<Texture2D>());
        expectAssertion("unit == 0");
        // Nothing valid to draw from: refused instead of reading near address 0.
        VertexDeclaration unknown;
        unknown.elements.push_back({"vNormal", TYPE_FLOAT3, 0});
        std::vector<Vertex> points = vertices({{0, 0}});
        device->setVertexBufferUP(points.data(), sizeof(Vertex));
        device->setVertexDeclaration(unknown);
        device->drawPrimitives(PRIMITIVE_POINTS, 0, 1);
        expectAssertion("unknown vertex usage");
        device->setVertexBuffer(boost::shared_ptr<VertexBuffer>());
        device->drawPrimitives(PRIMITIVE_POINTS, 0, 1);
        expectAssertion("declaration != nullptr && hasSource");
    });
    EXPECT_STREQ(GraphicsDevice::getDeviceString(DEVICE_GLES2), "gles2");
    EXPECT_STREQ(GraphicsDevice::getDeviceString(static_cast<DeviceImplType>(3)), "");
    expectAssertion("false");
}

TEST_F(GraphicsDeviceTest, AGlErrorAfterADrawIsLoggedAndAsserted) {
    frame([&] {
        std::vector<Vertex> points = vertices({{0, 0}});
        device->setVertexBufferUP(points.data(), sizeof(Vertex));
        device->setVertexDeclaration(colourDeclaration);
        device->drawPrimitives(PRIMITIVE_POINTS, 0, -1);
        expectAssertion("!failed");
    });
    EXPECT_TRUE(hasLogLine("glGetError(): 501"));
}

// Records what the device asks of it.
class RecordingProgram : public GLES1::ProgramImpl {
public:
    void apply() override { ++applied; }
    void setConstant(const char* name, const float* values, unsigned count) override {
        received = std::string(name) + "=" + std::to_string(values[0]) + "/" + std::to_string(count);
    }
    int applied = 0;
    std::string received;
};

boost::shared_ptr<GLES1::ProgramImpl> makeRecordingProgram() {
    return boost::make_shared<RecordingProgram>();
}

TEST_F(GraphicsDeviceTest, ProgramsAreDeclaredByNameAppliedAndGivenUnknownConstants) {
    GLES1::GraphicsDeviceImpl::resetPrograms();
    for (int i = 0; i < GLES1::GraphicsDeviceImpl::kMaxPrograms; ++i) {
        GLES1::GraphicsDeviceImpl::declareProgram(("p" + std::to_string(i)).c_str(), &makeRecordingProgram);
    }
    EXPECT_TRUE(assertions().empty());
    GLES1::GraphicsDeviceImpl::declareProgram("one too many", &makeRecordingProgram);
    expectAssertion("too many programs");
    GLES1::GraphicsDeviceImpl::declareProgram("p3", &makeRecordingProgram);
    expectAssertion("program declared twice");
    frame([&] {
        boost::shared_ptr<Program> program = device->createProgram("p3", "ignored");
        ASSERT_TRUE(program);
        device->setProgram(program);
        const float ambient[] = {0.25f, 0, 0, 1};
        device->setConstant(UniformConstants::UNIFORM_AMBIENT, ambient, 4);
        RecordingProgram* recording = static_cast<RecordingProgram*>(program.get());
        EXPECT_EQ(recording->applied, 1);
        EXPECT_EQ(recording->received, "aAmbient=0.250000/4");
        EXPECT_FALSE(device->createProgram("unlit", ""));
        expectAssertion("unknown program");
    });
    GLES1::GraphicsDeviceImpl::resetPrograms();
}

}  // namespace
