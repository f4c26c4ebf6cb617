#include "parallel/subdomain.hpp"

#define OMPI_SKIP_MPICXX 1
#include <mpi.h>

#include <algorithm>
#include <new>

#include "log/log.hpp"
#include "mesh/reorder.hpp"
#include "parallel/message_passing.hpp"

namespace vhd {

namespace {

constexpr int kHaloTag = 4711;
constexpr int kGatherTag = 4712;

// Requests of one exchange: a receive and a send per link (sized at setup).
std::vector<MPI_Request> g_requests;

// Layer of every element: 0 owned, 1 and 2 the halo layers, 3 the rest.
std::vector<int> Layers(const Mesh& mesh, const Array1<int>& part, int process, int halo_layers) {
  const ElementTable& el = mesh.elements;
  const NodeTable& nd = mesh.nodes;
  const int ne = el.nelements;
  std::vector<int> layer(static_cast<std::size_t>(ne) + 1, 3);
  for (int e = 1; e <= ne; ++e)
    if (part[e] - 1 == process) layer[static_cast<std::size_t>(e)] = 0;
  for (int l = 1; l <= halo_layers; ++l) {
    for (int e = 1; e <= ne; ++e) {
      if (layer[static_cast<std::size_t>(e)] != l - 1) continue;
      for (int j = 1; j <= ElementNodeCount(el, e); ++j) {
        const int n = ElementNode(el, e, j);
        for (int q = 1; q <= NodeElementCount(nd, n); ++q) {
          const int c = NodeElement(nd, n, q);
          if (layer[static_cast<std::size_t>(c)] == 3) layer[static_cast<std::size_t>(c)] = l;
        }
      }
    }
  }
  return layer;
}

// The mesh as read, without its faces and tables (ReorderMesh needs it so).
void DropGeometry(Mesh& mesh) {
  mesh.faces = FaceTable{};
  mesh.elements.face_start = Array1<int>();
  mesh.elements.face_list = Array1<int>();
  mesh.elements.nelements_int = 0;
  mesh.nodes.nnodes_int = 0;
}

void SetupLinks(const Mesh& mesh, Subdomain& sub) {
  const int np = sub.nprocesses;
  const Array1<int>& file_index = mesh.elements.file_index;
  auto place = [&](int e) { return FileIndex(file_index, e); };
  // Halo elements by owner, sorted by their places in the mesh file.
  std::vector<std::vector<int>> recv(static_cast<std::size_t>(np));
  for (int e = sub.nowned + 1; e <= sub.nlocal; ++e) recv[static_cast<std::size_t>(sub.owner[e])].push_back(e);
  std::vector<int> send_count(static_cast<std::size_t>(np), 0), recv_count(static_cast<std::size_t>(np), 0);
  std::vector<int> wanted;  // places wanted from each owner, owner by owner
  std::vector<int> wanted_offset(static_cast<std::size_t>(np), 0);
  for (int q = 0; q < np; ++q) {
    auto& r = recv[static_cast<std::size_t>(q)];
    std::sort(r.begin(), r.end(), [&](int a, int b) { return place(a) < place(b); });
    recv_count[static_cast<std::size_t>(q)] = static_cast<int>(r.size());
    wanted_offset[static_cast<std::size_t>(q)] = static_cast<int>(wanted.size());
    for (int e : r) wanted.push_back(place(e));
  }
  CheckMpiCall(MPI_Alltoall(recv_count.data(), 1, MPI_INT, send_count.data(), 1, MPI_INT, MPI_COMM_WORLD));
  std::vector<int> asked_offset(static_cast<std::size_t>(np), 0);
  int total = 0;
  for (int q = 0; q < np; ++q) {
    asked_offset[static_cast<std::size_t>(q)] = total;
    total += send_count[static_cast<std::size_t>(q)];
  }
  std::vector<int> asked(static_cast<std::size_t>(std::max(total, 1)));
  CheckMpiCall(MPI_Alltoallv(wanted.data(), recv_count.data(), wanted_offset.data(), MPI_INT, asked.data(),
                             send_count.data(), asked_offset.data(), MPI_INT, MPI_COMM_WORLD));
  const Array1<int> position = FileOrder(file_index, mesh.elements.nelements);

  sub.links.clear();
  int nsend = 0, nrecv = 0;
  for (int q = 0; q < np; ++q) {
    const auto qi = static_cast<std::size_t>(q);
    if (send_count[qi] == 0 && recv_count[qi] == 0) continue;
    Subdomain::Link link;
    link.process = q;
    link.recv = recv[qi];
    for (int k = 0; k < send_count[qi]; ++k) {
      const int e = position[asked[static_cast<std::size_t>(asked_offset[qi] + k)]];
      if (e < 1 || e > sub.nowned)
        FatalError("SetupSubdomain: process " + std::to_string(q) + " asks for an element that process " +
                   std::to_string(sub.process) + " does not own");
      link.send.push_back(e);
    }
    sub.send_offset.push_back(nsend);
    sub.recv_offset.push_back(nrecv);
    nsend += static_cast<int>(link.send.size());
    nrecv += static_cast<int>(link.recv.size());
    sub.links.push_back(std::move(link));
  }
  sub.send_buffer.assign(static_cast<std::size_t>(nsend) * kMaxExchangeFields, 0.0);
  sub.recv_buffer.assign(static_cast<std::size_t>(nrecv) * kMaxExchangeFields, 0.0);
  g_requests.assign(2 * sub.links.size(), MPI_REQUEST_NULL);

  // Process 0 learns where every process's owned elements lie in its own
  // numbering.
  std::vector<int> owned_places(static_cast<std::size_t>(sub.nowned));
  for (int e = 1; e <= sub.nowned; ++e) owned_places[static_cast<std::size_t>(e - 1)] = place(e);
  std::vector<int> counts(static_cast<std::size_t>(np), 0), offsets(static_cast<std::size_t>(np), 0);
  CheckMpiCall(MPI_Gather(&sub.nowned, 1, MPI_INT, counts.data(), 1, MPI_INT, 0, MPI_COMM_WORLD));
  int all = 0;
  for (int q = 0; q < np; ++q) {
    offsets[static_cast<std::size_t>(q)] = all;
    all += counts[static_cast<std::size_t>(q)];
  }
  std::vector<int> places(sub.Root() ? static_cast<std::size_t>(all) : 1);
  CheckMpiCall(MPI_Gatherv(owned_places.data(), sub.nowned, MPI_INT, places.data(), counts.data(),
                           offsets.data(), MPI_INT, 0, MPI_COMM_WORLD));
  sub.owned_on_root.assign(sub.Root() ? static_cast<std::size_t>(np) : 0, {});
  int largest = 0;
  for (std::size_t q = 0; q < sub.owned_on_root.size(); ++q) {
    auto& v = sub.owned_on_root[q];
    for (int k = 0; k < counts[q]; ++k) v.push_back(position[places[static_cast<std::size_t>(offsets[q] + k)]]);
    largest = std::max(largest, counts[q]);
  }
  sub.gather_buffer.assign(static_cast<std::size_t>(largest), 0.0);
}

void LogSummary(const Subdomain& sub) {
  WriteLogLine("");
  WriteLogLine("Sub-domain");
  WriteValueLine("Domain                     : %", sub.process + 1);
  WriteValueLine("Owned elements             : %", sub.nowned);
  WriteValueLine("Halo layers                : %", sub.halo_layers);
  WriteValueLine("Halo elements              : %", sub.nlocal - sub.nowned);
  for (const Subdomain::Link& link : sub.links) {
    WriteValueLine("Connected domain           : %", link.process + 1);
    WriteValueLine(" Internal layer            : %", static_cast<int>(link.send.size()));
    WriteValueLine(" External layer            : %", static_cast<int>(link.recv.size()));
  }
}

}  // namespace

void SetupSubdomain(Mesh& mesh, const Array1<int>& part, int halo_layers, const RunControl& run,
                    Subdomain& sub) {
  const int ne = mesh.elements.nelements;
  sub = Subdomain{};
  sub.halo_layers = halo_layers;
  if (run.nprocesses <= 1 || run.process_id < 0) {
    sub.nowned = sub.nlocal = ne;
    sub.owner.assign(ne, 0);
    return;
  }
  sub.process = run.process_id;
  sub.nprocesses = run.nprocesses;
  try {
    const std::vector<int> layer = Layers(mesh, part, sub.process, halo_layers);
    std::vector<int> order;
    order.reserve(static_cast<std::size_t>(ne));
    int count[4] = {0, 0, 0, 0};
    for (int l = 0; l < 4; ++l)
      for (int e = 1; e <= ne; ++e)
        if (layer[static_cast<std::size_t>(e)] == l) {
          order.push_back(e);
          ++count[l];
        }
    sub.nowned = count[0];
    sub.nlocal = count[0] + count[1] + count[2];
    sub.owner.assign(ne, 0);
    for (int k = 1; k <= ne; ++k) sub.owner[k] = part[order[static_cast<std::size_t>(k - 1)]] - 1;

    DropGeometry(mesh);
    // Faces keep the orientation of the whole mesh's order.
    mesh.elements.run_order.assign(ne);
    for (int e = 1; e <= ne; ++e) mesh.elements.run_order[e] = e;
    ReorderMesh(mesh, order);
    SetupMeshGeometry(mesh);
  } catch (const std::bad_alloc&) {
    FatalError("ReorderMesh: Out of memory");
  }

  // Owned counts: the faces of owned elements come first (the elements
  // create their faces in order), and so do their nodes.
  ElementTable& el = mesh.elements;
  FaceTable& fc = mesh.faces;
  el.nelements_int = sub.nowned;
  int nf = 0;
  while (nf < fc.nfaces && (fc.element1[nf + 1] <= sub.nowned ||
                            (fc.element2[nf + 1] > 0 && fc.element2[nf + 1] <= sub.nowned)))
    ++nf;
  fc.nfaces_int = nf;
  int nn = 0;
  for (int e = 1; e <= sub.nowned; ++e)
    for (int j = 1; j <= ElementNodeCount(el, e); ++j) nn = std::max(nn, ElementNode(el, e, j));
  mesh.nodes.nnodes_int = nn;

  SetupLinks(mesh, sub);
  LogSummary(sub);
}

void ExchangeHalo(Subdomain& sub, std::initializer_list<Array1<double>*> fields,
                  std::initializer_list<Array1<int>*> codes) {
  if (!sub.Active()) return;
  const int nf = static_cast<int>(fields.size() + codes.size());
  if (nf > kMaxExchangeFields) FatalError("ExchangeHalo: too many fields in one exchange");
  TimingSet& timing = MpiTimings();
  const bool timed = !timing.timers.empty();
  if (timed) {
    StartTiming(timing, kMpiTimerTotal);
    StartTiming(timing, kMpiTimerHalo);
  }
  const int nlinks = static_cast<int>(sub.links.size());
  for (int l = 0; l < nlinks; ++l) {
    const Subdomain::Link& link = sub.links[static_cast<std::size_t>(l)];
    double* buf = sub.recv_buffer.data() + static_cast<std::size_t>(sub.recv_offset[static_cast<std::size_t>(l)]) * nf;
    CheckMpiCall(MPI_Irecv(buf, static_cast<int>(link.recv.size()) * nf, MPI_DOUBLE, link.process, kHaloTag,
                           MPI_COMM_WORLD, &g_requests[static_cast<std::size_t>(l)]));
  }
  for (int l = 0; l < nlinks; ++l) {
    const Subdomain::Link& link = sub.links[static_cast<std::size_t>(l)];
    double* buf = sub.send_buffer.data() + static_cast<std::size_t>(sub.send_offset[static_cast<std::size_t>(l)]) * nf;
    std::size_t k = 0;
    for (int e : link.send) {
      for (const Array1<double>* a : fields) buf[k++] = (*a)[e];
      for (const Array1<int>* a : codes) buf[k++] = (*a)[e];
    }
    CheckMpiCall(MPI_Isend(buf, static_cast<int>(link.send.size()) * nf, MPI_DOUBLE, link.process, kHaloTag,
                           MPI_COMM_WORLD, &g_requests[static_cast<std::size_t>(nlinks + l)]));
  }
  CheckMpiCall(MPI_Waitall(2 * nlinks, g_requests.data(), MPI_STATUSES_IGNORE));
  for (int l = 0; l < nlinks; ++l) {
    const Subdomain::Link& link = sub.links[static_cast<std::size_t>(l)];
    const double* buf =
        sub.recv_buffer.data() + static_cast<std::size_t>(sub.recv_offset[static_cast<std::size_t>(l)]) * nf;
    std::size_t k = 0;
    for (int e : link.recv) {
      for (Array1<double>* a : fields) (*a)[e] = buf[k++];
      for (Array1<int>* a : codes) (*a)[e] = static_cast<int>(buf[k++]);
    }
  }
  if (timed) {
    StopTiming(timing, kMpiTimerHalo);
    StopTiming(timing, kMpiTimerTotal);
  }
}

void GatherOwned(Subdomain& sub, Array1<double>& values) {
  if (!sub.Active()) return;
  if (!sub.Root()) {
    CheckMpiCall(MPI_Send(values.data() + 1, sub.nowned, MPI_DOUBLE, 0, kGatherTag, MPI_COMM_WORLD));
    return;
  }
  for (int q = 1; q < sub.nprocesses; ++q) {
    const std::vector<int>& at = sub.owned_on_root[static_cast<std::size_t>(q)];
    CheckMpiCall(MPI_Recv(sub.gather_buffer.data(), static_cast<int>(at.size()), MPI_DOUBLE, q, kGatherTag,
                          MPI_COMM_WORLD, MPI_STATUS_IGNORE));
    for (std::size_t k = 0; k < at.size(); ++k) values[at[k]] = sub.gather_buffer[k];
  }
}

double MaxOverProcesses(double value, const Subdomain& sub) {
  if (!sub.Active()) return value;
  double r = value;
  CheckMpiCall(MPI_Allreduce(&value, &r, 1, MPI_DOUBLE, MPI_MAX, MPI_COMM_WORLD));
  return r;
}

int MaxOverProcesses(int value, const Subdomain& sub) {
  if (!sub.Active()) return value;
  int r = value;
  CheckMpiCall(MPI_Allreduce(&value, &r, 1, MPI_INT, MPI_MAX, MPI_COMM_WORLD));
  return r;
}

int MinOverProcesses(int value, const Subdomain& sub) {
  if (!sub.Active()) return value;
  int r = value;
  CheckMpiCall(MPI_Allreduce(&value, &r, 1, MPI_INT, MPI_MIN, MPI_COMM_WORLD));
  return r;
}

long long SumOverProcesses(long long value, const Subdomain& sub) {
  if (!sub.Active()) return value;
  long long r = value;
  CheckMpiCall(MPI_Allreduce(&value, &r, 1, MPI_LONG_LONG, MPI_SUM, MPI_COMM_WORLD));
  return r;
}

void SumOverProcesses(double* values, int n, const Subdomain& sub) {
  if (!sub.Active() || n <= 0) return;
  CheckMpiCall(MPI_Allreduce(MPI_IN_PLACE, values, n, MPI_DOUBLE, MPI_SUM, MPI_COMM_WORLD));
}

void BroadcastElement(Subdomain& sub, int e, std::initializer_list<Array1<double>*> fields,
                      std::initializer_list<Array1<int>*> codes) {
  if (!sub.Active()) return;
  double buf[kMaxExchangeFields] = {};
  std::size_t k = 0;
  for (const Array1<double>* a : fields) buf[k++] = (*a)[e];
  for (const Array1<int>* a : codes) buf[k++] = (*a)[e];
  CheckMpiCall(MPI_Bcast(buf, static_cast<int>(k), MPI_DOUBLE, sub.owner[e], MPI_COMM_WORLD));
  k = 0;
  for (Array1<double>* a : fields) (*a)[e] = buf[k++];
  for (Array1<int>* a : codes) (*a)[e] = static_cast<int>(buf[k++]);
}

}  // namespace vhd
