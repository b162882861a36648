// The management console: the folder listing, changes, pause and resume, explanations and
// progress, through the JSON API of fileindex-web.
'use strict';

const state = { offset: 0, limit: 10, sortBy: 'path', direction: 'ASC', total: 0, largest: {} };
const $ = (id) => document.getElementById(id);

function show(text, kind) {
  $('message').textContent = text;
  $('message').className = kind || '';
}

const sleep = (ms) => new Promise((done) => setTimeout(done, ms));

// One API call; a held lock (409) is retried after Retry-After, a few times.
async function api(method, url, body) {
  for (let attempt = 0; ; attempt++) {
    const options = { method, headers: {} };
    if (method !== 'GET') {
      options.headers['X-Fileindex-Token'] = localStorage.getItem('fileindexToken') || '';
      options.headers['Content-Type'] = 'application/json';
      options.body = JSON.stringify(body === undefined ? {} : body);
    }
    const response = await fetch(url, options);
    const answer = await response.json().catch(() => ({ ok: false, message: 'the server answered ' + response.status }));
    if (response.status === 409 && attempt < 5) {
      show('Busy, retrying…', 'busy');
      await sleep(1000 * (Number(response.headers.get('Retry-After')) || 1));
      continue;
    }
    if (!answer.ok) {
      const log = answer.log && answer.log.length ? ' (' + answer.log.join('; ') + ')' : '';
      throw new Error(answer.message + log);
    }
    return answer.result;
  }
}

async function act(description, work) {
  try {
    await work();
    show(description + ': done.');
  } catch (error) {
    show(description + ' failed: ' + error.message, 'error');
  }
}

function cell(row, text, className) {
  const td = row.insertCell();
  if (className) {
    const badge = document.createElement('span');
    badge.className = className;
    badge.textContent = text;
    td.appendChild(badge);
  } else {
    td.textContent = text;
  }
  return td;
}

function button(parent, label, onClick) {
  const b = document.createElement('button');
  b.textContent = label;
  b.addEventListener('click', onClick);
  parent.appendChild(b);
}

// The library's descending page is its first records reversed; a descending page here is the
// matching ascending page counted from the end, reversed.
async function fetchPage() {
  const ask = (offset, limit) => api('GET', '/api/folders?' + new URLSearchParams({
    offset, limit, sort_by: state.sortBy, sort_direction: 'ASC', additional: 'status,is_valid' }));
  if (state.direction === 'ASC') return ask(state.offset, state.limit);
  const total = (await ask(0, 0)).total;
  const end = Math.max(0, total - state.offset);
  const listing = await ask(Math.max(0, end - state.limit), Math.min(state.limit, end));
  listing.folder.reverse();
  return listing;
}

async function loadFolders() {
  const listing = await fetchPage();
  state.total = listing.total;
  const body = $('folders').tBodies[0];
  body.replaceChildren();
  for (const folder of listing.folder) {
    const row = body.insertRow();
    cell(row, folder.path);
    cell(row, folder.name);
    for (const kind of ['document', 'audio', 'video', 'photo']) cell(row, folder[kind] ? 'yes' : 'no');
    cell(row, folder.additional.status, 'badge ' + folder.additional.status);
    cell(row, folder.additional.is_valid ? 'valid' : 'not valid');
    const actions = row.insertCell();
    button(actions, 'Edit', () => edit(folder));
    button(actions, 'Reindex', () => act('Reindex ' + folder.path, async () => {
      await api('POST', '/api/reindex', [folder.path]);
      await refresh();
    }));
    button(actions, 'Explain', () => explain(folder.path));
    button(actions, 'Delete', () => {
      if (!confirm('Stop indexing ' + folder.path + '?')) return;
      act('Delete ' + folder.path, async () => {
        await api('POST', '/api/folders/delete', [folder.path]);
        await refresh();
      });
    });
  }
  const page = Math.floor(state.offset / state.limit) + 1;
  const pages = Math.max(1, Math.ceil(state.total / state.limit));
  $('page-info').textContent = 'Page ' + page + ' of ' + pages + ' (' + state.total + ' folders)';
  $('previous').disabled = state.offset === 0;
  $('next').disabled = state.offset + state.limit >= state.total;
  for (const b of document.querySelectorAll('button.sort')) {
    b.setAttribute('aria-sort', b.dataset.key === state.sortBy ? (state.direction === 'ASC' ? 'ascending' : 'descending') : 'none');
  }
}

function edit(folder) {
  $('folder-path').value = folder.path;
  $('folder-name').value = folder.name;
  for (const kind of ['document', 'audio', 'video', 'photo']) $('folder-' + kind).checked = folder[kind];
  $('folder-path').focus();
}

