# SPDX-License-Identifier: MIT
"""The rows of the report: the work, its sizes, which benchmarks are ours, the peers' and the limit's, and the goals.

Names of benchmarks have {} where the size stands. A goal is one number, or one for each size with None where there is
none: how many times as fast as the peer we want to be, or at most which part of its time where the row says `share`.
"""
import dataclasses
import typing


@dataclasses.dataclass(frozen=True)
class Peer:
    name: str
    benchmark: str
    goal: typing.Any = None
    share: bool = False  # ours over the peer's time, whole calls, and the goal is the most


@dataclasses.dataclass(frozen=True)
class Row:
    section: str
    work: str
    program: str
    ours: str
    peers: tuple = ()
    sizes: tuple = ("",)
    drawn: tuple = ()  # further sizes, for the picture alone
    labels: tuple = ()  # of the sizes, where their numbers do not tell
    unit: str = "Msamples/s"  # or "time" for that of a call, or the name of a counter
    most: typing.Any = None  # the goal of a time in seconds, or of a counter
    clock: str = "cpu"  # or "wall", for work on several threads
    picture: str = ""

    def names(self, peers=True):
        """Every benchmark that the row needs, or those of ours alone."""
        patterns = [self.ours, *(peer.benchmark for peer in self.peers if peers)]
        return [pattern.replace("{}", str(size)) for pattern in patterns for size in (*self.sizes, *self.drawn)]


def goal_at(goal, place):
    return goal[place] if isinstance(goal, tuple) else goal


M = 1 << 20


def _spectra():
    program, row = "spectrum_bench", lambda *a, **k: Row("spectra", *a, **k)
    points, drawn = (256, 1024, 4096, 65536), (16384, 262144)
    yield row("windowed FFT of one array, 50 % overlap", program, "lumra_windowed_fft/{}", (
        Peer("MKL's transforms alone", "mkl_transforms_alone/{}", (0.72, 0.70, 0.68, 0.66)),
        Peer("FFTW with VOLK", "fftw_with_volk/{}"),
        Peer("liquid-dsp", "liquid_periodogram/{}"),
    ), points, drawn, picture="spectra")  # fmt: skip
    yield row("the same as an accumulator, one thread", program, "lumra_accumulator/{}/1/process_time/real_time", (
        Peer("the windowed FFT", "lumra_windowed_fft/{}", 0.97),
    ), points, drawn)  # fmt: skip
    yield row("the same as an accumulator, two threads", program, "lumra_accumulator/{}/2/process_time/real_time", (
        Peer("one thread", "lumra_accumulator/{}/1/process_time/real_time", 1.9),
        Peer("two accumulators side by side", "lumra_accumulators_side_by_side/{}/real_time"),
    ), points, clock="wall")  # fmt: skip
    for what, name in (("saving", "saved"), ("merging", "merged")):
        yield row(f"{what} an accumulator", program, f"lumra_accumulator_{name}/{{}}", (
            Peer("adding 1M samples", "lumra_accumulator/{}/1/process_time/real_time", 0.01, share=True),
        ), (1024, 4096), unit="time")  # fmt: skip
    yield row("a session call on 16 samples, all prepared", program, "lumra_call_of_16_samples", unit="time", most=100e-9)


