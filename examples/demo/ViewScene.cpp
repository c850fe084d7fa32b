// Views: a view resumed by the platform animates for a while under an
// UpdateGenerator, drawing into the real GLES context and picking up three
// optional render resources one per frame; through the graphics device it
// draws a JPEG photo and, blended over it, a PNG marker from the resource
// package; then it goes idle and its redraw timer stops, so a second of
// idleness costs no timer wake-ups.

#include <GLES/gl.h>
#include <KD/kdext.h>
#include <pal/Simulation.h>
#include <png.h>

#include <boost/make_shared.hpp>
#include <boost/scoped_ptr.hpp>
#include <cmath>
#include <cstdio>
#include <filesystem>
#include <string>
#include <vector>

#include "BaseApp.h"
#include "BaseView.h"
#include "DemoImages.h"
#include "DemoScene.h"
#include "io/FileManager.h"
#include "math/Matrix.h"
#include "redraw/UpdateGenerator.h"
#include "redraw/ViewRedrawManager.h"
#include "render/Resource.h"
#include "render/ResourceDesc.h"
#include "render/ResourceFactory.h"
#include "render/ResourceManager.h"
#include "render/Texture.h"
#include "render/TextureResource.h"
#include "render/api/GraphicsDevice.h"
#include "render/api/UniformConstants.h"
#include "render/api/VertexDeclaration.h"
#include "util/Timer.h"

namespace {

const long long kMillisecond = 1000000ll;
const long long kAnimationNs = 1500 * kMillisecond;
const long long kSettleNs = 100 * kMillisecond;
const long long kIdleNs = 1000 * kMillisecond;
const int kBandCount = 3;
const float kBandColours[kBandCount][3] = {{0.9f, 0.2f, 0.2f}, {0.2f, 0.8f, 0.3f}, {0.2f, 0.4f, 0.9f}};

// A coloured band at the bottom of the frame. Main thread.
class BandResource : public Render::Resource {
public:
    explicit BandResource(int index) : index(index), ready(false) {}

    void drawBand(int width, int height) const {
        int bandWidth = width / kBandCount;
        glEnable(GL_SCISSOR_TEST);
        glScissor(index * bandWidth, 0, bandWidth, height / 8);
        glClearColor(kBandColours[index][0], kBandColours[index][1], kBandColours[index][2], 1.0f);
        glClear(GL_COLOR_BUFFER_BIT);
        glDisable(GL_SCISSOR_TEST);
    }

    bool isReady() const { return ready; }

protected:
    // The band is drawn with plain clears; it needs nothing on the device.
    void doCache(Render::API::GraphicsDevice*) override { ready = true; }
    void doClear(Render::API::GraphicsDevice*) override { ready = false; }

private:
    int index;
    bool ready;
};

class BandFactory : public Render::ResourceFactory {
public:
    explicit BandFactory(int index) : index(index) {}
    boost::shared_ptr<Render::Resource> create(const Render::ResourceDesc*) override {
        return boost::make_shared<BandResource>(index);
    }

private:
    int index;
};

// Clears to a colour that cycles with the animation and draws the bands of
// the resources that are ready. Main thread.
class DemoView : public BaseView {
public:
    DemoView() : phaseMs(0), frames(0), animating(false) {}

    void update(int elapsedMs) override {
        BaseView::update(elapsedMs);
        phaseMs += elapsedMs;
        if (animating) {
            getRedrawManager()->scheduleRedraw();
        }
    }

    void draw() override {
        ++frames;
        if (!device) {
            // The first frame is the first time the context is current.
            device = Render::API::GraphicsDevice::create();
            getResourceManager()->setDevice(device.get());
        }
        getResourceManager()->process();
        float t = static_cast<float>(phaseMs) / 1000.0f;
        glClearColor(0.5f + 0.5f * std::sin(t * 3.0f), 0.5f + 0.5f * std::sin(t * 2.0f + 2.0f),
                     0.5f + 0.5f * std::sin(t * 1.3f + 4.0f), 1.0f);
        glClear(GL_COLOR_BUFFER_BIT);
        for (size_t i = 0; i < bands.size(); ++i) {
            if (bandReady[i]) {
                drawBand(*bands[i]);
            }
        }
        drawPictures();
    }

    void onViewEvent106() override {}
    void onViewEvent104() override {}
    void onPointerPressed(int, int) override {}
    void onPointerReleased(int, int) override {}
    void onPointerMoved(int, int) override {}
    void onGesture(const KDEventData*) override {}
    void onSizeChanged() override { demo::say("view: size %dx%d", getWidth(), getHeight()); }

