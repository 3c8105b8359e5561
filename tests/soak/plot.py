"""Draws what was sampled over time as an SVG: one strip a figure, the service's starts as lines."""

WIDTH, STRIP, LEFT, TOP = 860, 96, 170, 46
FIGURES = [
    ("memory", "memory, MiB"),
    ("descriptors", "descriptors"),
    ("threads", "threads"),
    ("marks", "marks"),
    ("store", "store, MiB"),
    ("entries", "entries on disk"),
]


def ticks(minutes):
    step = next(s for s in (1, 2, 5, 10, 20, 30, 60, 120, 240, 480) if minutes / s <= 12)
    return range(0, int(minutes) + 1, step)


def strip(samples, key, label, top, scale):
    values = [(second, value[key]) for second, value in samples if value.get(key) is not None]
    most = max([value for _, value in values] + [1])
    height = STRIP - 30
    points, lines, last = [], [], None
    for second, value in values:
        if last is not None and second - last > 5:  # nothing ran
            lines.append(points)
            points = []
        points.append(f"{LEFT + second * scale:.1f},{top + height * (1 - value / most):.1f}")
        last = second
    lines.append(points)
    drawn = "".join(f'<polyline points="{" ".join(line)}"/>' for line in lines if line)
    final = values[-1][1] if values else 0
    return (
        f'<text x="{LEFT - 12}" y="{top + 14}" text-anchor="end">{label}</text>'
        f'<text x="{LEFT - 12}" y="{top + 31}" text-anchor="end" class="less">most {most:.4g}</text>'
        f'<text x="{LEFT - 12}" y="{top + 47}" text-anchor="end" class="less">last {final:.4g}</text>'
        f'<path class="axis" d="M{LEFT},{top + height}H{WIDTH - 20}"/>{drawn}'
    )


def write(path, title, samples, starts):
    length = max(samples[-1][0], 1)
    scale = (WIDTH - 20 - LEFT) / length
    height = TOP + STRIP * len(FIGURES) + 20
    body = [
        f'<path class="start" d="M{LEFT + second * scale:.1f},{TOP - 4}V{height - 40}"/>' for second in starts
    ]
    for number, (key, label) in enumerate(FIGURES):
        body.append(strip(samples, key, label, TOP + number * STRIP, scale))
    for minute in ticks(length / 60):
        body.append(
            f'<text class="less" text-anchor="middle" x="{LEFT + minute * 60 * scale:.1f}" y="{height - 14}">'
            f"{minute} min</text>"
        )
    style = (
        "text{font:13px sans-serif;fill:#24292f}.less{font-size:11px;fill:#57606a}"
        "polyline{fill:none;stroke:#0969da;stroke-width:1.5}.axis{stroke:#d0d7de;fill:none}"
        ".start{stroke:#cf222e;stroke-width:.6;stroke-opacity:.45}"
    )
    with open(path, "w") as file:
        file.write(
            f'<svg xmlns="http://www.w3.org/2000/svg" viewBox="0 0 {WIDTH} {height}" width="{WIDTH}">'
            f'<style>{style}</style><rect width="100%" height="100%" fill="#fff"/>'
            f'<text x="{LEFT}" y="22">{title}</text>' + "\n".join(body) + "</svg>\n"
        )
