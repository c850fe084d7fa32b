#include <gtest/gtest.h>

#include <cmath>
#include <cstring>
#include <random>

#include "math/Matrix.h"
#include "support/PalTest.h"

namespace {

typedef Vertex<3, float> V3;
typedef Vertex<4, float> V4;

bool bitIdentical(const Matrix& a, const Matrix& b) {
    return std::memcmp(a.m, b.m, sizeof(a.m)) == 0;
}

void expectNear(const Matrix& expected, const Matrix& actual, float tolerance) {
    for (int i = 0; i < 16; ++i) {
        EXPECT_NEAR(expected.m[i], actual.m[i], tolerance) << "element " << i;
    }
}

void expectNear(const V3& expected, const V3& actual, float tolerance) {
    EXPECT_NEAR(expected.x, actual.x, tolerance);
    EXPECT_NEAR(expected.y, actual.y, tolerance);
    EXPECT_NEAR(expected.z, actual.z, tolerance);
}

// The point in normalised device coordinates, after the division by w.
V3 project(const Matrix& m, const V3& p) {
    const V4 clip = m.transformVertex(V4(p.x, p.y, p.z, 1));
    return V3(clip.x / clip.w, clip.y / clip.w, clip.z / clip.w);
}

const Matrix kSample(1, 2, 3, 4, 5, 6, 7, 8, 9, 10, 11, 12, 13, 14, 15, 16);

}  // namespace

TEST(MatrixTest, ProductIsRowMajorWithRowVectorsOnTheLeft) {
    const Matrix b(2, 0, 1, 0, 0, 1, 0, 3, 1, 0, 0, 0, 0, 2, 0, 1);
    const Matrix product = kSample * b;
    // (A B)(1, 3) = 5*0 + 6*3 + 7*0 + 8*1.
    EXPECT_EQ(26.0f, product.m[7]);
    // (A B)(3, 0) = 13*2 + 14*0 + 15*1 + 16*0.
    EXPECT_EQ(41.0f, product.m[12]);
    Matrix accumulated = kSample;
    accumulated *= b;
    EXPECT_TRUE(bitIdentical(product, accumulated));
    EXPECT_TRUE(bitIdentical(kSample, Matrix::IDENTITY * kSample));

    // v (A B) is v A, then B.
    const V4 v(1, -2, 3, 1);
    const V4 once = b.transformVertex(kSample.transformVertex(v));
    const V4 combined = product.transformVertex(v);
    EXPECT_EQ(once.x, combined.x);
    EXPECT_EQ(once.w, combined.w);
}

TEST(MatrixTest, ScaleAndTranslateApplyInCallOrderWithExactShortcuts) {
    Matrix m = Matrix::IDENTITY;
    m.translate(V3(1, 2, 3));
    m.scale(V3(2, 3, 4));
    expectNear(V3(4, 9, 16), m.transformVertex(V3(1, 1, 1)), 0.0f);
    Matrix n = Matrix::IDENTITY;
    n.scale(V3(2, 3, 4));
    n.translate(Vertex<2, float>(1, 2));
    expectNear(V3(3, 5, 4), n.transformVertex(V3(1, 1, 1)), 0.0f);

    // On the identity the shortcut gives what the full product gives.
    Matrix translated = Matrix::IDENTITY;
    translated.translate(V3(1.5f, -2, 3));
    EXPECT_TRUE(bitIdentical(Matrix::IDENTITY * Matrix(1, 0, 0, 0, 0, 1, 0, 0, 0, 0, 1, 0, 1.5f, -2, 3, 1),
                             translated));
    // Neutral operands leave even a negative zero untouched.
    Matrix neutral = kSample;
    neutral.m[3] = -0.0f;
    const Matrix before = neutral;
    neutral.scale(V3(1, 1, 1));
    neutral.translate(V3(0, 0, 0));
    EXPECT_TRUE(bitIdentical(before, neutral));
}

