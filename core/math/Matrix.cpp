#include "math/Matrix.h"

const Matrix Matrix::IDENTITY(1, 0, 0, 0, 0, 1, 0, 0, 0, 0, 1, 0, 0, 0, 0, 1);

Matrix Matrix::operator*(const Matrix& other) const {
    Matrix product;
    for (int r = 0; r < 4; ++r) {
        for (int c = 0; c < 4; ++c) {
            float sum = 0.0f;
            for (int k = 0; k < 4; ++k) {
                sum += m[4 * r + k] * other.m[4 * k + c];
            }
            product.m[4 * r + c] = sum;
        }
    }
    return product;
}

Matrix& Matrix::operator*=(const Matrix& other) {
    *this = *this * other;
    return *this;
}

Matrix Matrix::operator+(const Matrix& other) const {
    Matrix sum;
    for (int i = 0; i < 16; ++i) {
        sum.m[i] = m[i] + other.m[i];
    }
    return sum;
}

Matrix Matrix::operator-(const Matrix& other) const {
    Matrix difference;
    for (int i = 0; i < 16; ++i) {
        difference.m[i] = m[i] - other.m[i];
    }
    return difference;
}

Matrix Matrix::operator-() const {
    Matrix negated;
    for (int i = 0; i < 16; ++i) {
        negated.m[i] = -m[i];
    }
    return negated;
}

Matrix Matrix::getTranspose() const {
    Matrix transposed;
    for (int r = 0; r < 4; ++r) {
        for (int c = 0; c < 4; ++c) {
            transposed.m[4 * c + r] = m[4 * r + c];
        }
    }
    return transposed;
}

Matrix Matrix::get3x3() const {
    return Matrix(m[0], m[1], m[2], 0, m[4], m[5], m[6], 0, m[8], m[9], m[10], 0, 0, 0, 0, 1);
}

Vertex<4, float> Matrix::getRow(int row) const {
    KD_ASSERT(row >= 0 && row < 4);
    const float* r = m + 4 * row;
    return Vertex<4, float>(r[0], r[1], r[2], r[3]);
}

Vertex<4, float> Matrix::getCol(int col) const {
    KD_ASSERT(col >= 0 && col < 4);
    return Vertex<4, float>(m[col], m[4 + col], m[8 + col], m[12 + col]);
}

float Matrix::determinant() const {
    float sum = 0.0f;
    for (int c = 0; c < 4; ++c) {
        sum += m[c] * coFactor(0, c);
    }
    return sum;
}

float Matrix::coFactor(int row, int col) const {
    KD_ASSERT(row >= 0 && row < 4 && col >= 0 && col < 4);
    // Rows and columns taken cyclically after (row, col) are an even
    // permutation of the natural order, so the minor keeps its sign.
    const int r0 = 4 * ((row + 1) & 3), r1 = 4 * ((row + 2) & 3), r2 = 4 * ((row + 3) & 3);
    const int c0 = (col + 1) & 3, c1 = (col + 2) & 3, c2 = (col + 3) & 3;
    const float minor = m[r0 + c0] * m[r1 + c1] * m[r2 + c2] + m[r0 + c1] * m[r1 + c2] * m[r2 + c0] +
                        m[r0 + c2] * m[r1 + c0] * m[r2 + c1] - m[r0 + c2] * m[r1 + c1] * m[r2 + c0] -
                        m[r0 + c0] * m[r1 + c2] * m[r2 + c1] - m[r0 + c1] * m[r1 + c0] * m[r2 + c2];
    return ((row + col) & 1) ? -minor : minor;
}

Matrix Matrix::getInverse() const {
    const float reciprocal = 1.0f / determinant();
    Matrix inverse;
    for (int r = 0; r < 4; ++r) {
        for (int c = 0; c < 4; ++c) {
            inverse.m[4 * c + r] = coFactor(r, c) * reciprocal;
        }
    }
    return inverse;
}

bool Matrix::isIdentity() const {
    return kdMemcmp(m, IDENTITY.m, sizeof(m)) == 0;
}

void Matrix::doIdentity() {
    *this = IDENTITY;
}

