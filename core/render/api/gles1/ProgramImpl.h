#pragma once

#include "render/api/Program.h"

namespace Render {
namespace API {
namespace GLES1 {

// Base of the programs an application declares for the fixed-function
// device (GraphicsDeviceImpl::declareProgram): apply() sets the GL state the
// program stands for. Such programs own no GL object, so release() does
// nothing unless a program says otherwise. Drawing thread only.
class ProgramImpl : public Program {
public:
    void release() override {}
};

}  // namespace GLES1
}  // namespace API
}  // namespace Render
