// How pages look: on screens of any width in light and dark, and on paper. Fonts are the system's own.
#pragma once

namespace tbdaily {

inline constexpr char kPageStyle[] = R"css(
:root {
  color-scheme: light dark;
  --ground: #f5f6f7; --sheet: #fff; --text: #15181c; --quiet: #434b54; --line: #d5dadf; --soft: #eceff2;
  --first: #0a4f96; --second: #a8430b; --warn: #8a1c1c;
  --mono: ui-monospace, SFMono-Regular, Menlo, Consolas, "DejaVu Sans Mono", monospace;
}
@media (prefers-color-scheme: dark) {
  :root {
    --ground: #111417; --sheet: #191d21; --text: #e9ebee; --quiet: #b6bec7; --line: #343b42; --soft: #22272c;
    --first: #6fb3ff; --second: #ffae78; --warn: #ffb3ad;
  }
}
* { box-sizing: border-box; }
html { -webkit-text-size-adjust: 100%; text-size-adjust: 100%; scroll-padding-top: 1rem; }
body {
  margin: 0; background: var(--ground); color: var(--text);
  font: 1rem/1.5 system-ui, -apple-system, "Segoe UI", Roboto, "Helvetica Neue", "Noto Sans", "DejaVu Sans", sans-serif;
  font-variant-numeric: tabular-nums;
}
header, nav, main, footer { max-width: 66rem; margin-inline: auto; padding-inline: clamp(1rem, 4vw, 2rem); }
header { padding-block: 2.5rem 1rem; }
main { padding-block-end: 3rem; }
footer { padding-block: 1rem 2.5rem; color: var(--quiet); font-size: .875rem; }
footer p { max-width: 40rem; }
h1, h2, h3, p, dl, dd, figure, table, ul { margin: 0; padding: 0; }
h1 { font-size: clamp(1.6rem, 5vw, 2.1rem); line-height: 1.2; letter-spacing: -.015em; }
h2 { font-size: 1.3rem; line-height: 1.3; margin-block: 2.75rem .75rem; letter-spacing: -.01em; }
h3 { font-size: 1rem; line-height: 1.4; }
h2 .count { color: var(--quiet); font-weight: 400; }
a { color: var(--first); text-underline-offset: .2em; }
:focus-visible { outline: 3px solid var(--first); outline-offset: 2px; border-radius: 2px; }
.skip { position: absolute; inset-inline-start: -100vw; }
.skip:focus { inset: .5rem auto auto .5rem; padding: .5rem 1rem; background: var(--sheet); z-index: 1; }
.over { color: var(--quiet); font-size: .9375rem; overflow-wrap: anywhere; }
.verdict { font-size: 1.125rem; margin-block-start: .75rem; max-width: 48rem; }
.note { color: var(--quiet); max-width: 48rem; margin-block-end: .75rem; }
.key { font-family: var(--mono); font-size: .875rem; overflow-wrap: anywhere; unicode-bidi: isolate; }
nav ul { display: flex; flex-wrap: wrap; gap: .25rem 1.25rem; list-style: none; border-block: 1px solid var(--line); }
nav a { display: inline-block; padding-block: .6rem; }

.tiles { display: grid; grid-template-columns: repeat(auto-fit, minmax(9.25rem, 1fr)); gap: .75rem; }
.tiles > div { background: var(--sheet); border: 1px solid var(--line); border-radius: .5rem; padding: .75rem 1rem; }
.tiles dt { color: var(--quiet); font-size: .875rem; }
.tiles dd { font-size: 1.5rem; line-height: 1.3; font-weight: 600; overflow-wrap: anywhere; }
.tiles dd + dd { font-size: .875rem; font-weight: 400; color: var(--quiet); }
.facts { display: grid; grid-template-columns: max-content 1fr; gap: .3rem 1.5rem; margin-block-start: 1.25rem; }
.facts > div { display: contents; }
.facts dt { color: var(--quiet); }
.facts dd { overflow-wrap: anywhere; min-width: 0; }
.facts dd.key { align-self: center; }

.sheet.narrow { max-width: 48rem; }
.sheet { background: var(--sheet); border: 1px solid var(--line); border-radius: .5rem; overflow: hidden; }
table { border-collapse: collapse; width: 100%; background: var(--sheet); }
caption { background: var(--sheet); text-align: start; color: var(--quiet); font-size: .875rem; padding: .65rem 1rem; }
th, td { padding: .3rem 1rem; border-block-start: 1px solid var(--line); text-align: start; vertical-align: top; }
thead th { color: var(--quiet); font-size: .875rem; font-weight: 600; vertical-align: bottom; background: var(--soft); }
tbody th { font-weight: 400; }
th.key { padding-block: .4rem; }
tbody tr:hover > * { background: var(--soft); }
.n { text-align: end; white-space: nowrap; }
.sheet .n { width: 1%; }
td small { display: block; color: var(--quiet); font-size: .8125rem; }
td.wrap { overflow-wrap: anywhere; min-width: 8rem; }
.scroll .key { min-width: 12rem; }
.day { white-space: nowrap; }
.gone { color: var(--quiet); font-style: italic; }
.back { color: var(--warn); font-weight: 600; }
.scroll { overflow: auto; max-width: 100%; }
.scroll.tall { max-height: 20rem; }
.scroll.tall thead th { position: sticky; inset-block-start: 0; }

.card { background: var(--sheet); border: 1px solid var(--line); border-radius: .5rem; margin-block-end: 1rem; padding: 1rem; }
.stats { display: flex; flex-wrap: wrap; gap: .5rem 2rem; margin-block-start: .5rem; }
.stats dt { color: var(--quiet); font-size: .8125rem; }
.stats dd { font-weight: 600; }
.pair { display: grid; grid-template-columns: minmax(0, 1fr); gap: 1rem 1.5rem; margin-block-start: 1rem; align-items: start; }
@media (min-width: 50rem) {
  .pair { grid-template-columns: minmax(0, 3fr) minmax(0, 2fr); }
  .pair.wide { grid-template-columns: minmax(0, 5fr) minmax(0, 3fr); }
}
.pair > * { min-width: 0; }
.card > .pair:first-child { margin-block-start: 0; }
.pair table, .pair .scroll { font-size: .875rem; }
.pair caption { padding: 0 0 .5rem; }
.pair th, .pair td { padding: .25rem .6rem; }
.pair .scroll { border: 1px solid var(--line); border-radius: .375rem; }
.pair .scroll caption { padding: .5rem .6rem; }
details { margin-block-end: .5rem; }
summary { cursor: pointer; padding: .6rem 1rem; overflow-wrap: anywhere; }
details > .card:first-of-type { margin-block-start: .5rem; }

svg { display: block; width: 100%; max-width: 32rem; height: auto; }
svg.days { max-width: none; }
svg text { fill: var(--quiet); font-size: 13px; font-family: inherit; }
svg .bar { fill: var(--first); }
svg .grid { stroke: var(--line); stroke-width: 1; fill: none; }
svg .axis { stroke: var(--quiet); stroke-width: 1; fill: none; }
svg .line { fill: none; stroke-width: 2.5; stroke-linejoin: round; stroke-linecap: round; }
svg .first { stroke: var(--first); }
svg .second { stroke: var(--second); stroke-dasharray: 7 5; }
svg .first.dot { fill: var(--first); stroke: none; }
svg .second.dot { fill: var(--second); stroke: none; }
svg .mark { stroke: var(--warn); stroke-width: 1.5; stroke-dasharray: 2 4; fill: none; }
svg text.mark { fill: var(--warn); stroke: none; }
.days text { font-size: 16px; }
.legend { display: flex; flex-wrap: wrap; gap: .25rem 1.5rem; list-style: none; font-size: .875rem; margin-block-end: .5rem; }
.legend svg { display: inline-block; width: 2rem; height: .75rem; margin-inline-end: .5rem; vertical-align: middle; }
@media (max-width: 37.5rem) {
  header { padding-block-start: 1.5rem; }
  .facts { grid-template-columns: minmax(0, 1fr); gap: 0; }
  .facts dd { margin-block-end: .5rem; }
  .tiles { grid-template-columns: repeat(2, minmax(0, 1fr)); }
  .tiles > div { padding: .6rem .75rem; }
  .tiles dd { font-size: 1.25rem; }
  .stats { display: grid; grid-template-columns: repeat(auto-fill, minmax(6.25rem, 1fr)); gap: .5rem; }
  th, td, caption { padding-inline: .75rem; }
  svg text { font-size: 16px; }
  .days text { font-size: 23px; }
}
@media (forced-colors: active) {
  svg .bar, svg text, svg .dot { fill: CanvasText !important; }
  svg .line, svg .axis, svg .mark { stroke: CanvasText !important; }
}
@media print {
  :root {
    color-scheme: light;
    --ground: #fff; --sheet: #fff; --text: #000; --quiet: #333; --line: #bbb; --soft: #fff;
    --first: #0a4f96; --second: #a8430b; --warn: #8a1c1c;
  }
  @page { margin: 16mm 14mm; }
  body { font-size: 9.5pt; }
  header, main, footer { max-width: none; padding-inline: 0 .25rem; }
  nav, .skip { display: none; }
  h2, h3, .note, caption, summary { break-after: avoid; }
  tr, figure, .tiles > div, article { break-inside: avoid; }
  .pair, .pair.wide { grid-template-columns: minmax(0, 3fr) minmax(0, 2fr); }
  .pair th, .pair td { padding-block: .1rem; }
  .tiles { grid-template-columns: repeat(auto-fit, minmax(6.25rem, 1fr)); }
  .tiles dd { font-size: 1.2rem; }
  .days text { font-size: 21px; }
  .scroll, .scroll.tall { overflow: visible; max-height: none; }
  details::details-content { content-visibility: visible; display: block; height: auto; }
  .bar { print-color-adjust: exact; -webkit-print-color-adjust: exact; }
}
)css";

}  // namespace tbdaily