Vertex<3, float> Matrix::transformVertex(const Vertex<3, float>& v) const {
    return Vertex<3, float>(v.x * m[0] + v.y * m[4] + v.z * m[8] + m[12],
                            v.x * m[1] + v.y * m[5] + v.z * m[9] + m[13],
                            v.x * m[2] + v.y * m[6] + v.z * m[10] + m[14]);
}

Vertex<4, float> Matrix::transformVertex(const Vertex<4, float>& v) const {
    return Vertex<4, float>(v.x * m[0] + v.y * m[4] + v.z * m[8] + v.w * m[12],
                            v.x * m[1] + v.y * m[5] + v.z * m[9] + v.w * m[13],
                            v.x * m[2] + v.y * m[6] + v.z * m[10] + v.w * m[14],
                            v.x * m[3] + v.y * m[7] + v.z * m[11] + v.w * m[15]);
}

void Matrix::scale(const Vertex<3, float>& factors) {
    if (factors.x == 1.0f && factors.y == 1.0f && factors.z == 1.0f) {
        return;
    }
    if (isIdentity()) {
        m[0] = factors.x;
        m[5] = factors.y;
        m[10] = factors.z;
        return;
    }
    *this *= Matrix(factors.x, 0, 0, 0, 0, factors.y, 0, 0, 0, 0, factors.z, 0, 0, 0, 0, 1);
}

void Matrix::translate(const Vertex<3, float>& offset) {
    if (offset.x == 0.0f && offset.y == 0.0f && offset.z == 0.0f) {
        return;
    }
    if (isIdentity()) {
        m[12] = offset.x;
        m[13] = offset.y;
        m[14] = offset.z;
        return;
    }
    *this *= Matrix(1, 0, 0, 0, 0, 1, 0, 0, 0, 0, 1, 0, offset.x, offset.y, offset.z, 1);
}

void Matrix::translate(const Vertex<2, float>& offset) {
    translate(Vertex<3, float>(offset.x, offset.y, 0.0f));
}

void Matrix::setOrtho(float left, float right, float bottom, float top, float zNear, float zFar) {
    *this = Matrix();
    m[0] = 2.0f / (right - left);
    m[5] = 2.0f / (top - bottom);
    m[10] = -2.0f / (zFar - zNear);
    m[12] = -(right + left) / (right - left);
    m[13] = -(top + bottom) / (top - bottom);
    m[14] = -(zFar + zNear) / (zFar - zNear);
    m[15] = 1.0f;
}

void Matrix::setPersp(float fovYDegrees, float zNear, float zFar, float aspect) {
    // Spelled out instead of KD_ASSERT: the reported text is fixed and does not
    // follow the parameter's name.
    if (fovYDegrees == -1.0f) {
        kdHandleAssertion("x != -1.f", __FILE__, __LINE__);
    }
    const float top = zNear * kdTanf(fovYDegrees * 3.1415927f / 180.0f * 0.5f);
    const float bottom = -top;
    const float right = top * aspect;
    const float left = -right;
    *this = Matrix();
    m[0] = 2.0f * zNear / (right - left);
    m[5] = 2.0f * zNear / (top - bottom);
    m[8] = (right + left) / (right - left);
    m[9] = (top + bottom) / (top - bottom);
    m[10] = -(zFar + zNear) / (zFar - zNear);
    m[11] = -1.0f;
    m[14] = -2.0f * zFar * zNear / (zFar - zNear);
}

void Matrix::setLookAtRH(const Vertex<3, float>& eye, const Vertex<3, float>& target,
                         const Vertex<3, float>& up) {
    setView(eye, (eye - target).getNormalized(), up);
}

void Matrix::setLookAtLH(const Vertex<3, float>& eye, const Vertex<3, float>& target,
                         const Vertex<3, float>& up) {
    setView(eye, (target - eye).getNormalized(), up);
}

void Matrix::setView(const Vertex<3, float>& eye, const Vertex<3, float>& zAxis, const Vertex<3, float>& up) {
    const Vertex<3, float> xAxis = up.cross(zAxis).getNormalized();
    const Vertex<3, float> yAxis = zAxis.cross(xAxis);
    *this = Matrix(xAxis.x, yAxis.x, zAxis.x, 0, xAxis.y, yAxis.y, zAxis.y, 0, xAxis.z, yAxis.z, zAxis.z, 0,
                   -xAxis.dot(eye), -yAxis.dot(eye), -zAxis.dot(eye), 1);
}
