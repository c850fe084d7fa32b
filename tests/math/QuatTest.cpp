#include <gtest/gtest.h>

#include <cmath>
#include <random>

#include "math/Quat.h"

namespace {

typedef Vertex<3, float> V3;
const float kPi = 3.14159265f;

void expectNear(const Matrix& expected, const Matrix& actual, float tolerance) {
    for (int i = 0; i < 16; ++i) {
        EXPECT_NEAR(expected.m[i], actual.m[i], tolerance) << "element " << i;
    }
}

bool same(const Quat& a, const Quat& b) {
    return a.x == b.x && a.y == b.y && a.z == b.z && a.w == b.w;
}

Quat rotation(float ax, float ay, float az, float angle) {
    const float length = std::sqrt(ax * ax + ay * ay + az * az);
    return Quat::fromAxisAngle(V3(ax / length, ay / length, az / length), angle);
}

}  // namespace

TEST(QuatTest, MatrixRoundTripReproducesRotationsOnEveryBranch) {
    // Half turns about each axis have a non-positive trace and pick the x, y
    // and z branches; the small angles take the trace branch.
    const Quat cases[] = {
        rotation(1, 0, 0, kPi),        rotation(0, 1, 0, kPi),        rotation(0, 0, 1, kPi),
        rotation(1, 0.1f, 0.2f, 3.0f), rotation(0.1f, 1, 0.2f, 3.0f), rotation(0.1f, 0.2f, 1, 3.0f),
        rotation(1, 2, 3, 0.3f),       rotation(-3, 1, 2, 2.0f),      Quat(0, 0, 0, 1),
    };
    for (const Quat& q : cases) {
        const Matrix m = q.toMatrix();
        expectNear(m, Quat(m).toMatrix(), 2e-6f);
    }
    std::mt19937 random(3);
    std::uniform_real_distribution<float> component(-1.0f, 1.0f);
    for (int i = 0; i < 200; ++i) {
        const Matrix m =
            rotation(component(random), component(random), component(random), 3.2f * component(random))
                .toMatrix();
        expectNear(m, Quat(m).toMatrix(), 5e-6f);
    }
}

TEST(QuatTest, ProductAppliesTheLeftOperandFirstLikeTheMatrixProduct) {
    const Quat a = rotation(0, 0, 1, kPi / 2);
    const Quat b = rotation(1, 0, 0, kPi / 2);
    // A quarter turn about z takes x to y; row vectors are turned.
    const V3 turned = a.toMatrix().transformVertex(V3(1, 0, 0));
    EXPECT_NEAR(1.0f, turned.y, 1e-6f);
    expectNear(a.toMatrix() * b.toMatrix(), (a * b).toMatrix(), 1e-6f);
    // The two orders differ: x goes to y and then to z, or stays x and then goes to y.
    const V3 v = (a * b).toMatrix().transformVertex(V3(1, 0, 0));
    EXPECT_NEAR(1.0f, v.z, 1e-6f);
    Quat accumulated = a;
    accumulated *= b;
    EXPECT_TRUE(same(a * b, accumulated));
}

TEST(QuatTest, SlerpRunsAlongTheShorterArcAtConstantSpeedAndLinearlyWhenNearlyEqual) {
    const Quat a = rotation(1, 2, 3, 0.4f);
    const Quat b = rotation(-1, 0, 2, 1.7f);
    EXPECT_TRUE(same(a, a.slerp(b, 0.0f)));
    EXPECT_TRUE(same(b, a.slerp(b, 1.0f)));
    // The far representation of the target is swapped for the near one.
    EXPECT_TRUE(same(b, a.slerp(-b, 1.0f)));

    const Quat identity(0, 0, 0, 1);
    const Quat expected = rotation(0, 0, 1, kPi / 8);
    const Quat q = identity.slerp(rotation(0, 0, 1, kPi / 2), 0.25f);
    EXPECT_NEAR(expected.z, q.z, 1e-6f);
    EXPECT_NEAR(expected.w, q.w, 1e-6f);
    EXPECT_NEAR(1.0f, q.x * q.x + q.y * q.y + q.z * q.z + q.w * q.w, 1e-6f);

    // Where sin(theta) vanishes the straight line takes over instead of NaNs.
    const Quat close = rotation(0, 0, 1, 0.002f);
    const Quat linear = identity.slerp(close, 0.3f);
    EXPECT_EQ(0.3f * close.z, linear.z);
    EXPECT_EQ(0.7f + 0.3f * close.w, linear.w);
    EXPECT_FLOAT_EQ(close.z, close.slerp(close, 0.5f).z);
}
