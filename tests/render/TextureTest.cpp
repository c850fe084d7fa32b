// Textures through the resource manager onto the real GLES 1.1 context.
#include <boost/make_shared.hpp>
#include <boost/scoped_ptr.hpp>
#include <fstream>
#include <iterator>

#include "GlesTest.h"
#include "io/FileManager.h"
#include "io/FileOutputStream.h"
#include "io/resource/PackageBuilder.h"
#include "render/ResourceManager.h"
#include "render/Texture.h"
#include "render/TextureResource.h"
#include "render/api/Texture2D.h"
#include "render/api/VertexDeclaration.h"
#include "render/api/gles1/Texture2DImpl.h"

namespace {

using namespace Render;
typedef std::vector<unsigned char> Bytes;

Bytes readData(const std::string& name) {
    std::ifstream in(std::string(MAPCORE_IMAGE_DATA) + "/" + name, std::ios::binary);
    return Bytes(std::istreambuf_iterator<char>(in), std::istreambuf_iterator<char>());
}

// Different in every byte position, so a misplaced row or channel shows.
Bytes pattern(unsigned width, unsigned height, unsigned channels) {
    Bytes bytes(static_cast<size_t>(width) * height * channels);
    for (size_t i = 0; i < bytes.size(); ++i) {
        bytes[i] = static_cast<unsigned char>(i * 7 + i / 251);
    }
    return bytes;
}

boost::shared_ptr<Texture> rawTexture(const Bytes& pixels, unsigned width, unsigned height, unsigned bits) {
    return boost::make_shared<Texture>(
        Texture::Accessor::createRawBytesAccessor(false, pixels, width, height, bits), 0, 0, 0);
}

class TextureTest : public GlesTest {
protected:
    void SetUp() override {
        GlesTest::SetUp();
        manager.reset(new ResourceManager());
        manager->setDevice(device.get());
    }

    void TearDown() override {
        frame([this] { manager.reset(); });
        GlesTest::TearDown();
    }

    TextureResource* cache(const Texture& texture) {
        return static_cast<TextureResource*>(texture.getResource(manager.get()).get());
    }

    static GLuint nameOf(const TextureResource& resource) {
        return static_cast<API::GLES1::Texture2DImpl*>(resource.getTexture2D().get())->getName();
    }

    // Draws the texture's image pixel for pixel at the origin and reads it
    // back as RGBA rows, bottom first (image row 0 goes to row 0).
    std::vector<std::uint8_t> drawImage(const TextureResource& resource, unsigned width, unsigned height) {
        Matrix ortho;
        ortho.setOrtho(0, kFrame, 0, kFrame, -1, 1);
        device->setConstant(API::UniformConstants::UNIFORM_MATRIX_WVP, ortho.m, 16);
        device->setViewport({0, 0, kFrame, kFrame});
        device->clearTarget(Math::Color(0, 0, 0, 255));
        const float s = static_cast<float>(width) / resource.getTextureWidth();
        const float t = static_cast<float>(height) / resource.getTextureHeight();
        const float w = static_cast<float>(width);
        const float h = static_cast<float>(height);
        const float quad[] = {0, 0, 0, 0, w, 0, s, 0, w, h, s, t, 0, h, 0, t};
        API::VertexDeclaration declaration;
        declaration.stride = 4 * sizeof(float);
        declaration.elements.push_back({API::VertexDeclaration::USAGE_POSITION, API::TYPE_FLOAT2, 0});
        declaration.elements.push_back({API::VertexDeclaration::USAGE_TEXCOORD, API::TYPE_FLOAT2, 8});
        const float white[] = {1, 1, 1, 1};
        device->setConstant(API::UniformConstants::UNIFORM_COLOR, white, 4);
        device->setTexture(0, resource.getTexture2D());
        device->setVertexBufferUP(quad, sizeof(quad));
        device->setVertexDeclaration(declaration);
        device->drawPrimitives(API::PRIMITIVE_TRIANGLE_FAN, 0, 4);
        device->setTexture(0, boost::shared_ptr<API::Texture2D>());
        return pixels(0, 0, width, height);
    }

