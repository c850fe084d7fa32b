#pragma once

#include "math/Matrix.h"
#include "math/Vertex.h"

// A quaternion (x, y, z, w), vector part first, for rotations and their
// interpolation. Value type; any thread.
class Quat {
public:
    Quat() : x(), y(), z(), w() {}
    Quat(float x_, float y_, float z_, float w_) : x(x_), y(y_), z(z_), w(w_) {}
    Quat(const Vertex<3, float>& v, float w_) : x(v.x), y(v.y), z(v.z), w(w_) {}
    // The rotation of a pure rotation matrix (the inverse of toMatrix).
    explicit Quat(const Matrix& rotation);

    // The axis is taken as given, not normalised.
    static Quat fromAxisAngle(const Vertex<3, float>& axis, float angle);

    Vertex<3, float> getV() const { return Vertex<3, float>(x, y, z); }
    // All four components negated: the same rotation.
    Quat operator-() const { return Quat(-x, -y, -z, -w); }
    Quat getNormalized() const;
    Matrix toMatrix() const;

    // a * b is the Hamilton product b (x) a: b is applied first, then a.
    Quat operator*(const Quat& other) const;
    Quat& operator*=(const Quat& other);

    // Spherical interpolation from this (t = 0) to q (t = 1) along the shorter
    // arc, linear when the two are nearly equal. Not normalised.
    Quat slerp(const Quat& q, float t) const;

    float x, y, z, w;
};
