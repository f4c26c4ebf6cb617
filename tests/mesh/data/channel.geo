// A 1000 m x 200 m channel: inflow (physical line 2) on the left, outflow
// (physical line 3) on the right, land (physical line 1, "land") along the
// sides. Mesh with: gmsh -2 -format msh22 channel.geo -o channel_v22.msh
//                   gmsh -2 -format msh41 channel.geo -o channel_v41.msh
lc = 100;
Point(1) = {0, 0, -5, lc};
Point(2) = {1000, 0, -5, lc};
Point(3) = {1000, 200, -5, lc};
Point(4) = {0, 200, -5, lc};
Line(1) = {1, 2};
Line(2) = {2, 3};
Line(3) = {3, 4};
Line(4) = {4, 1};
Curve Loop(1) = {1, 2, 3, 4};
Plane Surface(1) = {1};
Physical Curve("land", 1) = {1, 3};
Physical Curve("inflow", 2) = {4};
Physical Curve("outflow", 3) = {2};
Physical Surface("water", 10) = {1};
