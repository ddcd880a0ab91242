// Horner's scheme in Eigen, with all instructions of the machine. SPDX-License-Identifier: MIT
#include <Eigen/Core>

#include "peer_eigen.hpp"

void eigen_polynomial(const float *x, const float *c, float *out, std::size_t n) {
  const auto count = static_cast<Eigen::Index>(n);
  const Eigen::Map<const Eigen::ArrayXf> v(x, count);
  Eigen::Map<Eigen::ArrayXf>(out, count) =
      (((((((c[8] * v + c[7]) * v + c[6]) * v + c[5]) * v + c[4]) * v + c[3]) * v + c[2]) * v + c[1]) * v + c[0];
}
