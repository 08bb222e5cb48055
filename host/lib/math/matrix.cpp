#include <cmath>
#include <cstring>
#include <utility>

#include "m_matrix.h"

namespace {

using Row4 = double[4];

void Multiply4(const M_Matrix4& a, const M_Matrix4& b, M_Matrix4* out) {
    M_Matrix4 r;
    for (int i = 0; i < 4; ++i) {
        for (int j = 0; j < 4; ++j) {
            r.mat[i][j] = a.mat[i][0] * b.mat[0][j] + a.mat[i][1] * b.mat[1][j] +
                          a.mat[i][2] * b.mat[2][j] + a.mat[i][3] * b.mat[3][j];
        }
    }
    *out = r;
}

// Gauss-Jordan elimination with partial pivoting over an n×n block of doubles.
template <int N>
bool Invert(const double (&in)[N][N], double (&out)[N][N]) {
    double a[N][N];
    double inv[N][N] = {};
    std::memcpy(a, in, sizeof a);
    for (int i = 0; i < N; ++i)
        inv[i][i] = 1.0;
    for (int col = 0; col < N; ++col) {
        int pivot = col;
        for (int row = col + 1; row < N; ++row) {
            if (std::fabs(a[row][col]) > std::fabs(a[pivot][col])) pivot = row;
        }
        if (!(std::fabs(a[pivot][col]) > 0.0)) return false;
        if (pivot != col) {
            std::swap(a[pivot], a[col]);
            std::swap(inv[pivot], inv[col]);
        }
        double scale = 1.0 / a[col][col];
        for (int j = 0; j < N; ++j) {
            a[col][j] *= scale;
            inv[col][j] *= scale;
        }
        for (int row = 0; row < N; ++row) {
            if (row == col || a[row][col] == 0.0) continue;
            double factor = a[row][col];
            for (int j = 0; j < N; ++j) {
                a[row][j] -= factor * a[col][j];
                inv[row][j] -= factor * inv[col][j];
            }
        }
    }
    for (int i = 0; i < N; ++i) {
        for (int j = 0; j < N; ++j) {
            if (!std::isfinite(inv[i][j])) return false;
        }
    }
    std::memcpy(out, inv, sizeof inv);
    return true;
}

M_Matrix4 Identity4() {
    M_Matrix4 m{};
    for (int i = 0; i < 4; ++i)
        m.mat[i][i] = 1.0;
    return m;
}

}  // namespace

bool M_Matrix4::IsFinite() const {
    for (const auto& row : mat) {
        for (double v : row) {
            if (!std::isfinite(v)) return false;
        }
    }
    return true;
}

void M_Matrix4::Project(double zoom) {
    if (zoom == 0.0) return;
    M_Matrix4 p{};
    p.mat[0][0] = 1.0;
    p.mat[1][1] = 1.0;
    p.mat[2][3] = 1.0 / zoom;
    p.mat[3][2] = 1.0;
    Multiply4(*this, p, this);
}

bool M_Matrix3::IsZeroWithinEpsilon(double epsilon) const {
    for (const auto& row : mat) {
        for (double v : row) {
            if (std::fabs(v) > epsilon) return false;
        }
    }
    return true;
}

void M_Matrix3::AssignFromByDroppingZ(const M_Matrix4& m) {
    AssignFromByDroppingIndices(m, 2, 2);
}

void M_Matrix3::AssignFromByDroppingIndices(const M_Matrix4& m, int32_t row, int32_t column) {
    for (int i = 0, r = 0; i < 4; ++i) {
        if (i == row) continue;
        for (int j = 0, c = 0; j < 4; ++j) {
            if (j == column) continue;
            mat[r][c++] = m.mat[i][j];
        }
        ++r;
    }
}

int32_t M_IdentityMatrix4(M_Matrix4* m) {
    if (!m) return kM_ErrBadArgument;
    *m = Identity4();
    return 0;
}

void M_SetIdentityMatrix(M_Matrix3* m) {
    *m = M_Matrix3{};
    for (int i = 0; i < 3; ++i)
        m->mat[i][i] = 1.0;
}

int32_t M_ConcatMatrix4(const M_Matrix4* a, const M_Matrix4* b, M_Matrix4* out) {
    if (!a || !b || !out) return kM_ErrBadArgument;
    Multiply4(*a, *b, out);
    return 0;
}

