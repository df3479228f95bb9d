"""Rate against loss as SVG: a line for each subject, from all runs of the search for the highest rate and its
flood."""
import math
import statistics

import tables

WIDTH, HEIGHT = 760, 420
LEFT, RIGHT, TOP, BOTTOM = 70, 40, 48, 60
COLOURS = {"service": "#2f7ed8", "analytics": "#2aa198", "daemon": "#e07b39", "bare": "#8a8a8a"}
# A grey that can be read on white and on black. The chart has no background of its own.
STYLE = ("text{font:13px sans-serif;fill:#7f7f7f}.grid{stroke:#7f7f7f;stroke-opacity:.25}"
         ".axis{stroke:#7f7f7f}polyline{fill:none;stroke-width:2}")


def draw(rates, floods):
    """`floods` may lack subjects."""
    points = {name: _points(result["probes"], floods.get(name)) for name, result in rates.items()}
    highest = max(rate for line in points.values() for rate, _ in line)
    step = _round_step(highest / 8)
    end = math.ceil(highest / step) * step
    parts = [f'<svg xmlns="http://www.w3.org/2000/svg" viewBox="0 0 {WIDTH} {HEIGHT}" role="img">',
             "<title>Reports lost, by the rate at which they are sent</title>", f"<style>{STYLE}</style>",
             *_rate_axis(end, step), *_loss_axis()]
    for number, (name, line) in enumerate(points.items()):
        parts += _line(name, line, end) + _legend(name, number)
    return "\n".join(parts + ["</svg>"]) + "\n"


def _points(runs, flood):
    """Rate and part lost, the medians of the runs that were asked for the same rate, by rate."""
    same = {"flood": [flood]} if flood else {}
    for run in runs:
        same.setdefault(run["rate"], []).append(run)
    return sorted((statistics.median(run["offered"] for run in group),
                   statistics.median(run["lost"] / run["sent"] for run in group)) for group in same.values())


def _round_step(least):
    power = 10 ** math.floor(math.log10(least))
    return next(factor * power for factor in (1, 2, 5, 10) if factor * power >= least)


def _x(rate, end):
    return LEFT + (WIDTH - LEFT - RIGHT) * rate / end


def _y(part):
    return HEIGHT - BOTTOM - (HEIGHT - TOP - BOTTOM) * part


def _rate_axis(end, step):
    for number in range(round(end / step) + 1):
        x = _x(number * step, end)
        yield f'<line class="grid" x1="{x:.1f}" y1="{_y(0):.1f}" x2="{x:.1f}" y2="{_y(1):.1f}"/>'
        yield f'<text x="{x:.1f}" y="{_y(0) + 20:.1f}" text-anchor="middle">{number * step:,.0f}</text>'
    yield f'<line class="axis" x1="{LEFT}" y1="{_y(0):.1f}" x2="{WIDTH - RIGHT}" y2="{_y(0):.1f}"/>'
    middle = (LEFT + WIDTH - RIGHT) / 2
    yield f'<text x="{middle}" y="{HEIGHT - 14}" text-anchor="middle">reports sent a second</text>'


def _loss_axis():
    for tenth in range(0, 11, 2):
        y = _y(tenth / 10)
        yield f'<line class="grid" x1="{LEFT}" y1="{y:.1f}" x2="{WIDTH - RIGHT}" y2="{y:.1f}"/>'
        yield f'<text x="{LEFT - 8}" y="{y + 4:.1f}" text-anchor="end">{tenth * 10} %</text>'
    yield f'<line class="axis" x1="{LEFT}" y1="{_y(0):.1f}" x2="{LEFT}" y2="{_y(1):.1f}"/>'
    middle = (_y(0) + _y(1)) / 2
    yield f'<text transform="translate(16 {middle}) rotate(-90)" text-anchor="middle">lost</text>'


def _line(name, line, end):
    colour = COLOURS[name]
    places = [(_x(rate, end), _y(part)) for rate, part in line]
    corners = " ".join(f"{x:.1f},{y:.1f}" for x, y in places)
    return [f'<polyline stroke="{colour}" points="{corners}"/>',
            *(f'<circle cx="{x:.1f}" cy="{y:.1f}" r="3" fill="{colour}"/>' for x, y in places)]


def _legend(name, number):
    x, y = LEFT + 340 * (number % 2), 16 + 18 * (number // 2)
    text = tables.TITLES[name].replace("`", "")
    return [f'<line stroke="{COLOURS[name]}" stroke-width="3"'
            f' x1="{x}" y1="{y - 4}" x2="{x + 22}" y2="{y - 4}"/>',
            f'<text x="{x + 30}" y="{y}">{text}</text>']
