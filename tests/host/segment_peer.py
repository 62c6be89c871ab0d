"""Segmentation by tiles in its plain form: queues, ordered maps and lists, a step at a time."""

import collections
import struct

TINY = 2.2250738585072014e-308
INT_MOST, INT_LEAST = 2147483647, -2147483648
WALK = ((0, -1), (-1, 0), (1, 0), (0, 1))  # up, left, right, down


def as_float(value):
    """A number rounded to single precision."""
    return struct.unpack("f", struct.pack("f", value))[0]


def cut(value):
    """A number without its fraction, as a 32-bit integer."""
    if value != value:
        return INT_LEAST
    return int(max(INT_LEAST, min(INT_MOST, value)))


class Image:
    """`bands` are lists of rows; `excluded` a list of rows of the pixels without a valid value."""

    def __init__(self, bands, excluded):
        self.bands, self.excluded = bands, excluded
        self.height, self.width = len(bands[0]), len(bands[0][0])

    def sobel(self):
        """Gradients and the pixels that have none. The outer ring has those of its neighbours inside."""
        width, height = self.width, self.height
        if width < 3 or height < 3:
            return [[0.0] * width for _ in range(height)], [[True] * width for _ in range(height)]
        rows, holes = [], []
        for y in range(height):
            rows.append([])
            holes.append([])
            for x in range(width):
                cx, cy = min(max(x, 1), width - 2), min(max(y, 1), height - 2)
                most = TINY
                for band in self.bands:
                    (tl, t, tr), (l, _, r), (bl, b, br) = (band[cy + d][cx - 1:cx + 2] for d in (-1, 0, 1))
                    gx = 2 * (l - r) + tl + bl - tr - br
                    gy = 2 * (t - b) + tl + tr - bl - br
                    size = abs(gx) + abs(gy)
                    if not size < most:
                        most = float(size)
                rows[-1].append(most)
                holes[-1].append(any(self.excluded[cy + dy][cx + dx] for dy in (-1, 0, 1) for dx in (-1, 0, 1)))
        return rows, holes

    def intensity(self):
        weight = 1 / len(self.bands)
        rows = []
        for y in range(self.height):
            rows.append([])
            for x in range(self.width):
                total = 0.0
                for band in self.bands:
                    total += band[y][x] * weight
                rows[-1].append(total)
        return rows, self.excluded


def neighbours(p, width, height):
    x, y = p % width, p // width
    for dx, dy in WALK:
        if 0 <= x + dx < width and 0 <= y + dy < height:
            yield p + dy * width + dx


def flood(levels, excluded, width, height):
    """Labels from 1 on, and how many there are."""
    INIT, MASK, OUT = -1, -2, -3
    labels = [OUT if hole else INIT for hole in excluded]
    distance = [0] * len(levels)
    order = sorted((p for p in range(len(levels)) if not excluded[p]), key=lambda p: levels[p])
    count, i = 0, 0
    while i < len(order):
        j = i
        while j < len(order) and levels[order[j]] == levels[order[i]]:
            j += 1
        level, queue = order[i:j], collections.deque()
        for p in level:
            labels[p] = MASK
            for q in neighbours(p, width, height):
                if labels[q] >= 0:
                    distance[p] = 1
                    queue.append(p)
        step = 1
        queue.append(None)
        while True:
            p = queue.popleft()
            if p is None:
                if not queue:
                    break
                queue.append(None)
                step += 1
                p = queue.popleft()
            least, label = INT_MOST, 0
            for q in neighbours(p, width, height):
                if labels[q] >= 0:
                    if distance[q] < least:
                        least = distance[q]
                        if labels[q] > 0:
                            label = labels[q]
                    elif distance[q] == least and labels[q] > 0:
                        label = labels[q]
                elif labels[q] == MASK and distance[q] == 0:
                    distance[q] = step + 1
                    queue.append(q)
            if least < step and label > 0:
                labels[p] = label
            elif labels[p] == MASK:
                labels[p] = 0
        for p in level:
            distance[p] = 0
            if labels[p] == MASK:
                count += 1
                labels[p] = count
                queue = collections.deque([p])
                while queue:
                    for r in neighbours(queue.popleft(), width, height):
                        if labels[r] == MASK:
                            labels[r] = count
                            queue.append(r)
        i = j
    assert 0 not in labels  # no pixel is left between basins
    return [max(label, 0) for label in labels], count