int32_t M_ConcatMatrix(const M_Matrix3* a, const M_Matrix3* b, M_Matrix3* out) {
    if (!a || !b || !out) return kM_ErrBadArgument;
    M_Matrix3 r;
    for (int i = 0; i < 3; ++i) {
        for (int j = 0; j < 3; ++j) {
            r.mat[i][j] = a->mat[i][0] * b->mat[0][j] + a->mat[i][1] * b->mat[1][j] +
                          a->mat[i][2] * b->mat[2][j];
        }
    }
    *out = r;
    return 0;
}

int32_t M_InverseMatrix4Quiet(const M_Matrix4* m, M_Matrix4* out) {
    if (!m || !out) return kM_ErrBadArgument;
    return Invert<4>(m->mat, out->mat) ? 0 : kM_ErrSingularMatrix;
}

int32_t M_InverseMatrix4(const M_Matrix4* m, M_Matrix4* out) {
    int32_t error = M_InverseMatrix4Quiet(m, out);
    if (error) Mp_ReportErr(error);
    return error;
}

int32_t M_InverseMatrix(const M_Matrix3* m, M_Matrix3* out) {
    if (!m || !out) return kM_ErrBadArgument;
    return Invert<3>(m->mat, out->mat) ? 0 : kM_ErrSingularMatrix;
}

int32_t M_TransposeMatrix4(const M_Matrix4* m, M_Matrix4* out) {
    if (!m || !out) return kM_ErrBadArgument;
    M_Matrix4 t;
    for (int i = 0; i < 4; ++i) {
        for (int j = 0; j < 4; ++j)
            t.mat[i][j] = m->mat[j][i];
    }
    *out = t;
    return 0;
}

int32_t M_ScaleMatrix4(double sx, double sy, double sz, M_Matrix4* m) {
    if (!m) return kM_ErrBadArgument;
    // m·S scales the columns.
    for (auto& row : m->mat) {
        row[0] *= sx;
        row[1] *= sy;
        row[2] *= sz;
    }
    return 0;
}

int32_t M_TranslateMatrix4(double tx, double ty, double tz, M_Matrix4* m) {
    if (!m) return kM_ErrBadArgument;
    // m·T adds w times the translation to x, y and z.
    for (auto& row : m->mat) {
        row[0] += row[3] * tx;
        row[1] += row[3] * ty;
        row[2] += row[3] * tz;
    }
    return 0;
}

int32_t M_RotateMatrix4XYZ(double rx, double ry, double rz, M_Matrix4* m) {
    if (!m) return kM_ErrBadArgument;
    auto rotate = [m](int a, int b, double angle) {
        // Right-handed rotation of axis a toward axis b, applied after m.
        double c = std::cos(angle), s = std::sin(angle);
        for (auto& row : m->mat) {
            double ra = row[a], rb = row[b];
            row[a] = ra * c - rb * s;
            row[b] = ra * s + rb * c;
        }
    };
    rotate(1, 2, rx);
    rotate(2, 0, ry);
    rotate(0, 1, rz);
    return 0;
}

int32_t M_TranslateMatrix(M_Matrix3* m, double tx, double ty) {
    if (!m) return kM_ErrBadArgument;
    for (auto& row : m->mat) {
        row[0] += row[2] * tx;
        row[1] += row[2] * ty;
    }
    return 0;
}

void M_Matrix3ToMatrix4(const M_Matrix3* m, M_Matrix4* out) {
    // The 3×3 maps (x, y, 1); it becomes the 4×4 that maps (x, y, z, 1) with z passed through.
    *out = Identity4();
    const int index[3] = {0, 1, 3};
    for (int i = 0; i < 3; ++i) {
        for (int j = 0; j < 3; ++j)
            out->mat[index[i]][index[j]] = m->mat[i][j];
    }
}

int32_t M_TransformVector4NoDivide(const M_Matrix4* m, const double in[4], double out[4]) {
    if (!m || !in || !out) return kM_ErrBadArgument;
    double r[4];
    for (int j = 0; j < 4; ++j) {
        r[j] = in[0] * m->mat[0][j] + in[1] * m->mat[1][j] + in[2] * m->mat[2][j] +
               in[3] * m->mat[3][j];
    }
    std::memcpy(out, r, sizeof r);
    return 0;
}
