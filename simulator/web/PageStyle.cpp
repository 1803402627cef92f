#include "simulator/web/PageStyle.h"

namespace simulator
{

const std::string_view PageStyle = R"css(:root {
  color-scheme: light dark;
  --page: #f3f5f7; --card: #ffffff; --text: #1c2430; --faint: #5d6877; --line: #dde2e8;
  --accent: #0b6e99; --on: #1a7f4b; --onback: #e2f4ea; --warn: #a4500b; --warnback: #fdeedd;
}
@media (prefers-color-scheme: dark) {
  :root {
    --page: #14181d; --card: #1d232b; --text: #e4e8ed; --faint: #98a3b1; --line: #323b46;
    --accent: #5cb8dd; --on: #6fd3a0; --onback: #1c3a2b; --warn: #f0b070; --warnback: #40301d;
  }
}
* { box-sizing: border-box; }
body { margin: 0; background: var(--page); color: var(--text); font: 15px/1.45 system-ui, "Segoe UI", "DejaVu Sans", sans-serif; }
header { background: var(--card); border-bottom: 1px solid var(--line); padding: 16px 20px 0; }
h1 { margin: 0; font-size: 22px; }
h2 { margin: 0 0 10px; font-size: 16px; }
p { margin: 4px 0 10px; }
.faint, footer { color: var(--faint); }
a { color: var(--accent); }
nav { display: flex; flex-wrap: wrap; gap: 4px 18px; margin-top: 10px; }
nav a { text-decoration: none; padding: 4px 0 8px; border-bottom: 3px solid transparent; }
nav a[aria-current] { border-color: var(--accent); color: var(--text); }
main { display: grid; grid-template-columns: repeat(12, minmax(0, 1fr)); gap: 14px; padding: 16px 20px; max-width: 1280px; margin: 0 auto; }
section { grid-column: span 6; background: var(--card); border: 1px solid var(--line); border-radius: 8px; padding: 14px 16px; overflow-x: auto; }
section.wide { grid-column: 1 / -1; }
table { border-collapse: collapse; width: 100%; }
th, td { text-align: left; padding: 5px 12px 5px 0; border-top: 1px solid var(--line); vertical-align: top; }
tr:first-child > th, tr:first-child > td { border-top: 0; }
table.lines td { white-space: nowrap; }
table.lines td:last-child { width: 99%; white-space: normal; }
th { font-weight: 600; white-space: nowrap; }
tbody th, table > tr > th { width: 1%; padding-right: 28px; }
tr > :last-child { padding-right: 0; }
thead th { color: var(--faint); font-weight: 500; font-size: 13px; }
thead + tbody tr:first-child > * { border-top: 1px solid var(--line); }
.number { text-align: right; font-variant-numeric: tabular-nums; white-space: nowrap; }
code { font: 13px/1.4 ui-monospace, "DejaVu Sans Mono", monospace; overflow-wrap: anywhere; }
.chip { display: inline-block; border-radius: 9px; padding: 0 8px; margin: 0 4px 2px 0; background: var(--page); border: 1px solid var(--line); font-size: 13px; white-space: nowrap; }
.chip.on { color: var(--on); background: var(--onback); border-color: transparent; }
.chip.warn { color: var(--warn); background: var(--warnback); border-color: transparent; }
form { margin: 0; }
input, select, button { font: inherit; color: inherit; background: var(--page); border: 1px solid var(--line); border-radius: 6px; padding: 4px 10px; max-width: 100%; }
button { cursor: pointer; }
footer { padding: 0 20px 18px; max-width: 1280px; margin: 0 auto; font-size: 13px; }
.stale main { opacity: 0.55; }
@media (max-width: 820px) {
  section { grid-column: 1 / -1; }
  header { padding: 12px 12px 0; }
  main { padding: 12px; gap: 10px; }
  section { padding: 12px; }
  footer { padding: 0 12px 14px; }
  th, td { padding-right: 8px; }
}
@media (max-width: 560px) {
  table.fields thead { display: none; }
  table.fields tr { display: block; padding: 6px 0; border-top: 1px solid var(--line); }
  table.fields tr:first-child { border-top: 0; }
  table.fields th, table.fields td { display: flex; justify-content: space-between; gap: 12px; width: 100%; padding: 2px 0; border: 0; text-align: right; }
  table.fields thead + tbody tr:first-child > * { border: 0; }
  table.fields td > span:last-child { white-space: normal; }
  table.fields td::before { content: attr(data-name); color: var(--faint); font-size: 13px; white-space: nowrap; }
  table.fields td.same { display: none; }
  table.lines tr { display: block; padding: 5px 0; border-top: 1px solid var(--line); }
  table.lines tr:first-child { border-top: 0; }
  table.lines td { display: inline; padding: 0 6px 0 0; border: 0; font-size: 13px; }
  table.lines td:last-child { display: block; }
}
)css";

const std::string_view PageScript = R"js('use strict';
const main = document.querySelector('main[data-refresh]');
async function refresh() {
  if (document.hidden)
    return;
  try {
    const answer = await fetch(location.href, {cache: 'no-store'});
    const page = new DOMParser().parseFromString(await answer.text(), 'text/html');
    const fresh = page.querySelector('main');
    if (answer.ok && fresh && fresh.innerHTML !== main.innerHTML)
      main.innerHTML = fresh.innerHTML;
    document.body.classList.toggle('stale', !answer.ok);
  } catch {
    document.body.classList.add('stale');
  }
}
if (main)
  setInterval(refresh, Number(main.dataset.refresh));
)js";

const std::string_view PageIcon =
    R"svg(<svg xmlns="http://www.w3.org/2000/svg" viewBox="0 0 32 32"><rect width="32" height="32" rx="6" fill="#0b6e99"/><path d="M4 16h5l4-9 6 18 4-9h5" fill="none" stroke="#fff" stroke-width="3" stroke-linejoin="round" stroke-linecap="round"/></svg>
)svg";

} // namespace simulator
