// Least squares while LAPACK refuses or does not converge. SPDX-License-Identifier: MIT
#include "support/lapack_faults.hpp"
#include "toolkit/toolkit_test.hpp"

namespace {

using namespace tests;

template <class E>
void every_call_fails(decltype(&qsRFPELTA_sLSEqH) real, decltype(&qsRFPELTA_cLSEqH) complex) {
  fake_host host(fake_host::unit::elements);
  const auto solve = [=](auto... arguments) {
    if constexpr (toolkit::is_complex<E>)
      return complex(arguments...);
    else
      return real(arguments...);
  };
  matrix_of<E> a(2, 2);
  a.block()->elements[0] = a.block()->elements[3] =
      reinterpret_cast<const typename array_of<E>::element &>(noise<E>(1)[0]);
  for (const float tolerance : {0.F, 1e-6F}) {
    for (const int info : {-4, 3}) {
      for (const int n : {1, 2}) {  // asked for its sizes; computing
        array_of<E> b = filled<E>(noise<E>(2)), x(std::size_t{5}), first, second, third;
        {
          const lapack_faults::fail_at armed(n, info);
          EXPECT_EQ(info < 0 ? -20061 : -20068, solve(a.handle(), b.handle(), tolerance, x.handle(), first.handle(),
                                                      second.handle(), third.handle()));
        }
        EXPECT_EQ(n, lapack_faults::calls());
        EXPECT_EQ(0U,
                  x.elements().size() + first.elements().size() + second.elements().size() + third.elements().size());
        EXPECT_EQ(
            0, solve(a.handle(), b.handle(), tolerance, x.handle(), first.handle(), second.handle(), third.handle()));
      }
    }
  }
}

TEST(LeastSquaresFaults, EveryCallOfLapackFails) {
  every_call_fails<toolkit::s>(&qsRFPELTA_sLSEqH, &qsRFPELTA_cLSEqH);
  every_call_fails<toolkit::c>(&qsRFPELTA_sLSEqH, &qsRFPELTA_cLSEqH);
}

}  // namespace
