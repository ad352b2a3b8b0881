"""A device with driver metrics, made by hand, and what the values of its channels have to be."""

NONE = -2 ** 63
COUNT, SECONDS, NS, TICKS, UNKNOWN_RATE = 0, 1 << 56, 0x0100007600000000, 0x0100007980000018, 0x0101000000000000
LABELS = {None: None, COUNT: "", NS: "ns", TICKS: "24Mticks"}
FAN, DISK = ("fan", 0x100000100), ("disk\x1b[2J <id x", 2 ** 63 - 1)
UNPRINTABLE, COU, ON, OFF = 0xFF, 0x434F55, 0x4F4E, 0x4F4646
# driver, group, subgroup, legend name, identifier, format, categories, elements, unit, upper bounds; in walk order
CHANNELS = [
    (FAN, None, None, "speeds", 1, 4, 0x0001, 2, COUNT, None),
    (FAN, "Power", None, None, COU, 2, 0x0010, 3, NS, None),
    (FAN, "Power", None, "odd states", 3, 2, 0x0000, 2, TICKS, None),
    (FAN, "Power", "Rails", None, UNPRINTABLE, 1, 0x8001, 1, NS, None),
    (FAN, "Power", "Rails", "not in the hub", 4, 1, 0xFFFF, 1, None, None),
    (FAN, "Queue", "Rails", "wait", 5, 3, 0x0100, 4, NS, [10, 20, 30]),
    (FAN, "Queue", "Rails", "unbounded", 6, 3, 0x0100, 2, None, None),
    (FAN, "Queue", "Rails", "format nine", 7, 9, 0x0002, 1, None, None),
    (DISK, None, None, "reads", 1, 1, 0x0102, 1, COUNT, None),
    (DISK, None, None, "found out", 2, 0, 0x0000, 0, None, None)]
# (driver, channel): stamp and words of each element, earlier and later
HUB = {(FAN, 1): ([(1, 1, 2, NONE, 4), (1, 5)], [(1, 2, NONE, 7, 4), (1, 2 ** 62)]),
       (FAN, COU): ([(5, ON, 10, 10 ** 9), (9, OFF, 3, 3 * 10 ** 9), (9, COU, 1, 0)],
                     [(10, ON, 11, 2 * 10 ** 9), (9, OFF, 3, 6 * 10 ** 9), (9, COU, 1, 0)]),
       (FAN, 3): ([(0, ON, 0, 0), (0, 1, 0, 0)], [(0, ON, 5, 24), (1, 1, 5, -24)]),
       (FAN, UNPRINTABLE): ([(1, 250)], [(2, 100)]),
       (FAN, 5): ([(1, 3, 1, 9, 12), (1, 0, 0, 0, 77), (1, 2, 20, 29, 49), (1,)],
                   [(2, 5, 1, 9, 20), (2, 1, 11, 11, 88), (2, 2, 20, 29, 49), (2,)]),
       (FAN, 6): ([(1,), (1,)], [(1,), (1,)]), (FAN, 7): ([(1, 1)], [(1, 2)]),
       (DISK, 1): ([(1, 2 ** 63 - 1)], [(1, NONE + 1)]), (DISK, 2): ([(1, 7)], [(2, 9)])}
FOUND_OUT = (1, 0x0004, 1)  # the type that the hub has for the channel of format 0


def type_of(form, categories, count):
    return form | categories << 16 | count << 32 | 0xAB << 8


def display(driver):
    return f"{driver[0]} <id {driver[1]:#x}>"


def printable(number):
    kept = bytes(b for b in (number % 2 ** 64).to_bytes(8, "big") if b)
    return kept.decode() if kept and all(0x20 <= b <= 0x7E for b in kept) else None


def known(number):
    return None if number == NONE else number


def described(row, sampled):
    driver, group, subgroup, name, channel, form, categories, count, unit, _ = row
    if form == 0 and sampled:
        form, categories, count = FOUND_OUT
    return {"driver": display(driver), "driverID": driver[1], "group": group, "subgroup": subgroup,
            "name": name or printable(channel), "channelID": channel, "format": form, "categories": categories,
            "elements": count, "unit": unit, "unitCode": None if unit is None else f"0x{unit % 2**64:016x}",
            "unitLabel": LABELS[unit]}


def with_values(row, stamps, elements):
    answer = described(row, True)
    if answer["format"] == 1:
        answer["value"] = known(elements[0][0])
    elif answer["format"] == 2:
        names, spent = [printable(e[0]) for e in elements], sum(e[2] for e in elements)
        answer["states"] = [{"id": e[0], "name": None if None in names else name, "entries": e[1], "residency": e[2],
                             "dutyCycle": e[2] / spent if spent else None} for e, name in zip(elements, names)]
        answer["current"] = stamps.index(max(stamps)) if any(stamps) else None
    elif answer["format"] == 3:
        uppers, hit = row[9] or [], [e for e in elements if e[0]]
        bounds = list(zip([0] + uppers, uppers)) + [(None, None)] * len(elements)
        answer["buckets"] = [{"lower": low, "upper": up, "hits": e[0], "minimum": e[1], "maximum": e[2],
                              "sum": known(e[3])} for e, (low, up) in zip(elements, bounds)]
        answer["minimum"], answer["maximum"] = (hit[0][1], hit[-1][2]) if hit else (None, None)
    elif answer["format"] == 4:
        answer["values"] = [known(word) for e in elements for word in e]
    return answer


def minus(form, a, b):
    wrapped = [(y - x + 2 ** 63) % 2 ** 64 - 2 ** 63 for x, y in zip(a, b)]
    return {1: [wrapped[0], 0, 0, 0], 2: [b[0], wrapped[1], wrapped[2], b[3]],
            3: [wrapped[0], b[1], b[2], (b[3] - (a[3] if a[0] else 0)) if wrapped[0] else NONE],
            4: [y if x == NONE else x if y == NONE else d for x, y, d in zip(a, b, wrapped)]}[form]


def model(moment, rows=CHANNELS):
    """The sample at moment 0 or 1, or from one to the other ("delta")."""
    answers = []
    for row in [row for row in rows if row[0:5:4] in HUB]:
        sides = HUB[row[0:5:4]]
        values = [[list(e[1:]) + [0] * (5 - len(e)) for e in side] for side in sides]
        stamps = [e[0] for e in sides[1 if moment else 0]]
        delta = [minus(row[5] or 1, a, b) for a, b in zip(*values)] if moment == "delta" else None
        answers.append(with_values(row, stamps, delta or values[moment]))
    return answers