def _elements():
    row = lambda *a, **k: Row("elements", *a, **k)  # noqa: E731
    clocked = "/{}/process_time/real_time"
    sizes, drawn = (4096, 65536, 4 * M), (1024, 16384, 524288)

    def older(work, name, *peers, sizes=sizes, drawn=drawn):
        named = tuple(Peer(title, f"{name}/{who}{clocked}", goal) for title, who, goal in peers)
        return row(work, "vector_bench", f"{name}/lumra{clocked}", named, sizes, drawn, picture="elements")

    yield older("complex quotients", "divide", ("VOLK", "volk", (1.5, None, 1.3)), ("reading and writing", "limit", None))
    yield older("squared magnitudes", "magnitude_squared", ("VOLK", "volk", (1.6, None, 1.0)))
    yield older("magnitudes", "magnitude", ("VOLK", "volk", (1.0, None, 1.0)), ("reading and writing", "limit", None))
    yield older("logarithms of powers", "log_of_power", ("a VOLK chain", "volk", (1.5, None, 1.5)))
    yield older("RMS of I/Q", "rms", ("VOLK", "volk", (2.8, None, 1.0)), ("MKL's dot product", "mkl_dot", (1.0, None, 1.0)),
                ("reading", "limit", None))  # fmt: skip
    yield older("polynomial of degree 8", "polynomial", ("Eigen, fused", "eigen", (0.85, None, None)))
    yield older("table lookup", "lookup", ("a scalar loop", "scalar", (3, 3, None)))  # 4M on two threads: below
    yield row("table lookup of 4M elements, two threads", "vector_bench", f"lookup/lumra/{4 * M}/process_time/real_time", (
        Peer("one thread", "lookup/lumra_in_pieces/process_time/real_time", 1.8),
    ), clock="wall")  # fmt: skip
    evm = "error_vector_bench"
    yield row("error vectors", evm, "evm_lumra/{}", (
        Peer("VOLK", "evm_volk/{}"), Peer("MKL in two passes", "evm_mkl_two_passes/{}"),
    ), (16384, M))  # fmt: skip
    yield row("all figures of error vectors, open interface", evm, "figures_lumra/{}", (
        Peer("a VOLK chain", "figures_volk/{}", (1.5, 1.4)),
    ), (16384, M))  # fmt: skip
    for work, name in (("quotients", "divide"), ("magnitudes", "magnitude"), ("powers", "power"),
                       ("logarithms of powers", "log2_power"), ("polynomial of degree 8", "polynomial"),
                       ("table lookup", "lookup")):  # fmt: skip
        yield row(f"{work}, open interface, single precision", "open_elementwise_bench", f"{name}/single{clocked}", (
            # The older logarithm is right to 3e-5, this one to 2 units in the last place: no goal.
            Peer("the older function", f"{name}/older{clocked}", None if name == "log2_power" else 1.0),
        ), (4096, 4 * M))  # fmt: skip
        yield row(f"{work}, open interface, two threads", "open_elementwise_bench", f"{name}/single_two_threads{clocked}", (
            Peer("one thread", f"{name}/single{clocked}", 1.8),
        ), (4 * M,), clock="wall")  # fmt: skip
    yield row("polynomial of degree 8, open interface", "open_elementwise_bench", f"polynomial/single{clocked}", (
        Peer("Eigen, fused", f"polynomial/eigen{clocked}", (1.0, None)),
    ), (4096, 4 * M))  # fmt: skip
    for kind in ("f32", "cf32", "f64", "cf64"):
        yield row(f"levels of {kind}", "open_level_bench", f"level/{kind}/{{}}/real_time",
                  (Peer("reading", f"read/{kind}/{{}}/real_time"),), (16384, 8 * M))  # fmt: skip
        yield row(f"levels of {kind}, two threads", "open_level_bench", f"level on two threads/{kind}/{{}}/real_time",
                  (Peer("one thread", f"level/{kind}/{{}}/real_time"),), (8 * M,), clock="wall")  # fmt: skip


def _transforms():
    row = lambda *a, **k: Row("transforms", *a, **k)  # noqa: E731
    for work, kind, goals in (("real FFT, half spectrum", "real", (0.97, 0.97, None)),
                              ("complex FFT", "complex", (1.0, 1.0, None))):  # fmt: skip
        yield row(f"{work}, open interface", "open_transform_bench", f"{kind}/forward/lumra/{{}}", (
            Peer("MKL alone", f"{kind}/forward/mkl/{{}}", goals),
        ), (1024, 65536, M), (256, 4096, 16384, 262144), picture="transforms")  # fmt: skip
    toolkit, drawn = "toolkit_bench", (4096, 16384, M)
    yield row("real FFT, all bins", toolkit, "fft<float>/{}", (
        Peer("MKL alone, which writes half", "fft_mkl<float>/{}", 0.85), Peer("FFTW, half", "fft_fftw<float>/{}"),
    ), (1024, 65536), drawn, picture="transforms")  # fmt: skip
    yield row("complex FFT", toolkit, "fft<cf32>/{}", (
        Peer("MKL alone", "fft_mkl<cf32>/{}"), Peer("FFTW", "fft_fftw<cf32>/{}"),
    ), (1024, 65536), drawn, picture="transforms")  # fmt: skip
    yield row("power spectrum of real samples", toolkit, "power_spectrum<float>/{}",
              (Peer("MKL alone", "fft_mkl<float>/{}", 0.86),), (1024, 65536))  # fmt: skip
    yield row("a call of 16 points, toolkit", toolkit, "fft<cf32>/{}", (Peer("MKL alone", "fft_mkl<cf32>/{}"),), (16,),
              unit="time", most=35e-9)  # fmt: skip
    yield row("a call of 16 points, open interface", "open_transform_bench", "complex/forward/lumra/{}",
              (Peer("MKL alone", "complex/forward/mkl/{}"),), (16,), unit="time")  # fmt: skip


