#pragma once

namespace Util {

// What the singleton store deletes at shutdown. Main thread only.
class SingletonBase {
public:
    virtual ~SingletonBase() {}
};

}  // namespace Util