    int phaseMs;
    int frames;
    bool animating;
    // Outlives the resource manager, which BaseView ends at hideView.
    boost::shared_ptr<Render::API::GraphicsDevice> device;
    std::vector<boost::shared_ptr<Render::ResourceDesc> > bands;
    boost::shared_ptr<Render::Texture> photo;
    boost::shared_ptr<Render::Texture> marker;
    // Set by the ready callbacks: a queued descriptor is drawn only once the
    // manager has announced it.
    bool bandReady[kBandCount] = {false, false, false};

private:
    // The photo opaque in the middle of the view, the marker blended over
    // its lower edge; both at their size in pixels.
    void drawPictures() {
        Matrix ortho;
        ortho.setOrtho(0, static_cast<float>(getWidth()), 0, static_cast<float>(getHeight()), -1, 1);
        device->setViewport({0, 0, getWidth(), getHeight()});
        device->setConstant(Render::API::UniformConstants::UNIFORM_MATRIX_WVP, ortho.m, 16);
        const float white[] = {1, 1, 1, 1};
        device->setConstant(Render::API::UniformConstants::UNIFORM_COLOR, white, 4);
        const float x = getWidth() / 2.0f;
        const float y = getHeight() / 2.0f;
        device->setBlendState(Render::API::BlendState::OPAQUE);
        drawPicture(photo, x - 64, y - 64, 2.0f);
        device->setBlendState(Render::API::BlendState::ALPHA_BLEND);
        drawPicture(marker, x - 50, y - 90, 1.0f);
        device->setBlendState(Render::API::BlendState::OPAQUE);
        device->setTexture(0, boost::shared_ptr<Render::API::Texture2D>());
    }

    void drawPicture(const boost::shared_ptr<Render::Texture>& texture, float x, float y, float scale) {
        if (!texture) {
            return;
        }
        boost::shared_ptr<Render::Resource> resource = texture->getResource(getResourceManager());
        const Render::TextureResource* cached = static_cast<const Render::TextureResource*>(resource.get());
        if (cached == nullptr || !cached->getTexture2D()) {
            return;
        }
        // The image fills the lower-left part of its power-of-two texture.
        const float w = texture->getWidth() * scale;
        const float h = texture->getHeight() * scale;
        const float s = static_cast<float>(texture->getWidth()) / cached->getTextureWidth();
        const float t = static_cast<float>(texture->getHeight()) / cached->getTextureHeight();
        // Image rows run top to bottom, so t grows downwards on the screen.
        const float quad[] = {x, y, 0, t, x + w, y, s, t, x + w, y + h, s, 0, x, y + h, 0, 0};
        Render::API::VertexDeclaration declaration;
        declaration.stride = 4 * sizeof(float);
        declaration.elements.push_back(
            {Render::API::VertexDeclaration::USAGE_POSITION, Render::API::TYPE_FLOAT2, 0});
        declaration.elements.push_back(
            {Render::API::VertexDeclaration::USAGE_TEXCOORD, Render::API::TYPE_FLOAT2, 8});
        device->setTexture(0, cached->getTexture2D());
        device->setVertexBufferUP(quad, sizeof(quad));
        device->setVertexDeclaration(declaration);
        device->drawPrimitives(Render::API::PRIMITIVE_TRIANGLE_FAN, 0, 4);
    }

    void drawBand(const Render::ResourceDesc& band) {
        boost::shared_ptr<Render::Resource> resource = band.getResource(getResourceManager());
        const BandResource* bandResource = static_cast<const BandResource*>(resource.get());
        if (bandResource != nullptr && bandResource->isReady()) {
            bandResource->drawBand(getWidth(), getHeight());
        }
    }
};

bool savePng(const std::string& path, const std::vector<std::uint8_t>& rgba, int width, int height) {
    FILE* file = std::fopen(path.c_str(), "wb");
    if (file == nullptr) {
        return false;
    }
    png_structp png = png_create_write_struct(PNG_LIBPNG_VER_STRING, nullptr, nullptr, nullptr);
    png_infop info = png != nullptr ? png_create_info_struct(png) : nullptr;
    bool ok = info != nullptr && setjmp(png_jmpbuf(png)) == 0;
    if (ok) {
        png_init_io(png, file);
        png_set_IHDR(png, info, width, height, 8, PNG_COLOR_TYPE_RGBA, PNG_INTERLACE_NONE,
                     PNG_COMPRESSION_TYPE_DEFAULT, PNG_FILTER_TYPE_DEFAULT);
        png_write_info(png, info);
        // The frame comes bottom row first; PNG wants the top row first.
        for (int row = height - 1; row >= 0; --row) {
            png_write_row(png, rgba.data() + static_cast<size_t>(row) * width * 4);
        }
        png_write_end(png, nullptr);
    }
    png_destroy_write_struct(&png, &info);
    std::fclose(file);
    return ok;
}

struct ReadyNote {
    DemoView* view;
    int index;
};

void onBandReady(void* userData) {
    ReadyNote* note = static_cast<ReadyNote*>(userData);
    note->view->bandReady[note->index] = true;
    demo::say("optional resource %d ready; its callback runs after frame %d", note->index + 1,
              note->view->frames);
}

// Main thread.
class ViewScene : public DemoScene {
public:
    ViewScene()
        : step(callback<void (*)()>::make<ViewScene, &ViewScene::nextStep>(this)), stage(0), firesBefore(0) {}

    ~ViewScene() override {
        step.cancel();
        if (view) {
            hide();
        }
    }

