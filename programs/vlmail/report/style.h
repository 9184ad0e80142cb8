#pragma once
// How the report looks. What lies on the paper keeps its colours in the dark, as the paper does. Nothing is
// told by colour alone: trouble is dashed, hatched and has a cross.

namespace VlMail::Report {

constexpr char const* STYLE = R"css(
:root {
    color-scheme: light dark;
    --ground: #f5f6f8; --card: #ffffff; --text: #1b1f24; --quiet: #555d68; --line: #cfd5dd;
    --fine: #17692f; --bad: #b3152a; --bad-ground: #fdecee; --mark: #fff3c4; --link: #0b57d0;
}
@media (prefers-color-scheme: dark) {
    :root {
        --ground: #14171b; --card: #1d2127; --text: #e8eaed; --quiet: #a7b0bb; --line: #3a414b;
        --fine: #6fd58b; --bad: #ff9aa6; --bad-ground: #45191f; --mark: #4a3f12; --link: #8ab4f8;
    }
}
* { box-sizing: border-box; }
body { margin: 0; background: var(--ground); color: var(--text); font: 1rem/1.5 system-ui, sans-serif; }
header, main { max-width: 100rem; margin: 0 auto; padding: 1rem 1.5rem; }
h1 { margin: 0; font-size: 1.6rem; }
h2 { margin: 0; font-size: 1.3rem; overflow-wrap: anywhere; }
h3 { margin: 0 0 .75rem; font-size: 1.05rem; }
a { color: var(--link); }
code { font-size: .9em; overflow-wrap: anywhere; }
:focus-visible { outline: 3px solid var(--link); outline-offset: 2px; }
.skip { position: absolute; left: -200vw; }
.skip:focus { left: .5rem; top: .5rem; z-index: 9; padding: .5rem 1rem; background: var(--card); }
.letter .skip:focus { position: static; display: inline-block; margin-bottom: .5rem; }

.overview { padding-left: 1.5rem; }
.state { font-weight: 600; white-space: nowrap; color: var(--fine); }
.state.quiet { font-weight: 400; color: var(--quiet); }
.state.bad { color: var(--bad); }
h3 .state, .why { white-space: normal; }
.why { margin: 0 0 1rem; padding: .5rem .75rem; border-left: .35rem solid var(--bad); background: var(--bad-ground); }
.quietly { margin: .2rem 0 1rem; color: var(--quiet); }
.legend { display: flex; flex-wrap: wrap; gap: .4rem 1.5rem; padding: 0; margin: .75rem 0 0; list-style: none; }
.legend span { position: relative; display: inline-block; width: 2rem; height: .9rem; margin-right: .5rem;
    vertical-align: -.1rem; background-color: #fff; box-shadow: 0 0 0 .2rem #fff; }

.document { margin: 0 0 1.5rem; padding: 1.25rem; border: 1px solid var(--line); border-radius: .5rem;
    background: var(--card); }
.letter + .letter { margin-top: 2rem; padding-top: 1.5rem; border-top: 1px solid var(--line); }
.beside { display: grid; grid-template-columns: minmax(0, 11fr) minmax(0, 9fr); gap: 1.5rem; align-items: start; }
figure { margin: 0; }
figcaption { margin-top: .4rem; color: var(--quiet); font-size: .9em; }

table { width: 100%; border-collapse: collapse; }
caption { text-align: left; font-weight: 600; padding-bottom: .4rem; }
th, td { padding: .35rem .6rem .35rem 0; text-align: left; vertical-align: top; border-bottom: 1px solid var(--line);
    overflow-wrap: anywhere; }
thead th { color: var(--quiet); font-weight: 600; }
tbody th { font-weight: 400; overflow-wrap: break-word; }
.group th { padding-top: .9rem; font-weight: 600; border-bottom-width: 2px; }
.group small { font-weight: 400; color: var(--quiet); }
td.value { white-space: pre-line; min-width: 9em; }
td small { display: block; color: var(--quiet); white-space: normal; }
tr.bad { background: var(--bad-ground); box-shadow: inset .35rem 0 0 var(--bad); }
tr.bad th { padding-left: .75rem; font-weight: 600; }
tr:target { background: var(--mark); box-shadow: inset .35rem 0 0 #d97706; }
tr:target th { padding-left: .75rem; }
tr, .sheet a { scroll-margin: 5rem; }

@media (max-width: 60rem) {
    .beside { grid-template-columns: minmax(0, 1fr); }
    header, main { padding: .75rem; }
    .document { padding: .75rem; }
}
@media (min-width: 60.01rem) {
    .fields { position: sticky; top: 1rem; max-height: calc(100vh - 2rem); overflow-y: auto; padding: .2rem; }
}
.fields { overflow-x: auto; }
)css";

constexpr char const* PRINT_STYLE = R"css(@page { size: A4 landscape; margin: 10mm; }
@media print {
    :root { --ground: #fff; --card: #fff; --text: #000; --quiet: #333; --line: #999; --fine: #17692f; --bad: #b3152a;
        --bad-ground: #fdecee; --mark: transparent; --link: #000; color-scheme: light; }
    * { print-color-adjust: exact; -webkit-print-color-adjust: exact; }
    body { font-size: 9.5pt; line-height: 1.35; }
    header, main { max-width: none; padding: 0; }
    a { text-decoration: none; }
    .skip, .back { display: none; }
    .document { margin: 0; padding: 0; border: 0; border-radius: 0; }
    .document:not(.bare), .letter + .letter { break-before: page; }
    .letter + .letter { margin: 0; padding: 0; border: 0; }
    .document h2 { font-size: 13pt; }
    .beside { grid-template-columns: auto minmax(0, 1fr); gap: 6mm; }
    .sheet { --high: 152mm; width: min(125mm, calc(var(--high) * var(--w) / var(--h))); box-shadow: none; outline: .3mm solid #999; }
    header { padding-bottom: 6mm; }
    .document.bare + .bare { margin-top: 6mm; }
    tbody th { overflow-wrap: anywhere; }
    .fields { position: static; max-height: none; overflow: visible; }
    .sheet a:target { outline: 0; }
    tr:target { box-shadow: none; }
    figure, tr, h2, h3, .why { break-inside: avoid; }
    h2, h3, .quietly { break-after: avoid; }
}
)css";

} // namespace VlMail::Report
