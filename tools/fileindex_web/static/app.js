// The management console: the folder listing, changes, pause and resume, explanations, share
// flags and progress, through the JSON API of fileindex-web. Everything shown is refreshed every
// few seconds, so changes made by other tools appear without a reload.
'use strict';

const POLL_MS = 3000;
const KINDS = ['document', 'audio', 'video', 'photo'];
const KIND_LABELS = { document: 'Documents', audio: 'Audio', video: 'Video', photo: 'Photos' };
const state = { offset: 0, limit: 10, sortBy: 'path', direction: 'ASC', total: 0, largest: {}, previous: null, pendings: {}, openFolds: {} };
const $ = (id) => document.getElementById(id);

function show(text, kind, details) {
  $('message').textContent = text;
  $('message').className = kind || '';
  const list = $('message-details');
  list.replaceChildren();
  for (const line of details || []) {
    const item = document.createElement('li');
    item.textContent = line;
    list.appendChild(item);
  }
  $('message-more').hidden = !(details && details.length);
}

const sleep = (ms) => new Promise((done) => setTimeout(done, ms));

class ApiError extends Error {
  constructor(answer) {
    super(answer.message || 'the request failed');
    this.log = answer.log || [];
    this.cause = (answer.error && answer.error.name) || '';
    this.saved = (answer.saved || []).length > 0;
  }
}

// The message goes just after the form, table or block (marked data-results) whose control was
// used, so that it is seen where the user is looking; never inside what is drawn anew.
function placeMessageNear(control) {
  const anchor = control && control.closest && control.closest('form, table, [data-results]');
  if (anchor) anchor.after($('message'), $('message-more'));
}

