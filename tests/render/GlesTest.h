#pragma once

#include <GLES/gl.h>
#include <KD/kdext.h>
#include <pal/Simulation.h>

#include <boost/shared_ptr.hpp>
#include <cstdint>
#include <functional>
#include <ostream>
#include <vector>

#include "math/Color.h"
#include "math/Matrix.h"
#include "render/api/GraphicsDevice.h"
#include "render/api/UniformConstants.h"
#include "support/PalTest.h"

// PalTest with the real GLES 1.1 context of the platform layer: frame() runs
// a body inside a redraw, where the context is current, with a device made in
// the first frame. Every frame ends by checking that GL reports no error.
class GlesTest : public PalTest {
protected:
    static const int kSize = 64;

    void SetUp() override {
        PalTest::SetUp();
        pal::setContextSize(kSize, kSize);
        frame([this] { device = Render::API::GraphicsDevice::create(); });
        clearLog();
    }

    void TearDown() override {
        frame([this] { device.reset(); });
        kdGFXSetRedrawHandler(&view, nullptr);
        PalTest::TearDown();
    }

    void frame(const std::function<void()>& body) {
        current = &body;
        bool ran = false;
        ranFlag = &ran;
        kdGFXSetRedrawHandler(&view, &GlesTest::draw);
        kdGFXRequestRedraw(&view);
        kdPumpEvents();
        current = nullptr;
        ASSERT_TRUE(ran) << "no GLES context";
    }

    // A pixel-for-pixel projection of the 64 × 64 target, depth -1..1.
    void useOrtho() {
        Matrix ortho;
        ortho.setOrtho(0, kSize, 0, kSize, -1, 1);
        device->setConstant(Render::API::UniformConstants::UNIFORM_MATRIX_WVP, ortho.m, 16);
        device->setViewport({0, 0, kSize, kSize});
    }

    static Math::Color pixel(int x, int y) {
        std::uint8_t rgba[4] = {};
        glPixelStorei(GL_PACK_ALIGNMENT, 1);
        glReadPixels(x, y, 1, 1, GL_RGBA, GL_UNSIGNED_BYTE, rgba);
        return Math::Color(rgba[0], rgba[1], rgba[2], rgba[3]);
    }

    static std::vector<std::uint8_t> pixels(int x, int y, int width, int height) {
        std::vector<std::uint8_t> rgba(static_cast<size_t>(width) * height * 4);
        glPixelStorei(GL_PACK_ALIGNMENT, 1);
        glReadPixels(x, y, width, height, GL_RGBA, GL_UNSIGNED_BYTE, rgba.data());
        return rgba;
    }

    boost::shared_ptr<Render::API::GraphicsDevice> device;

private:
    static void draw(KDViewProxyZVR*) {
        (*current)();
        *ranFlag = true;
        EXPECT_EQ(glGetError(), static_cast<GLenum>(GL_NO_ERROR));
    }

    static inline const std::function<void()>* current = nullptr;
    static inline bool* ranFlag = nullptr;
    KDViewProxyZVR view;
};

namespace Math {

inline bool operator==(const Math::Color& a, const Math::Color& b) {
    return a.r == b.r && a.g == b.g && a.b == b.b && a.a == b.a;
}

inline std::ostream& operator<<(std::ostream& out, const Math::Color& c) {
    return out << "(" << int(c.r) << "," << int(c.g) << "," << int(c.b) << "," << int(c.a) << ")";
}

}  // namespace Math
