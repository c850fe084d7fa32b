#include "math/Quat.h"

Quat::Quat(const Matrix& rotation) {
    const float* m = rotation.m;
    const float trace = m[0] + m[5] + m[10];
    if (trace > 0.0f) {
        const float s = kdSqrtf(trace + 1.0f);
        const float f = 0.5f / s;
        w = s / 2.0f;
        x = (m[6] - m[9]) * f;
        y = (m[8] - m[2]) * f;
        z = (m[1] - m[4]) * f;
        return;
    }
    // Built from the largest diagonal element, the one that keeps s well away
    // from zero.
    int i = 0;
    if (m[5] > m[0]) {
        i = 1;
    }
    if (m[10] > m[5 * i]) {
        i = 2;
    }
    const int j = (i + 1) % 3;
    const int k = (i + 2) % 3;
    const float s = kdSqrtf(m[5 * i] - m[5 * j] - m[5 * k] + 1.0f);
    const float f = s == 0.0f ? 0.0f : 0.5f / s;
    float q[3];
    q[i] = s / 2.0f;
    q[j] = (m[4 * i + j] + m[4 * j + i]) * f;
    q[k] = (m[4 * i + k] + m[4 * k + i]) * f;
    x = q[0];
    y = q[1];
    z = q[2];
    w = (m[4 * j + k] - m[4 * k + j]) * f;
}

Quat Quat::fromAxisAngle(const Vertex<3, float>& axis, float angle) {
    const float s = kdSinf(angle / 2.0f);
    return Quat(axis.x * s, axis.y * s, axis.z * s, kdCosf(angle / 2.0f));
}

Quat Quat::getNormalized() const {
    const float length = kdSqrtf(x * x + y * y + z * z + w * w);
    return Quat(x / length, y / length, z / length, w / length);
}

Matrix Quat::toMatrix() const {
    return Matrix(1 - 2 * (y * y + z * z), 2 * (x * y + w * z), 2 * (x * z - w * y), 0,  //
                  2 * (x * y - w * z), 1 - 2 * (x * x + z * z), 2 * (y * z + w * x), 0,  //
                  2 * (x * z + w * y), 2 * (y * z - w * x), 1 - 2 * (x * x + y * y), 0,  //
                  0, 0, 0, 1);
}

Quat Quat::operator*(const Quat& other) const {
    // other (x) this: vector part = w_o v + w v_o + v_o x v.
    const Quat& o = other;
    return Quat(o.w * x + w * o.x + (o.y * z - o.z * y),  //
                o.w * y + w * o.y + (o.z * x - o.x * z),  //
                o.w * z + w * o.z + (o.x * y - o.y * x),  //
                o.w * w - (o.x * x + o.y * y + o.z * z));
}

Quat& Quat::operator*=(const Quat& other) {
    *this = *this * other;
    return *this;
}

Quat Quat::slerp(const Quat& q, float t) const {
    Quat target = q;
    float c = x * q.x + y * q.y + z * q.z + w * q.w;
    if (c < 0.0f) {
        target = -q;
        c = -c;
    }
    float from = 1.0f - t;
    float to = t;
    // Close quaternions make sin(theta) vanish; the straight line is as good there.
    if (1.0f - c > 1e-5f) {
        const float theta = kdAcosf(c);
        const float sinTheta = kdSinf(theta);
        from = kdSinf((1.0f - t) * theta) / sinTheta;
        to = kdSinf(t * theta) / sinTheta;
    }
    return Quat(from * x + to * target.x, from * y + to * target.y, from * z + to * target.z,
                from * w + to * target.w);
}
