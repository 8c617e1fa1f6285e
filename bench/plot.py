"""Time over accounts, both in powers of ten, as an SVG."""

import math

WIDTH, HEIGHT, LEFT, TOP, RIGHT, BOTTOM = 860, 560, 70, 30, 250, 50
COLOURS = ["#1b6ca8", "#d1495b", "#3a7d44", "#edae49", "#6a4c93", "#00798c", "#8d6a9f", "#7a7a7a", "#c06014", "#4d908e"]


def svg(series: dict[str, dict[int, float]]) -> str:
    """`series`: by name, nanoseconds by number of accounts."""
    sizes = [size for line in series.values() for size in line]
    times = [time for line in series.values() for time in line.values()]
    left, right = math.floor(math.log10(min(sizes))), math.ceil(math.log10(max(sizes)))
    low, high = math.floor(math.log10(min(times))), math.ceil(math.log10(max(times)))

    def x(size: float) -> float:
        return LEFT + (math.log10(size) - left) / (right - left) * (WIDTH - LEFT - RIGHT)

    def y(time: float) -> float:
        return HEIGHT - BOTTOM - (math.log10(time) - low) / (high - low) * (HEIGHT - TOP - BOTTOM)

    parts = [f'<svg xmlns="http://www.w3.org/2000/svg" width="{WIDTH}" height="{HEIGHT}" '
             'font-family="sans-serif" font-size="12">', '<rect width="100%" height="100%" fill="white"/>']
    for power in range(left, right + 1):
        at = x(10 ** power)
        parts.append(f'<path d="M{at:.1f} {TOP}V{HEIGHT - BOTTOM}" stroke="#ddd"/>')
        parts.append(f'<text x="{at:.1f}" y="{HEIGHT - BOTTOM + 18}" text-anchor="middle">{10 ** power:,}</text>')
    for power in range(low, high + 1):
        at = y(10 ** power)
        parts.append(f'<path d="M{LEFT} {at:.1f}H{WIDTH - RIGHT}" stroke="#ddd"/>')
        parts.append(f'<text x="{LEFT - 6}" y="{at + 4:.1f}" text-anchor="end">{unit(power)}</text>')
    parts.append(f'<text x="{(LEFT + WIDTH - RIGHT) / 2}" y="{HEIGHT - 12}" text-anchor="middle">accounts</text>')
    for number, (name, line) in enumerate(series.items()):
        colour = COLOURS[number % len(COLOURS)]
        points = " ".join(f"{x(size):.1f},{y(time):.1f}" for size, time in sorted(line.items()))
        dashes = "" if name.endswith("own") else ' stroke-dasharray="5 3"'
        parts.append(f'<polyline points="{points}" fill="none" stroke="{colour}" stroke-width="2"{dashes}/>')
        key = TOP + 12 + 20 * number
        parts.append(f'<path d="M{WIDTH - RIGHT + 16} {key - 4}h24" stroke="{colour}" stroke-width="2"{dashes}/>')
        parts.append(f'<text x="{WIDTH - RIGHT + 46}" y="{key}">{name}</text>')
    return "\n".join(parts + ["</svg>", ""])


def unit(power: int) -> str:
    """10 to the `power` nanoseconds."""
    name = ["ns", "µs", "ms", "s"][min(power // 3, 3)] if power >= 0 else "ns"
    return f"{10 ** (power - 3 * min(max(power, 0) // 3, 3)):,} {name}"
