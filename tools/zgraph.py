"""The control flow of a function as a picture (SVG): blocks one below the other in the order of the dump, edges down on the
right and up on the left, and a box around each natural loop."""
import re
from dataclasses import dataclass, field
from html import escape

NODE = re.compile(r'\s+(f\d+_\w+) \[label="((?:[^"\\]|\\.)*)"')
EDGE = re.compile(r'\s+(f\d+_\w+) -> (f\d+_\w+)(?: \[label="((?:[^"\\]|\\.)*)")?')
FUNCTION = re.compile(r'\s+label="((?:[^"\\]|\\.)*)"; node')

LINE, CHARACTER, PAD, GAP, LANE, INSET, MOST_COLUMNS, MOST_LINES, MOST_BLOCKS = 14, 7.3, 6, 20, 9, 8, 70, 14, 500


@dataclass
class Flow:
    blocks: dict = field(default_factory=dict)  # lines by name
    edges: list = field(default_factory=list)   # (from, to, label)


def unescaped(text):
    return re.sub(r"\\(.)", r"\1", text)


def read_flows(dot):
    """By function what `icdump --dot` drew."""
    flows, flow = {}, None
    for line in dot.splitlines():
        if start := FUNCTION.match(line):
            flow = flows[unescaped(start[1])] = Flow()
        elif flow and (node := NODE.match(line)):
            flow.blocks[node[1]] = [unescaped(part) for part in node[2].split("\\l") if part]
        elif flow and (edge := EDGE.match(line)):
            flow.edges.append((edge[1], edge[2], edge[3] or ""))
    return flows


def dominators(names, before):
    everything = set(names)
    found = {name: everything for name in names}
    if names:
        found[names[0]] = {names[0]}
    changed = True
    while changed:
        changed = False
        for name in names[1:]:
            sets = [found[p] for p in before[name]]
            new = (set.intersection(*sets) if sets else set()) | {name}
            if new != found[name]:
                found[name], changed = new, True
    return found


def loops(flow):
    """Header and blocks of each natural loop, larger ones first."""
    names = list(flow.blocks)
    before = {name: [] for name in names}
    for start, end, _ in flow.edges:
        before[end].append(start)
    dominate, found = dominators(names, before), {}
    for start, end, _ in flow.edges:
        if end not in dominate[start]:
            continue
        body, waiting = found.setdefault(end, {end}), [start]
        while waiting:
            name = waiting.pop()
            if name not in body:
                body.add(name)
                waiting += before[name]
    return sorted(found.items(), key=lambda item: -len(item[1]))


def shortened(lines):
    cut = [line if len(line) <= MOST_COLUMNS else line[:MOST_COLUMNS - 1] + "…" for line in lines]
    return cut if len(cut) <= MOST_LINES else cut[:MOST_LINES - 1] + [f"… {len(cut) - MOST_LINES + 1} more"]


def lanes(spans):
    """A lane for each span of (first, last), so that those that overlap have different ones; short ones are near."""
    taken, lane_of = [], {}
    for key, (low, high) in sorted(spans.items(), key=lambda item: item[1][1] - item[1][0]):
        lane = next((i for i, others in enumerate(taken) if all(high <= a or b <= low for a, b in others)), len(taken))
        if lane == len(taken):
            taken.append([])
        taken[lane].append((low, high))
        lane_of[key] = lane
    return lane_of, len(taken)


def insets(nest):
    """How far the box of each loop stands out: more than those within."""
    found = [INSET] * len(nest)
    for i in reversed(range(len(nest))):  # smaller ones first
        inner = [found[j] for j in range(i + 1, len(nest)) if nest[j][1] <= nest[i][1]]
        found[i] += max(inner, default=0)
    return found


def picture(flow):
    if len(flow.blocks) > MOST_BLOCKS:
        return f"{len(flow.blocks)} blocks: too many for a picture"
    texts = {name: shortened(lines) or [" "] for name, lines in flow.blocks.items()}
    order = {name: i for i, name in enumerate(texts)}
    tops, y = {}, GAP
    for name, lines in texts.items():
        tops[name] = y
        y += len(lines) * LINE + 2 * PAD + GAP
    bottom = {name: tops[name] + len(lines) * LINE + 2 * PAD for name, lines in texts.items()}
    width = max((len(line) for lines in texts.values() for line in lines), default=1) * CHARACTER + 2 * PAD
    nest, down, up = loops(flow), {}, {}
    box = insets(nest)
    widest = max(box, default=0)
    for i, (start, end, _) in enumerate(flow.edges):
        if order[end] != order[start] + 1:
            (down if order[end] > order[start] else up)[i] = tuple(sorted((bottom[start], tops[end])))
    down_lane, down_count = lanes(down)
    up_lane, up_count = lanes(up)
    left = (up_count + 2) * LANE + widest
    right, out = left + width, []
    for (_, body), inset in zip(nest, box):
        first, last = min(body, key=order.get), max(body, key=order.get)
        out.append(f'<rect class="loop" x="{left - inset}" y="{tops[first] - 8}" width="{width + 2 * inset}" '
                   f'height="{bottom[last] - tops[first] + 16}" rx="6"><title>loop of {len(body)} blocks</title></rect>')
    for name, lines in texts.items():
        out.append(f'<rect class="block" x="{left}" y="{tops[name]}" width="{width}" height="{bottom[name] - tops[name]}"/>')
        for i, line in enumerate(lines):
            out.append(f'<text x="{left + PAD}" y="{tops[name] + PAD + (i + 1) * LINE - 4}">{escape(line)}</text>')
    for i, (start, end, label) in enumerate(flow.edges):
        y1, y2 = bottom[start], tops[end]
        if i in down:
            x = right + widest + (down_lane[i] + 1) * LANE
            path = f"M{right} {y1 - 5} H{x} V{y2 + 5} H{right + 3}"
        elif i in up:
            x = left - widest - (up_lane[i] + 1) * LANE
            path = f"M{left} {y1 - 5} H{x} V{y2 + 5} H{left - 3}"
        else:
            x = left + width / 2
            path = f"M{x} {y1} V{y2 - 3}"
        kind = "back" if i in up else "edge"
        out.append(f'<path class="{kind}" marker-end="url(#tip)" d="{path}"><title>{escape(label)}</title></path>')
    full = right + widest + (down_count + 2) * LANE
    return (f'<svg width="{full:.0f}" height="{y}" viewBox="0 0 {full:.0f} {y}"><defs><marker id="tip" orient="auto" '
            f'markerWidth="6" markerHeight="6" refX="5" refY="3"><path d="M0 0 L6 3 L0 6 z"/></marker></defs>'
            f'{"".join(out)}</svg>')
