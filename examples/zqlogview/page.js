'use strict';
{
  const field = (name) => document.getElementById(name);
  const groups = Array.from(document.querySelectorAll('tbody'), (body) => ({
    body,
    rows: Array.from(body.rows, (row) => ({
      row,
      // What has no level is never filtered by it, and what has no logger belongs to none.
      level: Number(row.dataset.level ?? 7),
      logger: row.cells[2]?.textContent ?? '',
      text: null,
    })),
  }));
  const total = groups.reduce((sum, group) => sum + group.rows.length, 0);

  // Made when a text is first looked for, and kept.
  const textOf = (entry) =>
    entry.text ??= (entry.row.cells.length === 1 ? [entry.row.cells[0]] : [entry.row.cells[4], entry.row.cells[5]])
      .map((cell) => cell.textContent).join('\n').toLowerCase();

  const filter = () => {
    const level = Number(field('level').value);
    const logger = field('logger').value.trim();
    const text = field('text').value.toLowerCase();
    let shown = 0;
    for (const { body, rows } of groups) {
      let here = 0;
      for (const entry of rows) {
        const fits = entry.level >= level &&
          (logger === '' || entry.logger === logger || entry.logger.startsWith(logger + '.')) &&
          (text === '' || textOf(entry).includes(text));
        if (entry.row.hidden === fits) entry.row.hidden = !fits;
        if (fits) ++here;
      }
      body.hidden = here === 0;
      body.style.containIntrinsicHeight = `${here * 1.5}rem`;  // until it comes into view
      shown += here;
    }
    field('count').value = `${shown} of ${total}`;
  };

  // The filter stands in the address behind the '#', so that a view can be linked.
  const names = ['level', 'logger', 'text'];
  const load = () => {
    const state = new URLSearchParams(location.hash.slice(1));
    for (const name of names) field(name).value = state.get(name) ?? '';
    if (field('level').selectedIndex < 0) field('level').selectedIndex = 0;
    filter();
  };
  const save = () => {
    const state = new URLSearchParams();
    for (const name of names) if (!['', '0'].includes(field(name).value)) state.set(name, field(name).value);
    history.replaceState(null, '', `#${state}`);
    filter();
  };

  let pending = 0;
  field('filter').addEventListener('input', () => {
    clearTimeout(pending);
    pending = setTimeout(save, 150);
  });
  field('filter').addEventListener('submit', (event) => event.preventDefault());
  addEventListener('hashchange', load);
  field('filter').hidden = false;
  load();
}