async function loadStatus() {
  const status = await api('GET', '/api/status');
  $('service-word').textContent = status.status;
  const pause = status.pause;
  $('pause-text').textContent = !pause.paused ? '(running)'
    : pause.resume_time === 0 ? '(paused until resumed)'
    : '(paused until ' + new Date(pause.resume_time * 1000).toLocaleString() + ')';
  renderProgress(status.progress);
}

function renderProgress(progress) {
  const target = $('progress');
  target.replaceChildren();
  for (const share of progress.shares) {
    state.largest[share.share] = Math.max(state.largest[share.share] || 0, share.pending);
    const line = document.createElement('p');
    const bar = document.createElement('span');
    bar.className = 'bar';
    const done = document.createElement('span');
    const largest = state.largest[share.share];
    done.style.width = (largest === 0 ? 100 : Math.round(100 * (largest - share.pending) / largest)) + '%';
    bar.appendChild(done);
    line.append(share.share + ' ', bar, ' ' + share.pending + ' pending');
    target.appendChild(line);
  }
  if (!progress.shares.length) target.textContent = 'Nothing is indexed.';
}

async function explain(path) {
  $('explain-path').value = path;
  await act('Explain ' + path, async () => {
    const e = await api('GET', '/api/explain?' + new URLSearchParams({ path }));
    const target = $('explanation');
    target.replaceChildren();
    const verdict = document.createElement('p');
    verdict.textContent = e.indexable ? path + ' can be indexed.' : path + ' cannot be indexed: refused by ' + e.refused_by + '.';
    verdict.className = e.indexable ? '' : 'refuse';
    verdict.id = 'explain-verdict';
    target.appendChild(verdict);
    const list = document.createElement('ul');
    const rules = e.rules.filter((r) => r.rule === e.refused_by).concat(e.rules.filter((r) => r.rule !== e.refused_by));
    for (const rule of rules) {
      const item = document.createElement('li');
      item.textContent = rule.verdict + ' — ' + rule.rule + ': ' + rule.description + ' ' + JSON.stringify(rule.facts);
      if (rule.verdict === 'refuse') item.className = 'refuse';
      list.appendChild(item);
    }
    target.appendChild(list);
    const governing = document.createElement('p');
    governing.textContent = 'Governing folder: ' + (e.governing_folder ? e.governing_folder.path : 'none') +
      '; status ' + e.status + '; pending ' + (e.pending.queue + e.pending.companion) + '.';
    target.appendChild(governing);
  });
}

async function refresh() {
  await loadFolders();
  await loadStatus();
}

function wire() {
  $('token').value = localStorage.getItem('fileindexToken') || '';
  $('token-form').addEventListener('submit', (event) => {
    event.preventDefault();
    localStorage.setItem('fileindexToken', $('token').value.trim());
    show('Token kept in this browser.');
  });
  for (const b of document.querySelectorAll('button.sort')) {
    b.addEventListener('click', () => {
      state.direction = state.sortBy === b.dataset.key && state.direction === 'ASC' ? 'DESC' : 'ASC';
      state.sortBy = b.dataset.key;
      act('Sort', loadFolders);
    });
  }
  $('previous').addEventListener('click', () => { state.offset = Math.max(0, state.offset - state.limit); act('Page', loadFolders); });
  $('next').addEventListener('click', () => { state.offset += state.limit; act('Page', loadFolders); });
  $('per-page').addEventListener('change', () => { state.limit = Number($('per-page').value); state.offset = 0; act('Page', loadFolders); });
  $('folder-form').addEventListener('submit', (event) => {
    event.preventDefault();
    const folder = { path: $('folder-path').value.trim(), name: $('folder-name').value };
    for (const kind of ['document', 'audio', 'video', 'photo']) folder[kind] = $('folder-' + kind).checked;
    act('Save ' + folder.path, async () => { await api('POST', '/api/folders', [folder]); await refresh(); });
  });
  $('pause-form').addEventListener('submit', (event) => {
    event.preventDefault();
    act('Pause', async () => { await api('POST', '/api/pause', { hours: Number($('pause-hours').value) }); await loadStatus(); });
  });
  $('resume').addEventListener('click', () => act('Resume', async () => { await api('POST', '/api/resume'); await loadStatus(); }));
  $('explain-form').addEventListener('submit', (event) => { event.preventDefault(); explain($('explain-path').value.trim()); });
  act('Load', refresh);
  setInterval(() => loadStatus().catch((error) => show('Status failed: ' + error.message, 'error')), 3000);
}

document.addEventListener('DOMContentLoaded', wire);