def adjacency(labels, excluded, width, height, columns, rows, with_zero):
    """Lengths of common borders by pair of labels, in the order in which they come first."""
    pairs = {}
    for y in range(rows):
        for x in range(columns):
            p = y * width + x
            for q in ([p + 1] if x + 1 < width else []) + ([p + width] if y + 1 < height else []):
                if excluded[p] or excluded[q] or labels[p] == labels[q]:
                    continue
                if with_zero or (labels[p] != 0 and labels[q] != 0):
                    pair = (min(labels[p], labels[q]), max(labels[p], labels[q]))
                    pairs[pair] = pairs.get(pair, 0) + 1
    return pairs


class Schedule:
    """Merges the cheapest pair of mutually nearest regions, one at a time."""

    def __init__(self, values, labels, pairs, bands, most=float("inf"), compactness=0):
        self.most, self.compactness = most, compactness
        self.area, self.mean = collections.Counter(), {}
        for p, label in enumerate(labels):
            if label:
                self.area[label] += 1
                mean = self.mean.setdefault(label, [0.0] * bands)
                for k in range(bands):
                    mean[k] += values[k][p]
        for label, mean in self.mean.items():
            self.mean[label] = [value / self.area[label] for value in mean]
        self.ids = [list(pair) for pair in pairs]
        self.length = list(pairs.values())
        self.near = {label: {} for label in self.area}
        for index, (a, b) in enumerate(self.ids):
            self.near[a][b] = self.near[b][a] = index
        self.raw, self.cost = [0.0] * len(self.ids), [0.0] * len(self.ids)
        for index in range(len(self.ids)):
            self.price(index)
        self.chosen, self.queued, self.least = set(), set(), {}
        for label in sorted(self.area):
            self.search(label)

    def price(self, index):
        a, b = self.ids[index]
        m, n = float(self.area[a]), float(self.area[b])
        total = 0.0
        for u, v in zip(self.mean[a], self.mean[b]):
            total += (u - v) * (u - v)
        self.cost[index] = m * n / (m + n) * total / self.length[index]
        if self.compactness:
            self.cost[index] /= float(self.length[index]) ** self.compactness
        if m + n > self.most:
            self.cost[index] = float("inf")

    def choose(self, label, index):
        self.least[label] = index
        (self.queued if index in self.chosen else self.chosen).add(index)

    def search(self, label):
        best, found = 2147483647.0, None
        for other in sorted(self.near[label]):
            index = self.near[label][other]
            if self.cost[index] < best:
                best, found = self.cost[index], index
        self.least.pop(label, None)
        if found is not None:
            self.choose(label, found)

    def step(self):
        if not self.queued:
            return None
        first = min(self.queued, key=lambda index: (self.cost[index], index))
        self.queued.discard(first)
        cost, (a, b) = self.cost[first], self.ids[first]
        m, n = float(self.area[a]), float(self.area[b])
        self.mean[a] = [n / (m + n) * v + m / (m + n) * u for u, v in zip(self.mean[a], self.mean[b])]
        self.area[a] += self.area[b]
        del self.near[a][b], self.near[b][a]
        for other in sorted(self.near[b]):
            index = self.near[b][other]
            del self.near[other][b]
            if other in self.near[a]:
                self.length[self.near[a][other]] += self.length[index]
            else:
                self.near[a][other] = self.near[other][a] = index
                self.ids[index] = sorted([a, other])
        for index in self.near[a].values():
            self.price(index)
        for other in sorted(self.near[a]):
            pair, old = self.near[a][other], self.least.get(other)
            if old is None:
                self.search(other)
            elif old != pair and a not in self.ids[old] and b not in self.ids[old]:
                if self.cost[old] > self.cost[pair] or (self.cost[old] == self.cost[pair] and pair < old):
                    (self.queued if old in self.queued else self.chosen).discard(old)
                    self.choose(other, pair)
            else:
                self.chosen.discard(old)
                self.search(other)
        self.search(a)
        return cost, a, b


def join_small(schedule, least, parent):
    """The smallest region joins its cheapest neighbour, until none is too small."""
    schedule.most = float("inf")
    area, near = schedule.area, schedule.near
    while True:
        small = [label for label in area if area[label] < least and near[label] and label not in parent]
        if not small:
            return
        label = min(small, key=lambda label: (area[label], label))
        for index in near[label].values():
            schedule.price(index)
        other = min(near[label], key=lambda other: (schedule.cost[near[label][other]], other))
        a, b = min(label, other), max(label, other)
        m, n = float(area[a]), float(area[b])
        schedule.mean[a] = [n / (m + n) * v + m / (m + n) * u for u, v in zip(schedule.mean[a], schedule.mean[b])]
        area[a] += area[b]
        del near[a][b], near[b][a]
        for third, index in near[b].items():
            del near[third][b]
            if third in near[a]:
                schedule.length[near[a][third]] += schedule.length[index]
            else:
                near[a][third] = near[third][a] = index
                schedule.ids[index] = sorted([a, third])
        near[b] = {}
        parent[b] = a


