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

void expectSame(const Quat& expected, const Quat& actual) {
    EXPECT_EQ(expected.x, actual.x);
    EXPECT_EQ(expected.y, actual.y);
    EXPECT_EQ(expected.z, actual.z);
    EXPECT_EQ(expected.w, actual.w);
}

Quat rotation(float ax, float ay, float az, float angle) {
    const float length = std::sqrt(ax * ax + ay * ay + az * az);
    return Quat::fromAxisAngle(V3(ax / length, ay / length, az / length), angle);
}

}  // namespace

TEST(QuatTest, RotationMatrixTurnsRowVectors) {
    // A quarter turn about z takes x to y.
    const Matrix m = rotation(0, 0, 1, kPi / 2).toMatrix();
    const V3 turned = m.transformVertex(V3(1, 0, 0));
    EXPECT_NEAR(0.0f, turned.x, 1e-6f);
    EXPECT_NEAR(1.0f, turned.y, 1e-6f);
    EXPECT_NEAR(0.0f, turned.z, 1e-6f);
    EXPECT_EQ(1.0f, m.m[15]);
    EXPECT_EQ(0.0f, m.m[12]);
}

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
    expectNear(a.toMatrix() * b.toMatrix(), (a * b).toMatrix(), 1e-6f);
    // The two orders differ: x goes to y and then to z, or stays x and then goes to y.
    const V3 v = (a * b).toMatrix().transformVertex(V3(1, 0, 0));
    EXPECT_NEAR(1.0f, v.z, 1e-6f);
    Quat accumulated = a;
    accumulated *= b;
    expectSame(a * b, accumulated);
}

TEST(QuatTest, SlerpEndsAreTheOperands) {
    const Quat a = rotation(1, 2, 3, 0.4f);
    const Quat b = rotation(-1, 0, 2, 1.7f);
    expectSame(a, a.slerp(b, 0.0f));
    expectSame(b, a.slerp(b, 1.0f));
    // The far representation of the target is swapped for the near one.
    expectSame(b, a.slerp(-b, 1.0f));
}

TEST(QuatTest, SlerpFollowsTheArcAtConstantSpeed) {
    const Quat from(0, 0, 0, 1);
    const Quat to = rotation(0, 0, 1, kPi / 2);
    const Quat expected = rotation(0, 0, 1, kPi / 8);
    const Quat q = from.slerp(to, 0.25f);
    EXPECT_NEAR(expected.z, q.z, 1e-6f);
    EXPECT_NEAR(expected.w, q.w, 1e-6f);
    EXPECT_NEAR(1.0f, q.x * q.x + q.y * q.y + q.z * q.z + q.w * q.w, 1e-6f);
}

TEST(QuatTest, SlerpBetweenNearlyEqualQuaternionsIsLinear) {
    const Quat a(0, 0, 0, 1);
    const Quat b = rotation(0, 0, 1, 0.002f);
    const Quat q = a.slerp(b, 0.3f);
    EXPECT_EQ(0.7f * a.z + 0.3f * b.z, q.z);
    EXPECT_EQ(0.7f * a.w + 0.3f * b.w, q.w);
    const Quat same = b.slerp(b, 0.5f);
    EXPECT_FALSE(std::isnan(same.w));
    EXPECT_FLOAT_EQ(b.z, same.z);
}
