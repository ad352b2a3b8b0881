"""What a daily report must hold, computed from the store and the whitelist by other means than the job's."""

import hashlib
import math
import plistlib
from fractions import Fraction

WORD = 1 << 64


def signed(value):
    value %= WORD
    return value - WORD if value >= WORD // 2 else value


def rounded(value, options):
    if "bucket_interval" in options:
        interval = options["bucket_interval"]
        if interval == 0:
            value = 0
        elif value >= 0:
            value = signed((value + interval // 2) // interval * interval)
        else:
            value = -((-value + interval // 2) // interval * interval)
    if value != 0 and "sig_fig" in options:
        dropped = math.ceil(math.log10(abs(value))) - options["sig_fig"]
        if dropped >= 1:
            power = 10 ** dropped
            magnitude = (abs(value) + power // 2) // power * power  # halves away from zero
            value = magnitude if value > 0 else -magnitude
    return value


def statistics(values):
    """Minimum, maximum, exact mean and exact sum of squared deviations, count."""
    exact = [Fraction(v) for v in values]
    mean = sum(exact) / len(exact)
    return [min(values), max(values), float(mean), float(sum((v - mean) ** 2 for v in exact)), len(values)]


def histogram(values, boundaries):
    buckets = {}
    for value in values:
        index = next((i for i, b in enumerate(boundaries) if b >= value), len(boundaries))
        lower = "-inf" if index == 0 else repr(boundaries[index - 1])
        label = f"({lower}, inf)" if index == len(boundaries) else f"({lower}, {boundaries[index]!r}]"
        buckets[label] = buckets.get(label, 0) + 1
    return buckets


class Whitelist:
    def __init__(self, data, disabled=()):
        self.digest = hashlib.md5(data).hexdigest()
        self.tables = {}
        for group, tables in plistlib.loads(data).items():
            if group == "InternalTesting" or group in disabled:
                continue
            for table, keys in tables.items():
                self.tables.setdefault(table, {}).update(keys)

    def options(self, kind, key):
        exact = self.tables.get(kind + "Keys", {})
        if key in exact:
            return exact[key]
        prefixes = self.tables.get(kind + "KeyPrefixes", {})
        return next((options for prefix, options in prefixes.items() if prefix and key.startswith(prefix)), None)


def history_part(device, whitelist, day):
    """The scalars, distributions and histograms that the store's rows come to."""
    scalars, distributions, histograms = {}, {}, {}
    database = device.store()
    rows = ("SELECT name, day, value FROM scalars JOIN keys ON keys.id = key_id WHERE day BETWEEN ? AND ? "
            "ORDER BY name, day")
    for key, _, value in database.execute(rows, (day - 1, day)):
        options = whitelist.options("Scalar", key)
        if options is not None:
            scalars[key] = rounded(value, options)
    rows = ("SELECT name, day, value FROM distribution_values JOIN keys ON keys.id = key_id WHERE day BETWEEN ? AND ? "
            "ORDER BY name, day, seq")
    values = {}
    for key, row_day, value in database.execute(rows, (day - 1, day)):
        values.setdefault(key, {}).setdefault(row_day, []).append(value)
    for key, days in values.items():
        options = whitelist.options("Distribution", key)
        if options is None:
            continue
        last = days[max(days)]
        distributions[key] = statistics(last)
        if "intervals" in options:
            histograms[key] = histogram(last, options["intervals"])
    return scalars, distributions, histograms
