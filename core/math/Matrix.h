#pragma once

#include "math/Vertex.h"

// A 4x4 float matrix stored row by row: element (r, c) at m[4r + c]. Vectors
// are rows multiplied on the left (v' = v M), so a translation lives in
// m[12..14]; the layout is the one glLoadMatrixf takes. Value type; any thread.
class Matrix {
public:
    static const Matrix IDENTITY;

    // All zeros, not the identity.
    constexpr Matrix() : m{} {}
    // The elements in storage order.
    constexpr Matrix(float m0, float m1, float m2, float m3, float m4, float m5, float m6, float m7, float m8,
                     float m9, float m10, float m11, float m12, float m13, float m14, float m15)
        : m{m0, m1, m2, m3, m4, m5, m6, m7, m8, m9, m10, m11, m12, m13, m14, m15} {}

    Matrix operator*(const Matrix& other) const;
    Matrix& operator*=(const Matrix& other);
    Matrix operator+(const Matrix& other) const;
    Matrix operator-(const Matrix& other) const;
    Matrix operator-() const;

    Matrix getTranspose() const;
    // The upper-left 3x3 block (rotation and scale) with the translation and
    // projection parts dropped: row and column 3 are those of the identity.
    Matrix get3x3() const;
    Vertex<4, float> getRow(int row) const;
    Vertex<4, float> getCol(int col) const;

    float determinant() const;
    // The signed 3x3 minor of element (row, col).
    float coFactor(int row, int col) const;
    // Not checked for singularity: a zero determinant gives infinities and NaNs.
    Matrix getInverse() const;

    // Exact bitwise equality with IDENTITY.
    bool isIdentity() const;
    void doIdentity();

    // The point (x, y, z, 1) times this matrix, without the division by w.
    Vertex<3, float> transformVertex(const Vertex<3, float>& v) const;
    Vertex<4, float> transformVertex(const Vertex<4, float>& v) const;

    // Post-multiply by a scale or translation matrix: this = this * S.
    void scale(const Vertex<3, float>& factors);
    void translate(const Vertex<3, float>& offset);
    void translate(const Vertex<2, float>& offset);

    void setOrtho(float left, float right, float bottom, float top, float zNear, float zFar);
    void setPersp(float fovYDegrees, float zNear, float zFar, float aspect);
    void setLookAtRH(const Vertex<3, float>& eye, const Vertex<3, float>& target, const Vertex<3, float>& up);
    void setLookAtLH(const Vertex<3, float>& eye, const Vertex<3, float>& target, const Vertex<3, float>& up);

    float m[16];

private:
    void setView(const Vertex<3, float>& eye, const Vertex<3, float>& zAxis, const Vertex<3, float>& up);
};
