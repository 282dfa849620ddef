#pragma once

namespace Tessara::Math {

struct float2 {
    float x, y;
};
struct float3 {
    float x, y, z;
};
struct float4 {
    float x, y, z, w;
};
struct float2x2 {
    float values[4];
};
struct float2x3 {
    float values[6];
};
struct float3x3 {
    float values[9];
};
struct float4x4 {
    float values[16];
};
struct double2 {
    double x, y;
};
struct double3 {
    double x, y, z;
};
struct double4 {
    double x, y, z, w;
};
struct double2x2 {
    double values[4];
};
struct double2x3 {
    double values[6];
};
struct double3x3 {
    double values[9];
};
struct double4x4 {
    double values[16];
};
struct int2 {
    int x, y;
};
struct int2x2 {
    int values[4];
};
struct int2x3 {
    int values[6];
};
struct int3 {
    int x, y, z;
};
struct short2 {
    short x, y;
};
struct short2x2 {
    short values[4];
};
struct short2x3 {
    short values[6];
};
struct short3 {
    short x, y, z;
};
struct uchar3 {
    unsigned char x, y, z;
};
struct uchar4 {
    unsigned char x, y, z, w;
};

}
