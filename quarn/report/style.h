// SPDX-License-Identifier: Apache-2.0
// How a report looks: light or dark as the reader's system has it, and on paper.
#pragma once

namespace quarn {

inline constexpr const char* reportStyle = R"css(
:root { color-scheme: light dark; --ground: #fff; --text: #1c2430; --weak: #5b6675; --line: #dde2e8; --card: #f6f8fa;
  --before: #d9730d; --after: #0b7285; --good: #2b7a3d; --bad: #c92a2a; }
@media (prefers-color-scheme: dark) { :root { --ground: #15191f; --text: #e6e9ee; --weak: #9aa5b4; --line: #323a45;
  --card: #1d232b; --before: #ffa94d; --after: #3bc9db; --good: #69db7c; --bad: #ff8787; } }
* { box-sizing: border-box; }
body { font: 16px/1.5 system-ui, sans-serif; margin: 2rem auto; max-width: 1180px; padding: 0 1.25rem;
  background: var(--ground); color: var(--text); overflow-wrap: anywhere; }
h1 { font-size: 1.75rem; margin: 0 0 .5rem; }
h2 { font-size: 1.3rem; margin: 2.5rem 0 .5rem; border-top: 2px solid var(--line); padding-top: 1.25rem; }
h3 { font-size: 1.05rem; margin: 1.75rem 0 .5rem; }
a { color: var(--after); }
.lead { font-size: 1.2rem; line-height: 1.45; margin: .35rem 0; }
.verdict { font-weight: 600; }
.kept { color: var(--good); }
.missed { color: var(--bad); }
.weak, figcaption, td small { color: var(--weak); }
.weak, figcaption { font-size: .875rem; }
table { border-collapse: collapse; width: 100%; font-variant-numeric: tabular-nums; font-size: .9rem; }
th, td { padding: .35rem .6rem; text-align: right; border-bottom: 1px solid var(--line); vertical-align: top; }
th { font-weight: 600; }
th, td { overflow-wrap: normal; }
th:first-child, td:first-child { text-align: left; min-width: 5.5em; overflow-wrap: anywhere; }
td small { overflow-wrap: anywhere; }
td small { display: block; }
table + table { margin-top: 1.25rem; }
tr.best td { font-weight: 600; }
tr.best td small { font-weight: 400; }
.charts { display: grid; grid-template-columns: repeat(auto-fit, minmax(min(100%, 480px), 1fr)); gap: 1rem; }
.chart { width: 100%; height: auto; background: var(--card); border-radius: 8px; }
.chart text { fill: var(--weak); font: 12px system-ui, sans-serif; }
.chart .title { fill: var(--text); font-size: 14px; font-weight: 600; }
.chart .grid { stroke: var(--line); }
.chart .axis { stroke: var(--weak); }
.chart .curve { fill: none; stroke-width: 2; stroke-linejoin: round; }
.chart .before, .chart .training { stroke: var(--before); }
.chart .after, .chart .validation { stroke: var(--after); }
.chart .dashed { stroke-width: 1.25; stroke-dasharray: 5 3; }
.chart .mark { stroke: var(--weak); stroke-dasharray: 2 3; }
.chart .bar { stroke: none; }
.chart .bar.before { fill: var(--before); opacity: .55; }
.chart .bar.after { fill: var(--after); opacity: .6; }
figure { margin: 1rem 0; }
figure img { width: 100%; border-radius: 8px; display: block; }
dl { display: grid; grid-template-columns: max-content 1fr; gap: .2rem 1.25rem; margin: .5rem 0; font-size: .9rem; }
dt { color: var(--weak); }
dd { margin: 0; white-space: pre-line; }
details { font-size: .9rem; margin: .5rem 0; }
summary { cursor: pointer; color: var(--weak); }
@media (max-width: 640px) { table { font-size: .78rem; } th, td { padding: .3rem .25rem; } table.wide .more { display: none; } dl { grid-template-columns: 1fr; } dd { margin: 0 0 .4rem; } }
@page { margin: 14mm; }
@media print {
  :root { color-scheme: light; --ground: #fff; --text: #000; --weak: #444; --line: #bbb; --card: #fff; --before: #b35c00;
    --after: #0b6170; --good: #1b5e2b; --bad: #a01818; }
  body { font-size: 10.5pt; margin: 0; max-width: none; padding: 0; print-color-adjust: exact;
    -webkit-print-color-adjust: exact; }
  .charts { grid-template-columns: 1fr 1fr; }
  .chart { border: 1px solid var(--line); }
  table { font-size: 9pt; }
  figure, .chart, table, dl { break-inside: avoid; }
  h2, h3 { break-after: avoid; }
  section + section { break-before: page; }
  section + section h2 { border: 0; margin-top: 0; padding-top: 0; }
  details { display: none; }
}
)css";

} // namespace quarn
