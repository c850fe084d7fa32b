// The graphics context of the desktop platform layer: real OpenGL ES 1.1
// rendering into the simulated main context, read back pixel by pixel.
#include <GLES/gl.h>

#include <cstdint>
#include <vector>

#include "support/PalTest.h"

namespace {

struct Colour {
    std::uint8_t r, g, b, a;
};

// What the handlers draw and how often each view's handler ran.
Colour gClearColour{0, 0, 0, 255};
int gCallsA = 0;
int gCallsB = 0;
KDViewProxyZVR gViewA;
KDViewProxyZVR gViewB;

void drawA(KDViewProxyZVR* view) {
    EXPECT_EQ(view, &gViewA);
    ++gCallsA;
    glClearColor(gClearColour.r / 255.0f, gClearColour.g / 255.0f, gClearColour.b / 255.0f,
                 gClearColour.a / 255.0f);
    glClear(GL_COLOR_BUFFER_BIT | GL_DEPTH_BUFFER_BIT);
}

void drawB(KDViewProxyZVR*) {
    ++gCallsB;
}

class GraphicsTest : public PalTest {
protected:
    void SetUp() override {
        PalTest::SetUp();
        gClearColour = {0, 0, 0, 255};
        gCallsA = 0;
        gCallsB = 0;
    }

    void TearDown() override {
        kdGFXSetRedrawHandler(&gViewA, nullptr);
        kdGFXSetRedrawHandler(&gViewB, nullptr);
        PalTest::TearDown();
    }

    static void redrawA() {
        kdGFXRequestRedraw(&gViewA);
        kdPumpEvents();
    }

    // Reads the frame and checks that every pixel has the colour.
    static void expectFrame(int expectedWidth, int expectedHeight, Colour colour) {
        std::vector<std::uint8_t> rgba;
        int width = 0;
        int height = 0;
        ASSERT_TRUE(pal::readFrame(rgba, width, height));
        ASSERT_EQ(width, expectedWidth);
        ASSERT_EQ(height, expectedHeight);
        ASSERT_EQ(rgba.size(), static_cast<std::size_t>(width) * height * 4);
        int wrong = 0;
        for (std::size_t i = 0; i < rgba.size(); i += 4) {
            if (rgba[i] != colour.r || rgba[i + 1] != colour.g || rgba[i + 2] != colour.b ||
                rgba[i + 3] != colour.a) {
                ++wrong;
            }
        }
        EXPECT_EQ(wrong, 0) << "first pixel " << int(rgba[0]) << "," << int(rgba[1]) << "," << int(rgba[2])
                            << "," << int(rgba[3]);
    }
};

TEST_F(GraphicsTest, QueryAnswersTheSimulatedSizeWithoutAContext) {
    KDint value = 0;
    EXPECT_NE(kdGFXQueryMainContextZVR(&gViewA, KD_GFX_WIDTH_ZVR, &value), 0);
    EXPECT_EQ(value, 480);
    EXPECT_NE(kdGFXQueryMainContextZVR(&gViewA, KD_GFX_HEIGHT_ZVR, &value), 0);
    EXPECT_EQ(value, 800);

    pal::setContextSize(320, 240);
    pal::setContextSize(0, 100);  // refused: the size stays
    EXPECT_NE(kdGFXQueryMainContextZVR(&gViewA, KD_GFX_WIDTH_ZVR, &value), 0);
    EXPECT_EQ(value, 320);
    EXPECT_EQ(kdGFXQueryMainContextZVR(&gViewA, 3, &value), 0);
    EXPECT_EQ(kdGFXQueryMainContextZVR(&gViewA, KD_GFX_WIDTH_ZVR, nullptr), 0);

    std::vector<std::uint8_t> rgba;
    int width = 0;
    int height = 0;
    EXPECT_FALSE(pal::readFrame(rgba, width, height));
}

TEST_F(GraphicsTest, RepeatedRequestsMakeOneFrameAndASizeChangeWaitsForTheNextRedraw) {
    pal::setContextSize(64, 32);
    gClearColour = {255, 128, 0, 255};
    kdGFXSetRedrawHandler(&gViewA, drawA);
    kdGFXRequestRedraw(&gViewA);
    kdGFXRequestRedraw(&gViewA);
    EXPECT_EQ(gCallsA, 0);  // served from the event loop, not from the request
    kdPumpEvents();
    kdPumpEvents();
    EXPECT_EQ(gCallsA, 1);
    EXPECT_EQ(pal::redrawCount(), 1);
    expectFrame(64, 32, gClearColour);

    pal::setContextSize(40, 24);
    expectFrame(64, 32, gClearColour);
    gClearColour = {0, 0, 255, 255};
    redrawA();
    expectFrame(40, 24, gClearColour);
    EXPECT_EQ(pal::redrawCount(), 2);
}

TEST_F(GraphicsTest, AHandlerMayRequestItsNextFrame) {
    pal::setContextSize(8, 8);
    kdGFXSetRedrawHandler(&gViewA, [](KDViewProxyZVR* view) {
        drawA(view);
        kdGFXRequestRedraw(view);
    });
    redrawA();
    EXPECT_EQ(gCallsA, 1);
    kdPumpEvents();
    EXPECT_EQ(gCallsA, 2);
}

TEST_F(GraphicsTest, EachViewGetsItsOwnHandlerAndRemovedHandlersAreNotCalled) {
    pal::setContextSize(8, 8);
    kdGFXSetRedrawHandler(&gViewA, drawA);
    kdGFXSetRedrawHandler(&gViewB, drawB);
    kdGFXRequestRedraw(&gViewB);
    redrawA();
    EXPECT_EQ(gCallsA, 1);
    EXPECT_EQ(gCallsB, 1);

    kdGFXRequestRedraw(&gViewB);
    kdGFXSetRedrawHandler(&gViewB, nullptr);
    kdPumpEvents();
    EXPECT_EQ(gCallsB, 1);
    EXPECT_EQ(pal::redrawCount(), 2);
}

TEST_F(GraphicsTest, AnImpossibleSizeSkipsTheRedrawWithOneLogLineAndAGoodSizeRecovers) {
    kdGFXSetRedrawHandler(&gViewA, drawA);
    pal::setContextSize(1 << 20, 1 << 20);
    for (int i = 0; i < 3; ++i) {
        redrawA();
    }
    EXPECT_EQ(gCallsA, 0);
    EXPECT_EQ(countLogLines("graphics unavailable"), 1);

    pal::setContextSize(4, 4);
    redrawA();
    EXPECT_EQ(gCallsA, 1);
    expectFrame(4, 4, gClearColour);
}

}  // namespace
