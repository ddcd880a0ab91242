# SPDX-License-Identifier: MIT
"""Pictures of speed over size by gnuplot, on a ground of their own, so that pages of any colour show them."""
import subprocess

import page

OURS, LIMIT = "#1f5fbf", "#808080"
PEERS = ("#d9730d", "#2e8b57", "#a0408f")
WIDTH, PANEL_HEIGHT = 900, 300


def curves(row, timings):
    """(title, [(size, Msamples/s)]) of ours and the peers, where they were measured."""
    own = timings.get(row.program, {})
    for title, pattern in (("Lumra Algo", row.ours), *((peer.name, peer.benchmark) for peer in row.peers)):
        sizes = sorted((*row.sizes, *row.drawn))
        names = {size: pattern.replace("{}", str(size)) for size in sizes}
        if points := [(size, own[name].speed(row.clock) / 1e6) for size, name in names.items() if name in own]:
            yield title, points


def _data(name, lines):
    return f"${name} << EOD\n" + "\n".join(lines) + "\nEOD\n"


def _quoted(text):
    return "'" + text.replace("'", "’").replace("`", "") + "'"


def _style(place, title):
    if place == 0:
        return f"lc rgb '{OURS}' lw 3 pt 7 ps 0.7"
    limit = any(word in title for word in ("alone", "reading"))
    return f"lc rgb '{LIMIT if limit else PEERS[(place - 1) % len(PEERS)]}' lw 2 {'dt 2 ' if limit else ''}pt 5 ps 0.5"


def _ticks(least, most):
    """A few in each decade: logarithmic axes name whole decades alone."""
    return ", ".join(str(step * 10**power) for power in range(6) for step in (1, 2, 5) if least <= step * 10**power <= most)


def _panel(k, row, timings, size_name):
    drawn = list(curves(row, timings))
    sizes = sorted({size for _, points in drawn for size, _ in points})
    data = "".join(_data(f"p{k}_{n}", (f"{x} {y}" for x, y in points)) for n, (_, points) in enumerate(drawn))
    plots = ", ".join(f"$p{k}_{n} with linespoints {_style(n, title)} title {_quoted(title)}"
                      for n, (title, _) in enumerate(drawn))  # fmt: skip
    tics = ", ".join(f"'{page.size_text(size)}' {size}" for size in sizes)
    least, most = (pick(y for _, points in drawn for _, y in points) for pick in (min, max))
    return f"""{data}set title {_quoted(row.work)}
set xlabel '{size_name}'
set xtics ({tics})
set xrange [{sizes[0] / 1.15}:{sizes[-1] * 1.15}]
set ytics ({_ticks(least / 1.3, most * 1.3)})
set yrange [{least / 1.3}:{most * 1.3}]
plot {plots}
"""


def _draw(path, rows, script):
    height = PANEL_HEIGHT * rows + 20
    subprocess.run(["gnuplot"], input=f"""set terminal svg size {WIDTH},{height} dynamic background 'white' font 'sans,12'
set encoding utf8
set output '{path}'
set border lc rgb '#303030'
set grid lc rgb '#d8d8d8'
{script}""", text=True, check=True)  # fmt: skip


def over_size(path, rows, timings, size_name):
    """A panel for each row that was measured, two side by side."""
    rows = [row for row in rows if any(curves(row, timings))]
    if not rows:
        return
    columns = 1 if len(rows) == 1 else 2
    height = -(-len(rows) // columns)
    panels = "".join(_panel(k, row, timings, size_name) for k, row in enumerate(rows))
    _draw(path, height, f"""set multiplot layout {height},{columns}
set logscale xy
set ylabel 'million samples a second'
set key outside bottom center horizontal samplen 1.5 width -1 font ',11'
set bmargin 6
{panels}unset multiplot
""")


def bars(path, rows, timings):
    """A group of bars for each conversion: rows whose works differ behind the comma are drawn beside each other."""
    groups = {}
    for row in rows:
        conversion, which = row.work.split(" MHz, ", 1)
        for title, points in curves(row, timings):
            groups.setdefault(conversion, {})[f"Lumra Algo, {which}" if title == "Lumra Algo" else title] = points[0][1]
    if not groups:
        return
    titles = sorted(dict.fromkeys(title for group in groups.values() for title in group), key=lambda t: not t.startswith("Lumra"))
    data = _data("rates", (" ".join([f'"{conversion}"', *(str(group.get(title, "NaN")) for title in titles)])
                           for conversion, group in groups.items()))  # fmt: skip
    colours = {title: f"lc rgb '{colour}'" for title, colour in zip(titles, _bar_colours(titles))}
    plots = ", ".join(f"$rates using {k + 2}:xtic(1) {colours[title]} title {_quoted(title)}" for k, title in enumerate(titles))
    _draw(path, 1.3, f"""{data}set style data histograms
set style histogram clustered gap 1
set style fill solid 0.9 noborder
set logscale y
set yrange [1:*]
set ylabel 'million complex input samples a second'
set xlabel 'change of the sample rate, MHz'
set key outside bottom center horizontal
set bmargin 6
plot {plots}
""")


def _bar_colours(titles):
    ours, peers = iter((OURS, "#7fa8e0")), iter(PEERS)
    return [next(ours if title.startswith("Lumra") else peers) for title in titles]
