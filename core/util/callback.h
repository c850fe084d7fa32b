#pragma once

#include <utility>

// A delegate of two words: an untyped receiver and a static trampoline that
// knows its real type. It owns nothing, so whoever keeps a callback must drop
// it before the receiver goes away. Any thread; a copy may travel between
// threads.
template <typename Signature>
class callback;

template <typename R, typename... Args>
class callback<R (*)(Args...)> {
public:
    typedef R (*trampoline_type)(void* object, Args... args);

    callback() : object(nullptr), trampoline(&fake_func) {}
    callback(void* object, trampoline_type trampoline) : object(object), trampoline(trampoline) {}

    // Binds a member function: callback<void (*)(int)>::make<Foo, &Foo::bar>(foo).
    template <class C, R (C::*method)(Args...)>
    static callback make(C* object) {
        return callback(object, &method_converter<C, method>);
    }

    // Binds a free or static function: callback<void (*)(int)>::make<&onValue>().
    template <R (*function)(Args...)>
    static callback make() {
        return callback(nullptr, &func_converter<function>);
    }

    R operator()(Args... args) const { return trampoline(object, std::forward<Args>(args)...); }

    bool operator==(const callback& other) const {
        return object == other.object && trampoline == other.trampoline;
    }
    bool operator!=(const callback& other) const { return !(*this == other); }

    template <class C, R (C::*method)(Args...)>
    static R method_converter(void* object, Args... args) {
        return (static_cast<C*>(object)->*method)(std::forward<Args>(args)...);
    }

    template <R (*function)(Args...)>
    static R func_converter(void*, Args... args) {
        return function(std::forward<Args>(args)...);
    }

    static R fake_func(void*, Args...) { return R(); }

private:
    void* object;
    trampoline_type trampoline;
};
