#pragma once

#include <KD/kd.h>

// A fixed-size vector of N components x, y, z, w (in that order); N is 2, 3 or 4.
// Value type; any thread.
template <int N, typename T>
class Vertex;

template <typename T>
class Vertex<2, T> {
public:
    Vertex() : x(), y() {}
    Vertex(T x_, T y_) : x(x_), y(y_) {}

    T x, y;
};

template <typename T>
class Vertex<3, T> {
public:
    Vertex() : x(), y(), z() {}
    Vertex(T x_, T y_, T z_) : x(x_), y(y_), z(z_) {}

    Vertex operator-(const Vertex& other) const { return Vertex(x - other.x, y - other.y, z - other.z); }
    T dot(const Vertex& other) const { return x * other.x + y * other.y + z * other.z; }
    Vertex cross(const Vertex& other) const {
        return Vertex(y * other.z - z * other.y, z * other.x - x * other.z, x * other.y - y * other.x);
    }
    // A zero vector has no direction and comes back as NaNs.
    Vertex getNormalized() const {
        const T length = kdSqrtf(dot(*this));
        return Vertex(x / length, y / length, z / length);
    }

    T x, y, z;
};

template <typename T>
class Vertex<4, T> {
public:
    Vertex() : x(), y(), z(), w() {}
    Vertex(T x_, T y_, T z_, T w_) : x(x_), y(y_), z(z_), w(w_) {}

    T x, y, z, w;
};
