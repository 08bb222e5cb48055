// The host's math library: 4×4 and 3×3 matrices of doubles and the operations on them.
// Points are row vectors: p' = p·M, so the product A·B applies A first. Every operation that
// can fail returns 0 or one of the error codes below, which the caller throws.
#pragma once

#include <cstdint>

// The math library's error codes.
inline constexpr int32_t kM_ErrSingularMatrix = 0x1101;
inline constexpr int32_t kM_ErrNotFinite = 0x1102;
inline constexpr int32_t kM_ErrBadArgument = 0x1103;
inline constexpr int32_t kM_ErrZeroLengthVector = 0x110B;

// A 4×4 transform: placements map object to world, projections eye to screen.
struct M_Matrix4 {
    double mat[4][4];

    // True when no element is infinite or NaN.
    bool IsFinite() const;
    // Appends the perspective projection of a camera with the given zoom (focal length in
    // pixels): a point at eye depth z gets w = z / zoom, so the plane z = zoom maps 1:1, and
    // its screen depth is zoom / z (larger is nearer). A zoom of 0 leaves the matrix as it is.
    void Project(double zoom);
};

// A 3×3 homography of a plane: screen pixels to texture pixels and back.
struct M_Matrix3 {
    double mat[3][3];

    // True when every element lies within epsilon of 0.
    bool IsZeroWithinEpsilon(double epsilon) const;
    // This = m without row 2 and column 2 (the z row and column): a homography of the plane z = 0.
    void AssignFromByDroppingZ(const M_Matrix4& m);
    // This = m without the given row and column.
    void AssignFromByDroppingIndices(const M_Matrix4& m, int32_t row, int32_t column);
};

// Integer rectangle; right and bottom are exclusive.
struct M_LRect {
    int32_t left, top, right, bottom;
};

// A point of the plane, for convex hulls.
struct M_Point2 {
    double x, y;
};

// Sets m to the identity.
int32_t M_IdentityMatrix4(M_Matrix4* m);
void M_SetIdentityMatrix(M_Matrix3* m);

// out = a·b; out may alias either input.
int32_t M_ConcatMatrix4(const M_Matrix4* a, const M_Matrix4* b, M_Matrix4* out);
int32_t M_ConcatMatrix(const M_Matrix3* a, const M_Matrix3* b, M_Matrix3* out);

// Inversions: kM_ErrSingularMatrix for a singular matrix. M_InverseMatrix4 also reports the
// failure through Mp_ReportErr; the quiet form reports nothing. out may alias m.
int32_t M_InverseMatrix4(const M_Matrix4* m, M_Matrix4* out);
int32_t M_InverseMatrix4Quiet(const M_Matrix4* m, M_Matrix4* out);
int32_t M_InverseMatrix(const M_Matrix3* m, M_Matrix3* out);

// out = the transpose of m; out may alias m.
int32_t M_TransposeMatrix4(const M_Matrix4* m, M_Matrix4* out);

// Each of these appends a transformation to m: m = m·S, m·T, m·R.
int32_t M_ScaleMatrix4(double sx, double sy, double sz, M_Matrix4* m);
int32_t M_TranslateMatrix4(double tx, double ty, double tz, M_Matrix4* m);
// Rotation by rx about x, then ry about y, then rz about z (radians).
int32_t M_RotateMatrix4XYZ(double rx, double ry, double rz, M_Matrix4* m);
// For a 3×3 homography of the plane: m = m·T, moving every mapped point by (tx, ty).
int32_t M_TranslateMatrix(M_Matrix3* m, double tx, double ty);

// Embeds a plane homography in a 4×4 matrix that leaves z as it is.
void M_Matrix3ToMatrix4(const M_Matrix3* m, M_Matrix4* out);

// out = in·m, without the division by w.
int32_t M_TransformVector4NoDivide(const M_Matrix4* m, const double in[4], double out[4]);

// Convex hull of count points, counter-clockwise in a y-up frame, without collinear points.
// hull needs room for count points; *hullCount receives the number written.
int32_t M_ComputeConvexHull(int32_t count, const M_Point2* points, int32_t* hullCount,
                            M_Point2* hull);

// Reports a math failure to the user with the math library's message for it.
void Mp_ReportErr(int32_t error);

// The math library's message for an error code ("" when it has none).
const char* M_ErrorMessage(int32_t error);
