#pragma once

// A screen of the application, shown and hidden by BaseApp. Main thread only.
class BaseView {
public:
    virtual ~BaseView() {}
    // False when the view cannot be shown; the application then exits.
    virtual bool init() = 0;
    virtual void shutdown() = 0;
};
