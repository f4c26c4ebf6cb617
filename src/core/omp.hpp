#pragma once
// Every OpenMP word of the engine lives here, so that a build without OpenMP
// still compiles and runs on one thread. Loops use VHD_OMP_FOR (static
// schedule: each iteration writes only its own entries).

#if defined(_OPENMP)
#include <omp.h>
#define VHD_PRAGMA(x) _Pragma(#x)
#define VHD_OMP_PARALLEL_FOR VHD_PRAGMA(omp parallel for schedule(static))
#define VHD_OMP_PARALLEL VHD_PRAGMA(omp parallel)
#define VHD_OMP_FOR VHD_PRAGMA(omp for schedule(static))
#define VHD_OMP_FOR_NOWAIT VHD_PRAGMA(omp for schedule(static) nowait)
#define VHD_OMP_SINGLE VHD_PRAGMA(omp single)
#define VHD_OMP_BARRIER VHD_PRAGMA(omp barrier)
#define VHD_OMP_PARALLEL_FOR_REDUCTION(op, ...) \
  VHD_PRAGMA(omp parallel for schedule(static) reduction(op : __VA_ARGS__))
// A loop of independent iterations written for vector lanes (selects, no
// early exits): evaluated several iterations at a time.
#define VHD_OMP_SIMD VHD_PRAGMA(omp simd)
#define VHD_OMP_PARALLEL_FOR_SIMD VHD_PRAGMA(omp parallel for simd schedule(static))
#define VHD_OMP_PARALLEL_FOR_SIMD_REDUCTION(op, ...) \
  VHD_PRAGMA(omp parallel for simd schedule(static) reduction(op : __VA_ARGS__))
#else
#define VHD_OMP_PARALLEL_FOR
#define VHD_OMP_PARALLEL
#define VHD_OMP_FOR
#define VHD_OMP_FOR_NOWAIT
#define VHD_OMP_SINGLE
#define VHD_OMP_BARRIER
#define VHD_OMP_PARALLEL_FOR_REDUCTION(op, ...)
#define VHD_OMP_SIMD
#define VHD_OMP_PARALLEL_FOR_SIMD
#define VHD_OMP_PARALLEL_FOR_SIMD_REDUCTION(op, ...)
#endif

namespace vhd {

inline int OmpMaxThreads() {
#if defined(_OPENMP)
  return omp_get_max_threads();
#else
  return 1;
#endif
}
inline int OmpThreadNum() {
#if defined(_OPENMP)
  return omp_get_thread_num();
#else
  return 0;
#endif
}
inline int OmpNumProcs() {
#if defined(_OPENMP)
  return omp_get_num_procs();
#else
  return 1;
#endif
}
inline void OmpSetThreads(int n) {
#if defined(_OPENMP)
  omp_set_num_threads(n);
#else
  (void)n;
#endif
}

}  // namespace vhd