TEST(MatrixTest, DeterminantAndCofactorsFollowTheExpansion) {
    EXPECT_EQ(120.0f, Matrix(2, 0, 0, 0, 0, 3, 0, 0, 0, 0, 4, 0, 0, 0, 0, 5).determinant());
    // One swap of rows flips the sign.
    EXPECT_EQ(-1.0f, Matrix(0, 1, 0, 0, 1, 0, 0, 0, 0, 0, 1, 0, 0, 0, 0, 1).determinant());
    const Matrix triangular(2, 0, 0, 0, 7, 3, 0, 0, -1, 5, 4, 0, 9, 8, 6, 0.5f);
    EXPECT_FLOAT_EQ(12.0f, triangular.determinant());
    EXPECT_FLOAT_EQ(0.0f, kSample.determinant());
    // Rows 0, 2, 3 and columns 0, 1, 3 leave [[2, 0, 0], [-1, 5, 0], [9, 8, 0.5]]
    // with determinant 5; (1, 2) is an odd place.
    EXPECT_FLOAT_EQ(-5.0f, triangular.coFactor(1, 2));
}

TEST(MatrixTest, InverseTimesMatrixIsTheIdentityAndSingularGivesNonFinite) {
    std::mt19937 random(7);
    std::uniform_real_distribution<float> entry(-1.0f, 1.0f);
    for (int i = 0; i < 50; ++i) {
        // A dominant diagonal keeps the random matrix well conditioned.
        Matrix m;
        for (int k = 0; k < 16; ++k) {
            m.m[k] = entry(random) + (k % 5 == 0 ? 4.0f : 0.0f);
        }
        const Matrix inverse = m.getInverse();
        expectNear(Matrix::IDENTITY, inverse * m, 1e-5f);
        expectNear(Matrix::IDENTITY, m * inverse, 1e-5f);
    }
    EXPECT_FALSE(std::isfinite(kSample.getInverse().m[0]));
    EXPECT_TRUE(std::isnan(Matrix().getInverse().m[0]));
}

TEST(MatrixTest, ProjectionsMapTheirVolumeOntoTheUnitCube) {
    Matrix ortho;
    ortho.setOrtho(-2, 6, 1, 5, 1, 11);
    expectNear(V3(-1, -1, -1), project(ortho, V3(-2, 1, -1)), 1e-6f);
    expectNear(V3(1, 1, 1), project(ortho, V3(6, 5, -11)), 1e-6f);

    // With a 90 degree field of view the top of the near plane is at y = near.
    Matrix persp;
    const float zNear = 1, zFar = 100, aspect = 1.5f;
    persp.setPersp(90, zNear, zFar, aspect);
    expectNear(V3(1, 1, -1), project(persp, V3(zNear * aspect, zNear, -zNear)), 1e-6f);
    expectNear(V3(-1, -1, 1), project(persp, V3(-zFar * aspect, -zFar, -zFar)), 1e-5f);
    EXPECT_EQ(-1.0f, persp.m[11]);
    EXPECT_EQ(0.0f, persp.m[15]);
}

TEST(MatrixTest, LookAtPutsTheTargetOnTheViewAxis) {
    const V3 eye(3, 4, 5), target(3, 4, 0), up(0, 1, 0);
    Matrix rh;
    rh.setLookAtRH(eye, target, up);
    expectNear(V3(0, 0, 0), rh.transformVertex(eye), 1e-6f);
    expectNear(V3(0, 0, -5), rh.transformVertex(target), 1e-6f);
    expectNear(V3(1, 1, -5), rh.transformVertex(V3(4, 5, 0)), 1e-6f);

    Matrix lh;
    lh.setLookAtLH(eye, target, up);
    expectNear(V3(0, 0, 5), lh.transformVertex(target), 1e-6f);
    expectNear(V3(0, 1, 5), lh.transformVertex(V3(3, 5, 0)), 1e-6f);
}

class MatrixAssertionTest : public PalTest {};

TEST_F(MatrixAssertionTest, PerspectiveRefusesTheMinusOneFieldOfView) {
    Matrix m;
    m.setPersp(-1.0f, 1, 10, 1);
    expectAssertion("x != -1.f");
}
