"""What the queries of fleet/ answer, in exact fractions, from the reports themselves: a second statement of their rules."""

import datetime
import math
from fractions import Fraction

QUANTILES = (0.05, 0.25, 0.5, 0.75, 0.95, 0.99)


class Report:
    """One report, under the device that it counts for."""

    def __init__(self, identifier, device, day, digest, scalars=(), distributions=(), histograms=()):
        self.identifier, self.device, self.day, self.digest = identifier, device, day, digest
        self.scalars, self.distributions, self.histograms = dict(scalars), dict(distributions), dict(histograms)

    @property
    def owner(self):
        return self.device or (self.identifier,)


def by_owner(reports):
    groups = {}
    for report in reports:
        groups.setdefault(report.owner, []).append(report)
    return groups


def root(variance):
    return math.sqrt(variance)


def merged(states):
    """(n, mean, squared deviations) of states (n, mean, squared deviations); weights may be fractions."""
    n = sum(n for n, _, _ in states)
    mean = sum(n * mean for n, mean, _ in states) / n
    return n, mean, sum(m2 + n * (one - mean) ** 2 for n, one, m2 in states)


def is_finite(statistics):
    return all(abs(number) < 1e100 for number in statistics[:4])  # which a NaN is not


def answer(states_of_owners, minimum, maximum):
    """The columns that scalars and distributions share, from each device's states."""
    states = [state for owner in states_of_owners for state in owner]
    n, mean, m2 = merged(states)
    _, device_mean, device_m2 = merged([(Fraction(1), mean, m2 / n) for n, mean, m2 in map(merged, states_of_owners)])
    return {"devices": len(states_of_owners), "reports": len(states), "mean": mean, "stddev": root(m2 / n), "minimum": minimum,
            "maximum": maximum, "device_mean": device_mean, "device_stddev": root(device_m2 / len(states_of_owners))}


def scalar(reports, key, devices):
    reports = [report for report in reports if key in report.scalars]
    owners = [[(1, Fraction(report.scalars[key]), 0) for report in group] for group in by_owner(reports).values()]
    if len(owners) < max(devices, 1):
        return []
    values = [report.scalars[key] for report in reports]
    return [answer(owners, min(values), max(values))]


def distribution(reports, key, devices):
    reports = [report for report in reports if key in report.distributions]
    finite = [report for report in reports if is_finite(report.distributions[key])]
    whole = [report for report in finite if report.distributions[key][4] > 0]

    def state(report):
        _, _, mean, m2, n = report.distributions[key]
        return n, Fraction(mean), Fraction(m2)
    owners = [[state(report) for report in group] for group in by_owner(whole).values()]
    if len(owners) < max(devices, 1):
        return []
    statistics = [report.distributions[key] for report in whole]
    return [{**answer(owners, min(s[0] for s in statistics), max(s[1] for s in statistics)), "count": sum(s[4] for s in statistics),
             "left_out": len(reports) - len(finite)}]


def whitelists(reports, key, devices):
    """(digest, the reports of each device), in the order of the digests."""
    for digest in sorted({report.digest for report in reports}):
        owners = by_owner([r for r in reports if r.digest == digest and r.histograms.get(key)]).values()
        if len(owners) >= max(devices, 1):
            yield digest, owners


def buckets(reports, key):
    """{(lower, upper): count} in the order of the buckets."""
    counts = {}
    for report in reports:
        for bounds, count in report.histograms[key].items():
            counts[bounds] = counts.get(bounds, 0) + count
    return dict(sorted(counts.items()))


def histogram(reports, key, devices):
    rows = []
    for digest, owners in whitelists(reports, key, devices):
        votes = [buckets(group, key) for group in owners]
        for bounds, count in buckets([report for group in owners for report in group], key).items():
            share = sum(Fraction(vote.get(bounds, 0), sum(vote.values())) for vote in votes) / len(votes)
            rows.append({"whitelist_digest": digest, "lower": bounds[0], "upper": bounds[1], "count": count, "share": share})
    return rows


def quantiles(reports, key, devices):
    rows = []
    for digest, owners in whitelists(reports, key, devices):
        counts = buckets([report for group in owners for report in group], key)
        for quantile in QUANTILES:
            wanted, before = quantile * float(sum(counts.values())), 0
            for (lower, upper), count in counts.items():
                if before + count >= wanted:
                    break
                before += count
            inside = lower + (upper - lower) * (wanted - before) / count
            estimate = upper if lower <= -1e100 else lower if upper >= 1e100 else inside
            rows.append({"whitelist_digest": digest, "quantile": quantile, "estimate": estimate})
    return rows


def keys(reports, prefix, devices):
    rows = []
    for kind, table in (("scalar", "scalars"), ("distribution", "distributions")):
        for key in {key for report in reports for key in getattr(report, table) if key.startswith(prefix)}:
            found = [report for report in reports if key in getattr(report, table)]
            rows.append({"kind": kind, "key": key, "devices": len(by_owner(found)), "reports": len(found)})
    return sorted((row for row in rows if row["devices"] >= devices), key=lambda row: (-row["devices"], row["key"].encode(), row["kind"]))


def drift(reports, key, devices):
    rows = []
    for kind, ask in (("distribution", distribution), ("scalar", scalar)):
        weeks = {}
        for report in reports:
            day = datetime.date.fromisoformat(report.day)
            if datetime.date(1970, 1, 5) <= day <= datetime.date(2105, 12, 31):
                weeks.setdefault(day - datetime.timedelta(day.weekday()), []).append(report)
        found = {monday: row for monday, group in weeks.items() for row in ask(group, key, devices)}
        for monday, now in sorted(found.items()):
            before = found.get(monday - datetime.timedelta(7))
            if before:
                rows.append({"kind": kind, "week": str(monday), "devices": now["devices"], "devices_before": before["devices"],
                             "device_mean": now["device_mean"], "device_mean_before": before["device_mean"],
                             "change": now["device_mean"] - before["device_mean"]})
    return rows