def _filters():
    row = lambda *a, **k: Row("filters", *a, **k)  # noqa: E731
    yield row("Fourier convolution of 100,000 by 5,000, toolkit", "toolkit_bench", "convolution<float>/100000/5000/1",
              (Peer("its transforms", "three_transforms/100000/5000/105000", 0.85),))  # fmt: skip
    yield row("direct convolution of 100,000 by 64, toolkit", "toolkit_bench", "convolution<float>/100000/64/0",
              (Peer("bare saxpy", "bare_axpy/100000/64"),))  # fmt: skip
    taps = (16, 50, 300, 1000, 5000)
    for kind, samples in (("f32", "real"), ("cf32", "complex")):
        for n in (1000, 10_000, 100_000, 1_000_000):
            yield row(f"convolution of {n} {samples} samples", "open_scipy.py", f"convolve_{kind}/lumra/{n}x{{}}",
                      (Peer("SciPy's oaconvolve", f"convolve_{kind}/scipy/{n}x{{}}", 3),), taps)  # fmt: skip
    yield row("FIR filter, complex, by taps", "open_filter_bench", "complex_fir/automatic/{}/16384", (
        Peer("liquid-dsp's filter", "liquid_fir/{}/16384", 1),
    ), (16, 64, 128, 1000), (32,), picture="filters")  # fmt: skip
    yield row("FIR filter, real, by taps", "open_filter_bench", "real_fir/automatic/{}/16384", (
        Peer("liquid-dsp's filter", "liquid_fir_real/{}/16384", 1),
    ), (16, 64, 128), picture="filters")  # fmt: skip
    yield row("FIR filter in calls as long as its taps", "open_filter_bench", "complex_fir/automatic/{}/{}", (
        Peer("liquid-dsp's by transforms", "liquid_blocks/{}", 1),
    ), (128, 1000, 5000))  # fmt: skip
    for kind, samples, goal in (("f32", "real", 4), ("cf32", "complex", 12)):
        yield row(f"FIR filter in one call, {samples}, by taps", "open_scipy.py", f"fir_{kind}/lumra/{{}}",
                  (Peer("SciPy's lfilter", f"fir_{kind}/scipy/{{}}"),), (16, 64, 1000))  # fmt: skip
        yield row(f"recursive filter of order 4, {samples}, open interface", "open_scipy.py", f"iir_{kind}/lumra",
                  (Peer("SciPy's lfilter", f"iir_{kind}/scipy", goal),))  # fmt: skip
    for kind, samples in (("ss", "real"), ("cs", "complex"), ("dd", "real double"), ("zd", "complex double")):
        yield row(f"recursive filter of order 4, {samples}, toolkit", "toolkit_filters_bench", f"{kind}_iir/loud",
                  (Peer("a plain loop", f"{kind}_loop/loud", 1.0 if kind in ("ss", "cs") else None),))  # fmt: skip
        yield row(f"the tail of the same, {samples}", "toolkit_filters_bench", f"{kind}_iir/tail",
                  (Peer("loud samples", f"{kind}_iir/loud"),))  # fmt: skip
    yield row("5-term window on 1M samples, toolkit", "toolkit_bench", f"window<double>/{M}/6",
              (Peer("reading and writing", f"window_limit/{M}", 0.9),))  # fmt: skip
    for window in ("hann", "flattop", "kaiser"):
        yield row(f"window: {window}, 65536 values", "open_scipy.py", f"window_{window}/lumra",
                  (Peer("SciPy", f"window_{window}/scipy"),))  # fmt: skip