def merge_schedule(values, labels, pairs, threshold, MinSize=0, MaxSize=float("inf"), Compactness=0):
    schedule, parent = Schedule(values, labels, pairs, len(values), MaxSize, Compactness), {}
    while threshold > 0:
        merge = schedule.step()
        if merge is None:
            break
        parent[merge[2]] = merge[1]
        if merge[0] > threshold:
            break
    join_small(schedule, MinSize, parent)
    result = []
    for label in labels:
        while label in parent:
            label = parent[label]
        result.append(label)
    return result


def cut_nested(labels, merges, threshold):
    """The largest regions of a merge in rounds all of whose merges cost no more than a threshold."""
    parent, most = {}, {}
    for cost, a, b in merges:
        most[a] = max(cost, most.get(a, 0), most.get(b, 0))
        if most[a] <= threshold:
            parent[b] = a
    result = []
    for label in labels:
        while label in parent:
            label = parent[label]
        result.append(label)
    return result


def merge_local(values, labels, pairs, threshold, rounds, most=float("inf"), compactness=0, merges=None):
    """In rounds: each region chooses its cheapest pair, and pairs that were chosen twice merge at once."""
    plain = Schedule(values, labels, pairs, len(values), most, compactness)
    area, mean, parent = dict(plain.area), plain.mean, {}
    edges = {tuple(ids): (plain.length[i], i) for i, ids in enumerate(plain.ids)}
    for _ in range(rounds):
        choice = {}
        for (a, b), (length, index) in edges.items():
            m, n = float(area[a]), float(area[b])
            total = 0.0
            for u, v in zip(mean[a], mean[b]):
                total += (u - v) * (u - v)
            cost = m * n / (m + n) * total / length
            if compactness:
                cost /= float(length) ** compactness
            if m + n > most or not cost < threshold:
                continue
            for label in (a, b):
                choice[label] = min(choice.get(label, (cost, index, None)), (cost, index, (a, b)), key=lambda c: c[:2]) \
                    if label in choice else (cost, index, (a, b))
        merged = {choice[a][2] for a in choice if choice.get(choice[a][2][0]) == choice.get(choice[a][2][1])}
        if not merged:
            break
        into = {}
        for a, b in merged:
            m, n = float(area[a]), float(area[b])
            mean[a] = [n / (m + n) * v + m / (m + n) * u for u, v in zip(mean[a], mean[b])]
            area[a] += area[b]
            into[b] = parent[b] = a
            if merges is not None:
                merges.append((choice[a][0], a, b))
        joined = {}
        for (a, b), (length, index) in edges.items():
            a, b = sorted((into.get(a, a), into.get(b, b)))
            if a != b:
                before = joined.get((a, b), (0, index))
                joined[a, b] = (before[0] + length, min(before[1], index))
        edges = joined
    result = []
    for label in labels:
        while label in parent:
            label = parent[label]
        result.append(label)
    return result


def merge_rigorous(values, invalid, labels, excluded, pairs, threshold, count, exact):
    bands, kept = len(values), (lambda value: value) if exact else as_float
    sums, areas = collections.defaultdict(lambda: [0.0] * bands), collections.Counter()
    for p, label in enumerate(labels):
        if not excluded[p] and not invalid[p]:
            areas[label] += 1
            for k in range(bands):
                sums[label][k] = kept(sums[label][k] + values[k][p])
    groups, parents = {}, [0]

    def root(group):
        while parents[group]:
            group = parents[group]
        return group

    for (a, b), length in sorted(pairs.items(), key=lambda item: item[0][0]):
        m, n = areas[a], areas[b]
        if m + n == 0:
            continue
        mean = lambda label, k: kept(sums[label][k] / areas[label]) if areas[label] else 0.0
        total = 0.0
        for k in range(bands):
            total += (mean(a, k) - mean(b, k)) ** 2
        if not threshold > as_float(float(n) * m / (n + m) * total / length):
            continue
        if a not in groups and b not in groups:
            parents.append(0)
            groups[a] = groups[b] = len(parents) - 1
        elif a not in groups:
            groups[a] = groups[b]
        elif b not in groups:
            groups[b] = groups[a]
        else:
            low, high = root(min(groups[a], groups[b])), root(max(groups[a], groups[b]))
            if low != high:
                parents[low] = high
    counter, number = len(parents) - 1, {}
    for label in range(count + 2):
        if counter == 0 and not groups:
            number[label] = label
        elif label in groups:
            number[label] = root(groups[label])
        else:
            number[label] = counter
            counter += 1
    return [0 if hole else number[label] for label, hole in zip(labels, excluded)]