// One API call; a held lock (409) is retried after Retry-After, a few times.
async function api(method, url, body) {
  for (let attempt = 0; ; attempt++) {
    // The token goes with every call: searches read the files' text and need it as changes do.
    const options = { method, headers: { 'X-Fileindex-Token': localStorage.getItem('fileindexToken') || '' } };
    if (method !== 'GET') {
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
    if (!answer.ok) throw new ApiError(answer);
    return answer.result;
  }
}

// Runs a change and tells how it went, next to the control used; the library's log lines stay
// one click away. A change saved but not yet applied is a warning that says what happens next.
async function act(description, work) {
  placeMessageNear(document.activeElement);
  try {
    const warnings = await work();
    if (warnings && warnings.length) show(description + ': done, but ' + warnings.join('; '), 'warning');
    else show(description + ': done.');
    return true;
  } catch (error) {
    if (error.saved) {
      const next = error.cause === 'DAEMON_UNREACHABLE' ? ' It takes effect when the indexing daemon answers again.' : '';
      show(description + ': saved, not applied yet. ' + error.message + '.' + next, 'warning', error.log);
    } else if (error.cause === 'BAD_QUERY') {
      show(description + ': ' + error.message.replace(/^.*?BAD_QUERY: /, '') + '. Type a word or the start of one, in letters or digits.',
        'warning');
    } else {
      show(description + ' failed: ' + error.message, 'error', error.log);
    }
    return false;
  }
}

function cell(row, text, label, className) {
  const td = row.insertCell();
  td.dataset.label = label;
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

function button(parent, label, onClick, name) {
  const b = document.createElement('button');
  b.type = 'button';
  b.textContent = label;
  if (name) b.setAttribute('aria-label', name);
  b.addEventListener('click', onClick);
  parent.appendChild(b);
  return b;
}

function fetchPage() {
  return api('GET', '/api/folders?' + new URLSearchParams({ offset: state.offset, limit: state.limit, sort_by: state.sortBy,
    sort_direction: state.direction, additional: 'status,is_valid,indexed_files' }));
}

// A folder that cannot be indexed carries the word "paused"; the console says why instead.
function statusOf(additional) {
  return additional.refused_by ? ['not indexable: ' + additional.refused_by, 'badge refused']
    : [additional.status, 'badge ' + additional.status];
}

async function loadFolders() {
  const listing = await fetchPage();
  state.total = listing.total;
  const body = $('folders').tBodies[0];
  body.replaceChildren();
  for (const folder of listing.folder) {
    const row = body.insertRow();
    cell(row, folder.path, 'Path');
    cell(row, folder.name, 'Name');
    for (const kind of KINDS) cell(row, folder[kind] ? 'yes' : 'no', KIND_LABELS[kind]).classList.add('kind');
    // On a narrow screen the four switches read as one line.
    const kinds = KINDS.filter((kind) => folder[kind]).map((kind) => KIND_LABELS[kind].toLowerCase());
    cell(row, kinds.length ? kinds.join(', ') : 'nothing', 'Indexes').classList.add('kinds');
    const [word, badge] = statusOf(folder.additional);
    cell(row, word, 'Status', badge);
    cell(row, folder.additional.is_valid ? 'valid' : 'not valid', 'Valid');
    const files = folder.additional.indexed_files;
    cell(row, files === null ? 'unknown' : files + (files === 1 ? ' file' : ' files'), 'In the index');
    const actions = row.insertCell();
    actions.dataset.label = 'Actions';
    button(actions, 'Edit', () => edit(folder), 'Edit ' + folder.path);
    button(actions, 'Reindex', () => act('Reindex ' + folder.path, async () => {
      await api('POST', '/api/reindex', [folder.path]);
      await refresh();
    }), 'Reindex ' + folder.path);
    button(actions, 'Explain', () => explain(folder.path), 'Explain ' + folder.path);
    button(actions, 'Delete', async () => {
      if (!confirm('Stop indexing ' + folder.path + '? Its files stay on the share; they only leave the index.')) return;
      await act('Delete ' + folder.path, async () => {
        await api('POST', '/api/folders/delete', [folder.path]);
        await refresh();
      });
      $('folders-title').focus();  // the row and its buttons are gone
    }, 'Delete ' + folder.path);
  }
  const page = Math.floor(state.offset / state.limit) + 1;
  const pages = Math.max(1, Math.ceil(state.total / state.limit));
  $('page-info').textContent = 'Page ' + page + ' of ' + pages + ' (' + state.total + ' folders)';
  $('previous').disabled = state.offset === 0;
  $('next').disabled = state.offset + state.limit >= state.total;
  for (const b of document.querySelectorAll('button.sort')) {
    b.closest('th').setAttribute('aria-sort',
      b.dataset.key === state.sortBy ? (state.direction === 'ASC' ? 'ascending' : 'descending') : 'none');
  }
}

// Changes a folder in place: its path stays (another path is another folder), Cancel goes back.
function edit(folder) {
  $('folder-path').value = folder.path;
  $('folder-path').readOnly = true;
  $('folder-name').value = folder.name;
  for (const kind of KINDS) $('folder-' + kind).checked = folder[kind];
  $('edit-title').textContent = 'Change folder ' + folder.path;
  $('cancel-edit').hidden = false;
  $('folder-name').focus();
}

function pauseText(pause) {
  if (!pause.paused) return 'running';
  return pause.resume_time === 0 ? 'paused until resumed'
    : 'paused until ' + new Date(pause.resume_time * 1000).toLocaleString();
}

function durationText(seconds) {
  if (seconds < 60) return Math.max(seconds, 0) + ' s';
  const minutes = Math.ceil(seconds / 60);
  return minutes < 60 ? minutes + ' min' : Math.floor(minutes / 60) + ' h' + (minutes % 60 ? ' ' + (minutes % 60) + ' min' : '');
}

// The one sentence that says whether indexing is done; a pause's end in the browser's own time.
function bannerText(banner) {
  if (banner.state !== 'paused' || banner.resume_time === null) return banner.text + '.';
  const end = new Date(banner.resume_time * 1000);
  const left = durationText(Math.round(banner.resume_time - Date.now() / 1000));
  const waiting = banner.pending > 0 ? '; ' + banner.pending + (banner.pending === 1 ? ' change waits' : ' changes wait') : '';
  return 'Paused until ' + end.toLocaleTimeString([], { hour: '2-digit', minute: '2-digit' }) + ' (' + left + ' left)' + waiting + '.';
}

async function loadStatus() {
  const status = await api('GET', '/api/status');
  $('banner').textContent = bannerText(status.banner);
  $('banner').className = 'banner ' + status.banner.state;
  $('resume').disabled = !status.pause.paused;
  $('service-word').textContent = status.status;
  $('pause-text').textContent = '(' + pauseText(status.pause) + ')';
  const daemon = status.daemon;
  $('daemon').textContent = daemon.answers ? 'Indexing daemon: answers.'
    : 'Indexing daemon: does not answer at ' + daemon.socket + ' (' + daemon.reason + ').';
  $('daemon').className = daemon.answers ? '' : 'problem';
  $('not-done').textContent = status.not_done ? 'Not done: ' + status.not_done + '.' : '';
  renderShares(status.shares);
  renderProgress(status.progress);
}

function renderShares(shares) {
  const target = $('shares');
  target.replaceChildren();
  for (const share of shares.filter((s) => s.no_space || s.need_reindex)) {
    const line = document.createElement('p');
    line.append('Share ' + share.share + ': ');
    if (share.no_space) {
      line.append('out of space, indexing stopped. ');
      button(line, 'Revive', () => act('Revive ' + share.share, async () => {
        await api('POST', '/api/shares/revive', { share: share.share });
        await loadStatus();
      }));
    }
    if (share.need_reindex) {
      line.append(' Needs a full reindex (events were lost). ');
      button(line, 'Clear the flag', () => act('Clear the flag of ' + share.share, async () => {
        await api('POST', '/api/shares/need-reindex', { share: share.share, need_reindex: false });
        await loadStatus();
      }));
    }
    target.appendChild(line);
  }
}

// Files per second drained since the previous poll, and the time left at that rate.
function drain(name, left, seconds) {
  const before = state.previous && state.previous[name];
  const rate = before !== undefined && seconds > 0 && before > left ? (before - left) / seconds : 0;
  const timeLeft = left === 0 ? 'done' : rate > 0 ? 'about ' + durationText(Math.ceil(left / rate)) + ' left' : 'time left unknown';
  return { rate, timeLeft };
}

function filesText(n) {
  return n + (n === 1 ? ' file' : ' files');
}

// A labelled bar and its words for a share or folder: files left (what the daemon has applied of
// the batch it took no longer counts), rate, time left, and since when it is up to date.
function progressLine(key, label, entry, seconds, extra) {
  const left = entry.files_left;
  state.pendings[key] = left;
  state.largest[key] = Math.max(state.largest[key] || 0, left);
  const largest = state.largest[key];
  const line = document.createElement('p');
  const bar = document.createElement('span');
  bar.className = 'bar';
  bar.setAttribute('role', 'progressbar');
  bar.setAttribute('aria-label', 'Indexing of ' + label);
  const done = document.createElement('span');
  // Nothing left is a full bar, for every share and folder alike.
  const percent = left === 0 ? 100 : Math.round(100 * (largest - left) / largest);
  done.style.width = percent + '%';
  bar.setAttribute('aria-valuenow', String(percent));
  bar.setAttribute('aria-valuetext', left === 0 ? 'done' : filesText(left) + ' left');
  bar.appendChild(done);
  const { rate, timeLeft } = drain(key, left, seconds);
  const since = left === 0 && entry.up_to_date ? ', up to date since ' + new Date(entry.up_to_date * 1000).toLocaleTimeString() : '';
  line.append(label + ' ', bar, ' ' + filesText(left) + ' left' + extra + ', ' + rate.toFixed(1) + '/s, ' + timeLeft + since);
  return line;
}

// Per share a line, then a line per folder with files left; the folders that are up to date are
// folded away under one line, and stay open once opened.
function renderProgress(progress) {
  const now = Date.now();
  const seconds = state.previousAt ? (now - state.previousAt) / 1000 : 0;
  const target = $('progress');
  target.replaceChildren();
  state.pendings = {};
  for (const share of progress.shares) {
    const unread = share.unread.length ? ' (' + share.unread.join(', ') + ' not read: sparse or too large)' : '';
    const line = progressLine('share ' + share.share, share.share, share, seconds, unread);
    line.className = 'share-progress';
    target.appendChild(line);
    const folderLine = (folder) => {
      const item = progressLine(folder.path, folder.path, folder, seconds, '');
      item.className = 'folder-progress';
      return item;
    };
    for (const folder of share.folders.filter((f) => f.files_left > 0)) target.appendChild(folderLine(folder));
    const idle = share.folders.filter((f) => f.files_left === 0);
    if (!idle.length) continue;
    const fold = document.createElement('details');
    fold.className = 'folder-fold';
    fold.open = Boolean(state.openFolds[share.share]);
    fold.addEventListener('toggle', () => { state.openFolds[share.share] = fold.open; });
    const summary = document.createElement('summary');
    summary.textContent = idle.length + (idle.length === 1 ? ' folder' : ' folders') + ' of ' + share.share + ' up to date';
    fold.append(summary, ...idle.map(folderLine));
    target.appendChild(fold);
  }
  if (!progress.shares.length) target.textContent = 'Nothing is indexed.';
  state.previous = state.pendings;
  state.previousAt = now;
}

// A fact as a person reads it: yes / no for flags, "none" for a missing value.
function factText(value) {
  if (value === null || value === undefined) return 'none';
  if (typeof value === 'boolean') return value ? 'yes' : 'no';
  return String(value);
}

function factsText(facts) {
  if (!facts) return '';
  return Object.entries(facts).map(([name, value]) => name.replace(/_/g, ' ') + ' ' + factText(value)).join(', ');
}

function switchesText(folder) {
  return ['document', 'audio', 'video', 'photo'].map((type) => type + ' ' + (folder[type] ? 'on' : 'off')).join(', ');
}

function explainFacts(e) {
  const file = e.file;
  const folder = e.governing_folder;
  const inIndex = file.in_index === null ? 'unknown (' + file.index_problem + ')'
    : file.kind === 'directory' ? file.indexed_files + ' files' : (file.in_index ? 'yes' : 'no');
  const service = e.service;
  return [
    'Governing folder: ' + (folder ? folder.path + (folder.name ? ' (' + folder.name + ')' : '') + '; ' + switchesText(folder) : 'none'),
    'Type: ' + (file.type === null ? 'none' : file.type + (file.type_switched_on === false ? ' (switched off in that folder)' : '')) +
      '; in the index: ' + inIndex,
    ...(file.fields && Object.keys(file.fields).length
      ? ['Read from it: ' + Object.entries(file.fields).map(([name, value]) => name.replace(/_/g, ' ') + ' ' + factText(value)).join(', ')] : []),
    ...(file.extraction_problem ? ['Indexed by name only: ' + file.extraction_problem] : []),
    'Service: ' + service.status + (service.paused ? ', paused' : '') +
      (service.daemon_answers ? '' : ', the indexing daemon does not answer') + '; ' +
      (e.pending.queue + e.pending.companion) + ' changes pending for the path',
  ];
}

// The verdict first, the facts behind it, and the rules folded away.
async function explain(path) {
  $('explain-path').value = path;
  const target = $('explanation');
  target.replaceChildren();
  await act('Explain ' + path, async () => {
    const e = await api('GET', '/api/explain?' + new URLSearchParams({ path }));
    const verdict = document.createElement('p');
    verdict.textContent = path + ': ' + e.verdict + (e.refused_by ? ' (refused by ' + e.refused_by + ')' : '') + '.';
    verdict.className = e.verdict === 'in the index' ? '' : 'refuse';
    verdict.id = 'explain-verdict';
    target.appendChild(verdict);
    const facts = document.createElement('ul');
    for (const line of explainFacts(e)) {
      const item = document.createElement('li');
      item.textContent = line;
      facts.appendChild(item);
    }
    target.appendChild(facts);
    const rules = document.createElement('details');
    const summary = document.createElement('summary');
    summary.textContent = 'Every rule (' + e.rules.filter((r) => r.verdict === 'pass').length + ' passed)';
    rules.appendChild(summary);
    const list = document.createElement('ul');
    for (const rule of e.rules) {
      const item = document.createElement('li');
      const ruleFacts = factsText(rule.facts);
      item.textContent = rule.verdict.replace('_', ' ') + ': ' + rule.rule.replace(/_/g, ' ') + ' (refuses ' + rule.description + ')' +
        (ruleFacts ? '; ' + ruleFacts : '');
      if (rule.verdict === 'refuse') item.className = 'refuse';
      list.appendChild(item);
    }
    rules.appendChild(list);
    target.appendChild(rules);
  });
}

function sizeText(bytes) {
  const units = ['B', 'KiB', 'MiB', 'GiB'];
  let size = bytes;
  let unit = 0;
  while (size >= 1024 && unit < units.length - 1) { size /= 1024; unit++; }
  return (unit === 0 ? size : size.toFixed(1)) + ' ' + units[unit];
}

// The hits, best first, each with its matched words marked; the text is never read as HTML.
const SEARCH_PAGE = 20;

function clearSearch() {
  $('search-hits').replaceChildren();
  $('search-facets').replaceChildren();
  $('search-total').textContent = '';
  $('search-more').hidden = true;
  $('search-clear').hidden = true;
}

// What a hit is about, from the fields of its kind.
function aboutText(fields) {
  const parts = ['title', 'artist', 'album', 'year'].filter((name) => fields[name] !== undefined).map((name) => String(fields[name]));
  if (Number.isInteger(fields.duration)) parts.push(Math.floor(fields.duration / 60) + ':' + String(fields.duration % 60).padStart(2, '0'));
  const camera = [fields.camera_make, fields.camera_model].filter((part) => typeof part === 'string').join(' ');
  if (camera) parts.push(camera);
  if (typeof fields.taken === 'string') parts.push('taken ' + fields.taken);
  if (typeof fields.author === 'string') parts.push(fields.author);
  if (Number.isInteger(fields.pages)) parts.push(fields.pages + ' pages');
  return parts.join(', ');
}

// A chip per value of each facet: pressing one adds its filter to the query and searches again.
function renderFacets(facets) {
  const target = $('search-facets');
  target.replaceChildren();
  for (const [name, values] of Object.entries(facets || {})) {
    const entries = Object.entries(values);
    if (entries.length < 1) continue;
    const group = document.createElement('p');
    group.className = 'facet';
    group.append(name + ': ');
    for (const [value, count] of entries.sort((a, b) => b[1] - a[1])) {
      const filter = name + ':' + (/\s/.test(value) ? '"' + value + '"' : value);
      const chip = button(group, value + ' (' + count + ')', () => {
        $('search-query').value = ($('search-query').value.trim() + ' ' + filter).trim();
        search();
      }, 'Only ' + name + ' ' + value + ', ' + count + ' found');
      chip.className = 'chip';
    }
    target.appendChild(group);
  }
}

// One page of hits, best first, from `offset` on; the total says how many there are in all.
async function search(offset = 0) {
  const query = $('search-query').value.trim();
  clearSearch();
  await act('Search for ' + query, async () => {
    const result = await api('GET', '/api/search?' +
      new URLSearchParams({ q: query, type: $('search-type').value, sort: $('search-sort').value, facets: '1', offset,
        limit: SEARCH_PAGE }));
    const list = $('search-hits');
    list.start = offset + 1;
    const shown = result.hits.length;
    $('search-total').textContent = result.total === 0 ? 'Nothing found.'
      : (offset === 0 && shown === result.total ? result.total + ' found.'
        : 'Hits ' + (offset + 1) + ' to ' + (offset + shown) + ' of ' + result.total + '.');
    $('search-more').hidden = offset + shown >= result.total;
    $('search-more').onclick = () => search(offset + shown);
    $('search-clear').hidden = false;
    renderFacets(result.facets);
    for (const hit of result.hits) {
      const item = document.createElement('li');
      const path = document.createElement('strong');
      path.textContent = hit.path;
      const facts = document.createElement('span');
      facts.className = 'facts';
      facts.textContent = ' ' + hit.type + ', ' + sizeText(hit.size) + ', ' + new Date(hit.mtime * 1000).toLocaleString();
      const about = document.createElement('div');
      about.className = 'about';
      about.textContent = aboutText(hit.fields);
      const snippet = document.createElement('div');
      snippet.className = 'snippet';
      for (const piece of hit.snippet) {
        const part = document.createElement(piece.match ? 'mark' : 'span');
        part.textContent = piece.text;
        snippet.appendChild(part);
      }
      item.append(path, facts, ...(about.textContent ? [about] : []), snippet);
      list.appendChild(item);
    }
  });
}

async function refresh() {
  await loadFolders();
  await loadStatus();
}

function resetForm() {
  $('folder-form').reset();
  $('folder-path').readOnly = false;
  $('edit-title').textContent = 'Add or change a folder';
  $('cancel-edit').hidden = true;
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
  $('folder-form').addEventListener('submit', async (event) => {
    event.preventDefault();
    const folder = { path: $('folder-path').value.trim(), name: $('folder-name').value };
    for (const kind of KINDS) folder[kind] = $('folder-' + kind).checked;
    const saved = await act('Save ' + folder.path, async () => {
      const result = await api('POST', '/api/folders', [folder]);
      await refresh();
      return result.warnings;
    });
    if (saved) resetForm();
  });
  $('pause-form').addEventListener('submit', (event) => {
    event.preventDefault();
    act('Pause', async () => { await api('POST', '/api/pause', { hours: Number($('pause-hours').value) }); await loadStatus(); });
  });
  $('resume').addEventListener('click', () => act('Resume', async () => { await api('POST', '/api/resume'); await loadStatus(); }));
  $('explain-form').addEventListener('submit', (event) => { event.preventDefault(); explain($('explain-path').value.trim()); });
  $('search-form').addEventListener('submit', (event) => { event.preventDefault(); search(); });
  $('search-clear').addEventListener('click', () => { clearSearch(); $('search-query').focus(); });
  $('cancel-edit').addEventListener('click', () => { resetForm(); $('folder-path').focus(); });
  act('Load', refresh);
  setInterval(() => refresh().catch((error) => show('Refresh failed: ' + error.message, 'error', error.log)), POLL_MS);
}

document.addEventListener('DOMContentLoaded', wire);