RATES = ((10, 3), (10, 7.68), (30.72, 7.68), (10, 9.99), (10, 0.1), (1, 3), (0.0441, 0.048), (10, 10 / 1.37))


def _rates():
    program, row = "open_resampler_bench", lambda *a, **k: Row("rates", *a, **k)
    labels = tuple(f"{one:.6g} → {other:.4g}" for one, other in RATES)
    # The benchmarks' names have the rates in MHz, rounded, and the place in the same list.
    tails = tuple(f"{one:.6f}_to_{other:.6f}/{k}" for k, (one, other) in enumerate(RATES))
    for tail, label in zip(tails, labels):
        yield row(f"{label} MHz, 100 dB", program, "lumra_cf32/{}/100/1/1", (
            Peer("soxr HQ", "soxr_hq/{}/4", 1.5), Peer("liquid-dsp, 100 dB", "liquid/{}/100"),
        ), (tail,), labels=("",), picture="rates")  # fmt: skip
        yield row(f"{label} MHz, 120 dB", program, "lumra_cf32/{}/120/1/1", (Peer("soxr VHQ", "soxr_vhq/{}/6", 1.0),),
                  (tail,), labels=("",), picture="rates")  # fmt: skip
        yield row(f"{label} MHz, 150 dB, double precision", program, "lumra_cf64/{}/150/1/1", (), (tail,), labels=("",))
        two = "lumra_cf32_two_rows/{}/100/2/%d/process_time/real_time"
        yield row(f"{label} MHz, two channels on two threads", program, two % 2, (Peer("one thread", two % 1, 1.8),), (tail,),
                  labels=("",), clock="wall")  # fmt: skip
    taps = "32 taps by 64 phases, ratio 1.37"
    yield row(f"{taps}, toolkit", "resample_bench", "resample_c/linear", (
        Peer("soxr MQ", "soxr<cf32>", 2.3), Peer("liquid-dsp, arbitrary", "liquid", 3.7),
        Peer("libsamplerate, fastest", "libsamplerate"),
    ))  # fmt: skip
    yield row(f"{taps}, double precision, toolkit", "resample_bench", "resample_z/linear",
              (Peer("soxr VHQ", "soxr<cf64>"),))  # fmt: skip
    yield row(f"{taps}, bandwidth scaled, double precision, toolkit", "resample_bench", "resample_z/stretched",
              (Peer("not scaled", "resample_z/linear"),))  # fmt: skip
    yield row(f"{taps}, bandwidth scaled, toolkit", "resample_bench", "resample_c/stretched",
              (Peer("liquid-dsp, arbitrary", "liquid", 1.6),))  # fmt: skip


def _channels():
    program, row = "open_channelizer_bench", lambda *a, **k: Row("channels", *a, **k)
    name = "8 channels of {} of the rate"
    yield row(name.format("1/16"), program, "channelize/1000000/1/process_time", (
        Peer("their block's transforms", "bare_transforms", 0.8), Peer("eight resamplers", "separate_resamplers/1000000", 4),
    ))  # fmt: skip
    for rate, part in ((1000001, "an odd part"), (25000, "1/640")):
        yield row(name.format(part), program, f"channelize/{rate}/1/process_time",
                  (Peer("eight resamplers", f"separate_resamplers/{rate}"),))  # fmt: skip
    yield row("FFT resampler, one block of 65536, 8 channels", "services_bench", "resampler_block_step",
              (Peer("its transforms", "mkl_transforms_alone"),), unit="time")  # fmt: skip


def _algebra():
    row = lambda *a, **k: Row("algebra", *a, **k)  # noqa: E731
    filters, sizes = "toolkit_filters_bench", (2, 8, 100)
    yield row("least squares, 200 by 50, toolkit", filters, "least_squares/toolkit", (
        Peer("MKL's sgelsd", "least_squares/mkl", 1.0),
    ), unit="time")  # fmt: skip
    yield row("least squares, 200 by 50, open interface", filters, "least_squares/open", (
        Peer("MKL's sgelsd", "least_squares/mkl", 5),
    ), unit="time")  # fmt: skip
    yield row("matrix product, 512", filters, "product/lumra", (Peer("MKL's sgemm", "product/mkl", 1.0),), unit="time")
    for kind, prefix in (("float", "s"), ("cf32", "c")):
        yield row(f"decimation with averaging of 4M {kind}, by factors", filters,
                  f"average<{kind}, &qsRFPELTA_{prefix}DecimateH>/{4 * M}/{{}}", (Peer("reading", f"read<{kind}>/{4 * M}"),),
                  sizes)  # fmt: skip
        yield row(f"RMS of 4M {kind}, toolkit", filters, f"root_mean_square<{kind}, float, &qsRFPELTA_{prefix}RMSH>/{4 * M}",
                  (Peer("reading", f"read<{kind}>/{4 * M}"),))  # fmt: skip


