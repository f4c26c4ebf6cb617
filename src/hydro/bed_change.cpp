#include "hydro/bed_change.hpp"

#include "core/omp.hpp"

namespace vhd {

void ApplyBedChangeHD(HdModule& hd, const Mesh& mesh, Array1<double>& dz) {
  HdState& s = hd.state;
  if (hd.subdomain) ExchangeHalo(*hd.subdomain, {&dz});
  const int nlocal = s.nelements_local;

  VHD_OMP_PARALLEL_FOR
  for (int e = 1; e <= nlocal; ++e) {
    if (dz[e] == 0.0) continue;
    s.d[e] -= dz[e];
    if (s.wetdry[e] > 0) {
      s.h[e] = s.eta[e] + s.d[e];
      if (s.h[e] <= 0.0) {
        s.h[e] = 0.0;
        s.eta[e] = -s.d[e];
        s.P[e] = 0.0;
        s.Q[e] = 0.0;
        s.wetdry[e] = kDry;
      }
    } else {
      s.eta[e] = s.h[e] - s.d[e];
    }
    s.u[e] = VelocityFromFluxHD(s.wetdry[e], s.h[e], s.P[e]);
    s.v[e] = VelocityFromFluxHD(s.wetdry[e], s.h[e], s.Q[e]);
  }

  // Node bed levels: the mean change of the node's elements, where all of
  // them are held by this process.
  const NodeTable& nodes = mesh.nodes;
  VHD_OMP_PARALLEL_FOR
  for (int n = 1; n <= s.nnodes; ++n) {
    const int count = NodeElementCount(nodes, n);
    double sum = 0.0;
    bool complete = count > 0;
    for (int j = 1; j <= count && complete; ++j) {
      const int e = NodeElement(nodes, n, j);
      complete = e <= nlocal;
      if (complete) sum += dz[e];
    }
    if (complete) s.z_node[n] += sum / count;
  }

  const FaceTable& faces = mesh.faces;
  const bool from_nodes = hd.solution.face_average_d == 2;
  VHD_OMP_PARALLEL_FOR
  for (int f = 1; f <= s.nfaces; ++f) {
    const int a = faces.element1[f], b = faces.element2[f];
    if (a > nlocal || b > nlocal) continue;
    if (from_nodes) {
      double zsum = 0.0;
      const int nn = FaceNodeCount(faces, f);
      for (int j = 1; j <= nn; ++j) zsum += s.z_node[FaceNode(faces, f, j)];
      s.face_d[f] = -zsum / nn;
    } else {
      s.face_d[f] = b > 0 ? 0.5 * (s.d[a] + s.d[b]) : s.d[a];
    }
  }
  hd.cfl_rate_max_ready = -1.0;
}

}  // namespace vhd
