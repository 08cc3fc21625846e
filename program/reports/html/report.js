'use strict';
(() => {
  const rows = Array.from(document.querySelectorAll('table.events tbody tr'));
  const byId = (id) => document.getElementById(id);
  const cell = (row, name) => { const td = row.querySelector('td.' + name); return td ? td.textContent : ''; };

  // Times: in UTC as written, or in the zone that the reader chooses.
  const times = Array.from(document.querySelectorAll('time[datetime]'));
  const original = times.map((t) => t.textContent);
  const zones = byId('zone');
  if (zones) {
    const here = Intl.DateTimeFormat().resolvedOptions().timeZone;
    const add = (value, text) => { const o = document.createElement('option'); o.value = value; o.textContent = text; zones.append(o); };
    if (here && here !== 'UTC') add(here, 'Here: ' + here);
    if (Intl.supportedValuesOf) Intl.supportedValuesOf('timeZone').forEach((z) => { if (z !== here) add(z, z); });
    zones.addEventListener('change', () => {
      const zone = zones.value;
      const form = zone && new Intl.DateTimeFormat('en-CA', { timeZone: zone, hourCycle: 'h23', year: 'numeric',
        month: '2-digit', day: '2-digit', hour: '2-digit', minute: '2-digit', second: '2-digit' });
      times.forEach((t, i) => {
        if (!form) { t.textContent = original[i]; return; }
        const p = {};
        form.formatToParts(new Date(t.dateTime)).forEach((x) => { p[x.type] = x.value; });
        t.textContent = `${p.year}-${p.month}-${p.day} ${p.hour}:${p.minute}:${p.second}`;
      });
    });
  }

  // Filters of the events.
  const filters = byId('filters');
  if (filters) {
    const fill = (select, name) => {
      Array.from(new Set(rows.map((r) => cell(r, name)))).filter((t) => t).sort().forEach((text) => {
        const o = document.createElement('option'); o.textContent = text; select.append(o);
      });
      select.closest('label').hidden = select.options.length < 2;
    };
    const part = byId('by-part'), sensor = byId('by-sensor'), text = byId('by-text'), count = byId('count');
    fill(part, 'part');
    fill(sensor, 'sensor');
    const boxes = Array.from(filters.querySelectorAll('input[type=checkbox]'));
    const apply = () => {
      const wanted = new Set(boxes.filter((b) => b.checked).map((b) => b.value));
      const words = text.value.toLowerCase();
      const all = wanted.size === boxes.length && !part.value && !sensor.value && !words;
      let shown = 0;
      rows.forEach((row) => {
        const good = all || (wanted.has(row.className) && (!part.value || cell(row, 'part') === part.value) &&
          (!sensor.value || cell(row, 'sensor') === sensor.value) && (!words || row.textContent.toLowerCase().includes(words)));
        row.hidden = !good;
        if (good) shown++;
      });
      document.querySelectorAll('details.fold').forEach((fold) => {
        const any = fold.querySelector('tbody tr:not([hidden])');
        fold.hidden = !any;
        if (!all && any) fold.open = true;
      });
      count.textContent = shown === rows.length ? `${shown} events` : `${shown} of ${rows.length} events`;
    };
    filters.addEventListener('input', apply);
    filters.addEventListener('reset', () => setTimeout(apply));
    filters.addEventListener('submit', (e) => e.preventDefault());
    filters.hidden = false;
    apply();
  }

  // A mark of the timeline leads to its row, also when that is folded or filtered away.
  const reveal = () => {
    const row = location.hash && byId(decodeURIComponent(location.hash.slice(1)));
    if (!row || !row.closest('table.events')) return;
    row.hidden = false;
    const fold = row.closest('details.fold');
    if (fold) { fold.hidden = false; fold.open = true; }
    row.scrollIntoView({ block: 'center' });
  };
  window.addEventListener('hashchange', reveal);
  if (location.hash) reveal();
  window.addEventListener('beforeprint', () => document.querySelectorAll('section details:not(.fold)').forEach((d) => { d.open = true; }));
})();