def _services():
    program, row = "services_bench", lambda *a, **k: Row("services", *a, **k)
    yield row("FIFO between two threads, by bytes of a piece", program, "fifo_stream/{}/real_time", (
        Peer("copying in and out", "copy_in_and_out/{}/real_time"),
    ), (64, 4096), unit="Mbytes/s", clock="wall")  # fmt: skip
    yield row("two transfers of 64 bytes through a FIFO", program, "fifo_transfers_of_64_bytes", unit="time")
    yield row("array by identifier, allocated and freed", program, "array_allocate_and_free/real_time/threads:1", unit="time")
    yield row("filter found by its key among others", program, "filter_found_among/{}", (), (10, 1000, 10000), unit="time")


def _program():
    program, row = "program.py", lambda *a, **k: Row("program", *a, **k)
    work = "`lumra spectrum`, 4 GB of 16-bit integers"
    for threads, clock, goal, text in ((1, "cpu", None, "one thread"), (2, "wall", 0.8, "two threads")):
        yield row(f"{work}, {text}", program, f"spectrum/program/{threads}",
                  (Peer("the accumulator in memory", f"spectrum/accumulator/{threads}", goal),), clock=clock)  # fmt: skip
    yield row(f"{work}, memory", program, "spectrum/program/2", unit="resident_mb", most=100)


def _python():
    program, row = "python/beside_scipy.py", lambda *a, **k: Row("python", *a, **k)

    def beside(work, name, peer, goal, sizes=("",), **more):
        slash = "/{}" if sizes != ("",) else ""
        return row(work, program, f"{name}/lumra{slash}", (Peer(peer, f"{name}/scipy{slash}", goal),), sizes, **more)

    yield beside("`spectrum`", "spectrum", "SciPy's welch", 10, (256, 1024, 4096, 65536))
    yield beside("`resample`", "resample", "SciPy's resample_poly", 10, ("3x10", "96x125", "147x160", "3x1"),
                 labels=("3:10", "96:125", "147:160", "3:1"))  # fmt: skip
    yield beside("`lfilter` of order 4, real", "lfilter_float32", "SciPy", 1.5)
    yield beside("`lfilter` of order 4, complex", "lfilter_complex64", "SciPy", 4)
    for transform in ("fft", "rfft"):
        yield beside(f"`{transform}`", transform, "SciPy", 1, (256, 1000, 1009, 4096, 65536))
    yield beside("`convolve`", "convolve", "SciPy's oaconvolve", 3, ("10000x50", "100000x1000", "1000000x5000"))
    for name in ("magnitude", "power", "fft"):
        yield row(f"`{name}` of 1000 samples, above the C function", program, f"call/{name}/above", unit="time", most=3e-6)
    yield row("`spectrum`, threads=2", program, "threads/two", (Peer("one thread", "threads/one", 1.8),), clock="wall")
    yield row("two Python threads", program, "threads/both", (Peer("one after another", "threads/after_another", 1.8),),
              clock="wall")  # fmt: skip
    yield row("Dask, two worker processes", program, "dask/two", (Peer("one", "dask/one", 1.7),), clock="wall")


_sections = _spectra, _elements, _transforms, _filters, _rates, _channels, _algebra, _services, _program, _python
ROWS = tuple(row for section in _sections for row in section())


def benchmarks(rows, peers=True):
    """{program: names} of everything that the rows need, in the table's order; without peers, of ours alone."""
    wanted = {}
    for row in rows:
        names = wanted.setdefault(row.program, [])
        names.extend(name for name in row.names(peers) if name not in names)
    return wanted
