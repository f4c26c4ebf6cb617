#pragma once
// The part of the 2D mesh that one process computes in a run on several
// processes, and the exchanges between the parts.
//
// Layout. Every process holds the whole 2D mesh (it reads it, and the
// boundaries, sections, points and input files keep their meaning on it), but
// numbered for itself:
//   1 .. nowned            its owned elements (the sub-domain), in the
//                          element order of the run (type_of_reordering);
//   nowned+1 ..            the first halo layer: elements of other
//                          sub-domains that share a node with an owned one,
//   .. nlocal              then the second halo layer (type_of_halo_layer 2):
//                          those that share a node with the first layer;
//   nlocal+1 .. nelements  the rest of the mesh, never read in the time loop.
// Nodes follow in the order of first use, faces in the order the elements
// create them, so that faces 1 .. nfaces_int are exactly the faces of owned
// elements. A process computes its owned elements and the faces of owned
// elements only; after each stage the halo takes the owners' new values
// (ExchangeHalo); so do quantities formed from neighbours (gradients, eddy
// viscosity, the outflow factor), which each process forms for its owned
// elements. Two halo layers hold the second ring of a gradient stencil.
//
// Bitwise equality with one process: every face keeps the orientation it
// has on one process (ElementTable::run_order), every element sums its face
// terms in its own local face order, gradient stencils and node lists are
// ordered by the geometry, and every global sum is an ExactSum. So every
// process forms exactly the values that one process forms for the same
// element or face.
//
// With one process (or message passing off) nowned = nnear = nlocal =
// nelements and every call here returns at once.

#include <initializer_list>
#include <string>
#include <vector>

#include "core/array1.hpp"
#include "core/run.hpp"
#include "mesh/mesh.hpp"

namespace vhd {

struct Subdomain {
  int process = 0;     // this process, 0 .. nprocesses-1
  int nprocesses = 1;
  int halo_layers = 2;
  int nowned = 0, nlocal = 0;
  // Owner (0 .. nprocesses-1) of every element, by local position.
  Array1<int> owner;

  // Halo exchange with one neighbouring process: the local positions of the
  // owned elements it needs (send) and of its elements held here (recv),
  // both sorted by the elements' places in the mesh file, so that the two
  // sides pair them without a table.
  struct Link {
    int process = 0;
    std::vector<int> send, recv;
  };
  std::vector<Link> links;

  // Process 0: for every process, the local positions (on process 0) of its
  // owned elements, in its owned order (GatherOwned).
  std::vector<std::vector<int>> owned_on_root;

  // Work buffers, sized at setup (the exchanges allocate nothing).
  std::vector<double> send_buffer, recv_buffer;
  std::vector<int> send_offset, recv_offset;  // per link, in values of one field
  std::vector<double> gather_buffer;          // process 0: every process's owned values

  bool Active() const { return nprocesses > 1; }
  bool Root() const { return process == 0; }
};

// Largest number of fields that one ExchangeHalo call carries.
inline constexpr int kMaxExchangeFields = 8;

// Splits a 2D mesh whose geometry is set up over the processes of the run:
// part[e] (1 .. nprocesses) is the sub-domain of element e (positions of the
// mesh as it stands). Renumbers the mesh as the header describes, rebuilds
// its geometry, sets the owned counts of the mesh tables, sets up the
// exchange lists (collective) and logs the halo summary. halo_layers is 1 or
// 2. With one process: sub covers the whole mesh and the mesh is untouched.
void SetupSubdomain(Mesh& mesh, const Array1<int>& part, int halo_layers, const RunControl& run,
                    Subdomain& sub);

// Copies the owners' values of the halo elements into fields (every process
// calls it at the same point).
void ExchangeHalo(Subdomain& sub, std::initializer_list<Array1<double>*> fields,
                  std::initializer_list<Array1<int>*> codes = {});

// Process 0 receives every process's owned values of values (element
// positions) into its own positions; other processes send theirs.
void GatherOwned(Subdomain& sub, Array1<double>& values);

// The largest value over all processes.
double MaxOverProcesses(double value, const Subdomain& sub);
int MaxOverProcesses(int value, const Subdomain& sub);
int MinOverProcesses(int value, const Subdomain& sub);
long long SumOverProcesses(long long value, const Subdomain& sub);
// values[0 .. n-1] summed entry by entry over all processes, in place (exact
// where every entry is non-zero on one process at most).
void SumOverProcesses(double* values, int n, const Subdomain& sub);

// The owner of element e sends its values of the fields to every process,
// which stores them at e (a report of one element on process 0).
void BroadcastElement(Subdomain& sub, int e, std::initializer_list<Array1<double>*> fields,
                      std::initializer_list<Array1<int>*> codes = {});

}  // namespace vhd