    void run(Done done) override {
        finished = done;
        view.reset(new DemoView());
        BaseApp::get()->showView(view.get());
        demo::say("view shown; simulating the platform resuming it (pal::postViewResumed)");
        pal::postViewResumed();
        view->animating = true;
        generator.reset(new Redraw::UpdateGenerator(*view->getRedrawManager()));
        queueBands();
        makePictures();
        demo::say("animating for %lld ms with an UpdateGenerator", kAnimationNs / kMillisecond);
        step.start(Util::Timer::OneShot, kAnimationNs);
    }

private:
    void queueBands() {
        for (int i = 0; i < kBandCount; ++i) {
            boost::shared_ptr<Render::ResourceDesc> band = boost::make_shared<Render::ResourceDesc>(
                boost::make_shared<BandFactory>(i), Render::ResourceDesc::OPTIONAL);
            notes[i] = {view.get(), i};
            band->setResourceManager(view->getResourceManager());
            band->loadResource();
            band->cacheResource(Render::ResourceDesc::ReadyCallback::make<&onBandReady>(), &notes[i]);
            view->bands.push_back(band);
        }
        demo::say("queued %d optional resources; the view caches one per frame", kBandCount);
    }

    // Decoded now, on this thread; uploaded when first drawn.
    void makePictures() {
        const std::string package =
            std::string("/res/") + kdGetStringZVR(KD_STRING_PACKAGE_NAME_ZVR) + ".pak";
        if (!demo::packMarkerPng(package) || !demo::writePhotoJpeg("/data/photo.jpg")) {
            demo::say("could not write the demo pictures");
            return;
        }
        IO::FileManager::initResourceFileSystem();
        view->marker = boost::make_shared<Render::Texture>(
            Render::Texture::Accessor::createResourceFileAccessor(false, Image::PNG, "marker.png"), 1, 0, 0);
        IO::FileManager::shutdownResourceFileSystem();
        view->photo = boost::make_shared<Render::Texture>(
            Render::Texture::Accessor::createRawFileAccessor(false, Image::JPEG, "/data/photo.jpg"), 1, 0, 0);
        demo::say("decoded marker.png from %s (%ux%u) and /data/photo.jpg (%ux%u); uploaded when first drawn",
                  package.c_str(), view->marker->getWidth(), view->marker->getHeight(),
                  view->photo->getWidth(), view->photo->getHeight());
    }

    void nextStep() {
        switch (stage++) {
            case 0:
                stopAnimation();
                step.start(Util::Timer::OneShot, kSettleNs);
                break;
            case 1:
                demo::say("idle: redraw timer running: %s; waiting %lld ms",
                          view->getRedrawManager()->getIsTimerStarted() ? "yes" : "no",
                          kIdleNs / kMillisecond);
                firesBefore = pal::timerFireCount();
                step.start(Util::Timer::OneShot, kIdleNs);
                break;
            default:
                reportIdle();
                hide();
                finished();
                break;
        }
    }

    void stopAnimation() {
        Redraw::ViewRedrawManager* manager = view->getRedrawManager();
        demo::say("after %d frames: fps %d, ups %d (counts of the last full second)", view->frames,
                  manager->getFPS(), manager->getUPS());
        saveFrame();
        view->animating = false;
        generator.reset();
        demo::say("UpdateGenerator released; the view has nothing left to do");
    }

    void saveFrame() {
        std::vector<std::uint8_t> rgba;
        int width = 0;
        int height = 0;
        if (!pal::readFrame(rgba, width, height)) {
            demo::say("no frame to save (no GLES context)");
            return;
        }
        std::string path = (std::filesystem::path(demo::outputFolder()) / "view.png").string();
        if (savePng(path, rgba, width, height)) {
            demo::say("saved the last frame (%dx%d) to %s", width, height, path.c_str());
            demo::noteFile(path,
                           "the view's last frame, " + std::to_string(width) + "x" + std::to_string(height));
        } else {
            demo::say("could not write %s", path.c_str());
        }
    }

    void reportIdle() {
        // The one-shot that ended the wait is the only timer event expected.
        unsigned long long wakeUps = pal::timerFireCount() - firesBefore - 1;
        demo::say("timer wake-ups during %lld ms of idleness (besides the demo's own one-shot): %llu",
                  kIdleNs / kMillisecond, wakeUps);
        demo::say("frames drawn in total: %d", view->frames);
    }

    void hide() {
        for (const boost::shared_ptr<Render::ResourceDesc>& band : view->bands) {
            band->shutdownResource();
        }
        view->bands.clear();
        // Their device textures are freed with the view's resource manager.
        view->photo.reset();
        view->marker.reset();
        BaseApp::get()->hideView(view.get());
        view.reset();
    }

    Util::Timer step;
    int stage;
    std::uint64_t firesBefore;
    boost::scoped_ptr<DemoView> view;
    boost::scoped_ptr<Redraw::UpdateGenerator> generator;
    ReadyNote notes[kBandCount];
    Done finished;
};

DemoSceneRegistration<ViewScene> registration("Views", 20);

}  // namespace