    static const int kFrame = 128;
    boost::scoped_ptr<ResourceManager> manager;
};

TEST_F(TextureTest, AnImageIsUploadedAtTheOriginOfAPowerOfTwoTextureAndThenReleased) {
    pal::setContextSize(kFrame, kFrame);
    struct Case {
        unsigned width, height, bits;
        unsigned textureWidth, textureHeight;
        API::TextureFormat format;
    } cases[] = {{100, 60, 32, 128, 64, API::FORMAT_RGBA},
                 {64, 64, 24, 64, 64, API::FORMAT_RGB},
                 {5, 1, 24, 8, 1, API::FORMAT_RGB},
                 {3, 17, 8, 4, 32, API::FORMAT_ALPHA}};
    for (const Case& c : cases) {
        const Bytes image = pattern(c.width, c.height, c.bits / 8);
        boost::shared_ptr<Texture> texture = rawTexture(image, c.width, c.height, c.bits);
        EXPECT_EQ(texture->getWidth(), c.width);
        EXPECT_EQ(texture->getHeight(), c.height);
        EXPECT_TRUE(texture->isImageHeld());
        frame([&] {
            TextureResource* resource = cache(*texture);
            ASSERT_NE(resource, nullptr);
            EXPECT_EQ(resource->getTextureWidth(), c.textureWidth);
            EXPECT_EQ(resource->getTextureHeight(), c.textureHeight);
            EXPECT_EQ(resource->getTexture2D()->getWidth(), c.textureWidth);
            EXPECT_EQ(resource->getTexture2D()->getFormat(), c.format);
            EXPECT_FALSE(texture->isImageHeld());
            std::vector<std::uint8_t> drawn = drawImage(*resource, c.width, c.height);
            int wrong = 0;
            for (size_t pixel = 0; pixel < static_cast<size_t>(c.width) * c.height; ++pixel) {
                for (unsigned channel = 0; channel < 4; ++channel) {
                    // Alpha textures draw white with the texel as alpha; RGB ones are opaque.
                    unsigned char expected = 255;
                    if (c.bits == 8 && channel == 3) {
                        expected = image[pixel];
                    } else if (c.bits != 8 && channel < c.bits / 8) {
                        expected = image[pixel * (c.bits / 8) + channel];
                    }
                    wrong += drawn[pixel * 4 + channel] != expected;
                }
            }
            EXPECT_EQ(wrong, 0) << c.width << "x" << c.height;
        });
        texture->shutdownResource();
    }
}

TEST_F(TextureTest, PalettedImagesKeepTheirPaletteWhenTheyFitAndAreExpandedOtherwise) {
    pal::setContextSize(kFrame, kFrame);
    const unsigned char palette[4][3] = {{255, 0, 0}, {0, 255, 0}, {0, 0, 255}, {255, 255, 0}};
    Texture square(Texture::Accessor::createBytesAccessor(false, Image::PNG, readData("palette-square.png")),
                   0, 0, 0);
    // The 7 × 5 image of the decoder tests, whose expected bytes hold palette and indices.
    const Bytes odd = readData("palette4.expected");
    Texture oddTexture(Texture::Accessor::createBytesAccessor(false, Image::PNG, readData("palette4.png")), 0,
                       0, 0);
    frame([&] {
        TextureResource* resource = cache(square);
        ASSERT_NE(resource, nullptr);
        EXPECT_EQ(resource->getTexture2D()->getFormat(), API::FORMAT_PALETTE8_RGB8);
        std::vector<std::uint8_t> drawn = drawImage(*resource, 8, 4);
        for (unsigned y = 0; y < 4; ++y) {
            for (unsigned x = 0; x < 8; ++x) {
                const unsigned char* entry = palette[(x / 2 + y) % 4];
                const std::uint8_t* got = &drawn[(y * 8 + x) * 4];
                EXPECT_TRUE(got[0] == entry[0] && got[1] == entry[1] && got[2] == entry[2]) << x << "," << y;
            }
        }

        resource = cache(oddTexture);
        ASSERT_NE(resource, nullptr);
        EXPECT_EQ(resource->getTexture2D()->getFormat(), API::FORMAT_RGB);
        drawn = drawImage(*resource, 7, 5);
        int wrong = 0;
        for (size_t pixel = 0; pixel < 35; ++pixel) {
            const unsigned char* entry = &odd[3 * odd[768 + pixel]];
            wrong += drawn[pixel * 4] != entry[0] || drawn[pixel * 4 + 1] != entry[1] ||
                     drawn[pixel * 4 + 2] != entry[2];
        }
        EXPECT_EQ(wrong, 0);
    });
}

TEST_F(TextureTest, OtherDepthsAreRefusedAtUpload) {
    boost::shared_ptr<Texture> sixteenBits = rawTexture(pattern(2, 2, 2), 2, 2, 16);
    frame([&] { EXPECT_FALSE(cache(*sixteenBits)->getTexture2D()); });
    expectAssertion("unsupported bits per pixel");
}

TEST_F(TextureTest, AccessorsReportWhatTheyCannotRead) {
    Texture missing(Texture::Accessor::createRawFileAccessor(false, Image::PNG, "/data/none.png"), 0, 0, 0);
    EXPECT_TRUE(hasLogLine("Image /data/none.png could not be read"));
    EXPECT_EQ(missing.getWidth(), 0u);
    Texture garbage(Texture::Accessor::createBytesAccessor(false, Image::JPEG, Bytes(100, 0x42)), 0, 0, 0);
    EXPECT_EQ(countLogLines("Image from bytes could not be read"), 1);
    Texture tooShort(Texture::Accessor::createRawBytesAccessor(false, Bytes(3), 2, 2, 8), 0, 0, 0);
    EXPECT_EQ(countLogLines("Image from bytes could not be read"), 2);
    // Each failure is asserted by the accessor and by the texture.
    for (int i = 0; i < 6; ++i) {
        expectAssertion("image");
    }
}

TEST_F(TextureTest, ASingleAccessImageCannotBeCachedASecondTime) {
    boost::shared_ptr<Image> image = Image::createImage(pattern(2, 2, 4), 2, 2, 32);
    Texture texture(Texture::Accessor::createSingleAccessImageAccessor(false, image), 1, 1, 1);
    frame([&] {
        ASSERT_NE(cache(texture), nullptr);
        manager->invalidate();
        TextureResource* again = cache(texture);
        EXPECT_FALSE(again->getTexture2D());
    });
    EXPECT_TRUE(hasLogLine("Image already been accessed"));
    expectAssertion("image");
    expectAssertion("image");
}

TEST_F(TextureTest, ResourceImagesAreInvertedWhenAsked) {
    pal::setDeviceString(KD_STRING_PACKAGE_NAME_ZVR, "app");
    {
        boost::shared_ptr<IO::FileOutputStream> out = boost::make_shared<IO::FileOutputStream>();
        ASSERT_TRUE(out->init("/res/app.pak"));
        IO::Resource::PackageBuilder builder(out, 100);
        const Bytes png = readData("rgba8.png");
        builder.addResource("pics/rgba8.png", png.data(), png.size(), true);
    }
    IO::FileManager::initResourceFileSystem();
    Texture plain(Texture::Accessor::createResourceFileAccessor(false, Image::PNG, "pics/rgba8.png"), 0, 0,
                  0);
    Texture inverted(Texture::Accessor::createResourceFileAccessor(true, Image::PNG, "pics/rgba8.png"), 0, 0,
                     0);
    IO::FileManager::shutdownResourceFileSystem();
    ASSERT_EQ(plain.getWidth(), 7u);
    boost::shared_ptr<Image> expected = plain.getImage()->clone();
    expected->inverse();
    const Bytes want(expected->getData(), expected->getData() + expected->getSize());
    const Bytes got(inverted.getImage()->getData(), inverted.getImage()->getData() + expected->getSize());
    EXPECT_EQ(got, want);
    EXPECT_NE(want, readData("rgba8.expected"));
}

TEST_F(TextureTest, DeviceTexturesAreFreedByRemovalAndByTheManagerGoingAway) {
    boost::shared_ptr<Texture> removed = rawTexture(pattern(4, 4, 3), 4, 4, 24);
    boost::shared_ptr<Texture> kept = rawTexture(pattern(4, 4, 3), 4, 4, 24);
    boost::shared_ptr<Texture> pending = rawTexture(pattern(4, 4, 3), 4, 4, 24);
    GLuint removedName = 0;
    GLuint keptName = 0;
    GLuint pendingName = 0;
    frame([&] {
        removedName = nameOf(*cache(*removed));
        keptName = nameOf(*cache(*kept));
        pendingName = nameOf(*cache(*pending));
        EXPECT_TRUE(glIsTexture(removedName) && glIsTexture(keptName) && glIsTexture(pendingName));
        removed->shutdownResource();
        manager->process();
        EXPECT_FALSE(glIsTexture(removedName));
        // Removed but not yet processed when the manager goes, like a kept one.
        pending->shutdownResource();
        manager.reset();
        EXPECT_FALSE(glIsTexture(keptName));
        EXPECT_FALSE(glIsTexture(pendingName));
    });
}

}  // namespace
