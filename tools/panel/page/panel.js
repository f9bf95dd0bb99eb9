// The file index panel's page: talks to /api/v1/ only, builds every element with textContent (a
// path is never markup), and polls the status once a second.
'use strict';

const kMedia = [['document', 'Documents'], ['audio', 'Audio'], ['video', 'Video'], ['photo', 'Photos']];
const kStateWords = { finished: 'finished', processing: 'processing', paused: 'paused', err_no_space: 'out of space' };
const kPollMilliseconds = 1000;
const kBusyAttempts = 5;

const view = {
  offset: 0,
  limit: 100,
  sortBy: 'path',
  direction: 'ASC',
  total: 0,
  shownFolders: new Set(),  // path_bytes of the rows in the table
  tableShown: false,
};

const $ = (id) => document.getElementById(id);
const sleep = (milliseconds) => new Promise((resolve) => setTimeout(resolve, milliseconds));

function element(tag, properties = {}, children = []) {
  const made = document.createElement(tag);
  for (const [name, value] of Object.entries(properties)) {
    if (name === 'text') {
      made.textContent = value;
    } else if (name.startsWith('data-') || name.startsWith('aria-') || name === 'role') {
      made.setAttribute(name, value);
    } else {
      made[name] = value;
    }
  }
  for (const child of children) {
    made.append(child);
  }
  return made;
}

// ---- Talking to the panel ----

async function api(method, route, body) {
  const options = { method, credentials: 'same-origin', headers: { 'X-Fileindex-Panel': '1' } };
  if (body !== undefined) {
    options.headers['Content-Type'] = 'application/json';
    options.body = JSON.stringify(body);
  }
  let response;
  try {
    response = await fetch('/api/v1/' + route, options);
  } catch (failure) {
    return { status: 0, document: { error: { message: 'the panel cannot be reached: is fileindex-panel running?' } } };
  }
  let document = null;
  try {
    document = await response.json();
  } catch (failure) {
    document = { error: { message: 'the panel answered ' + response.status + ' without a readable body' } };
  }
  if (response.status === 401) {
    document = { error: { message: 'this browser has no valid token: open the address that fileindex-panel printed' } };
  }
  return { status: response.status, document, retryAfter: Number(response.headers.get('Retry-After')) || 1 };
}

function errorText(document) {
  const error = (document && document.error) || {};
  return (error.message || 'the panel gave no reason') + (error.name ? ' (' + error.name + ')' : '');
}

function show(kind, text) {
  const message = $('message');
  message.dataset.kind = kind;
  message.textContent = text;
  message.hidden = false;
}

// Sends a change; while another program holds a lock (503), says so and sends it again after the
// time the panel asks for. Gives the answer's document, or null after saying what went wrong.
async function change(route, body, doneText) {
  for (let attempt = 1; ; attempt++) {
    const answer = await api('POST', route, body);
    if (answer.status === 503 && attempt < kBusyAttempts) {
      show('busy', 'Busy: ' + errorText(answer.document) + '. Trying again in ' + answer.retryAfter + ' s (' +
        attempt + ' of ' + (kBusyAttempts - 1) + ').');
      await sleep(answer.retryAfter * 1000);
      continue;
    }
    if (answer.status !== 200) {
      show('error', 'Not done: ' + errorText(answer.document));
      return null;
    }
    show('done', doneText(answer.document));
    pollSoon();
    return answer.document;
  }
}

// ---- The folder table ----

function stateBadge(status) {
  return element('span', { className: 'badge', 'data-state': status, text: kStateWords[status] || status });
}

function folderRow(record) {
  const path = record.path;
  const additional = record.additional || {};
  const stateCell = element('td', { 'data-label': 'State', className: 'state' }, [stateBadge(additional.status)]);
  if (additional.is_valid === false) {
    stateCell.append(element('span', { className: 'refusal', text: 'not indexed: ' + (additional.refusal_text ||
      'this folder may not be indexed') }));
  }
  const row = element('tr', { 'data-path-bytes': record.path_bytes }, [
    element('td', { className: 'path', 'data-label': 'Path', text: path, title: path }),
    element('td', { 'data-label': 'Name', text: record.name }),
  ]);
  for (const [medium, word] of kMedia) {
    const toggle = element('input', {
      type: 'checkbox', className: 'switch', role: 'switch', checked: record[medium] === true,
      'aria-label': word + ' for ' + path,
    });
    toggle.addEventListener('change', async () => {
      const setting = { path_bytes: record.path_bytes };
      setting[medium] = toggle.checked;
      if (!await change('folders', [setting], () => word + (toggle.checked ? ' on' : ' off') + ' for ' + path)) {
        toggle.checked = !toggle.checked;
      }
    });
    row.append(element('td', { 'data-label': word }, [toggle]));
  }
  row.append(stateCell);
  const reindex = element('button', { type: 'button', className: 'quiet', text: 'Reindex',
    'aria-label': 'Reindex ' + path });
  reindex.addEventListener('click', () =>
    change('reindex', [{ path_bytes: record.path_bytes }], () => 'Reindex queued for ' + path));
  const remove = element('button', { type: 'button', className: 'danger', text: 'Remove',
    'aria-label': 'Remove ' + path });
  remove.addEventListener('click', () => confirmRemove(record));
  row.append(element('td', { className: 'actions', 'data-label': 'Actions' }, [reindex, remove]));
  return row;
}

async function loadFolders() {
  const query = new URLSearchParams({ offset: view.offset, limit: view.limit, sort_by: view.sortBy,
    sort_direction: view.direction });
  const answer = await api('GET', 'folders?' + query);
  if (answer.status !== 200) {
    show(answer.status === 503 ? 'busy' : 'error', 'The folder list cannot be shown: ' + errorText(answer.document));
    return;
  }
  const page = answer.document;
  view.total = page.total;
  if (view.offset >= view.total && view.offset > 0) {
    view.offset = Math.max(0, view.total - view.limit);
    return loadFolders();
  }
  const body = $('folders').tBodies[0];
  body.replaceChildren(...page.folders.map(folderRow));
  view.shownFolders = new Set(page.folders.map((record) => record.path_bytes));
  $('no-folders').hidden = view.total !== 0;
  const last = view.offset + page.folders.length;
  $('page-text').textContent = view.total === 0 ? '' : (view.offset + 1) + '–' + last + ' of ' + view.total;
  $('previous-page').disabled = view.offset === 0;
  $('next-page').disabled = last >= view.total;
  for (const header of $('folders').tHead.rows[0].cells) {
    if (header.dataset.sort) {
      header.setAttribute('aria-sort', header.dataset.sort !== view.sortBy ? 'none'
        : view.direction === 'ASC' ? 'ascending' : 'descending');
    }
  }
  if (!view.tableShown) {
    // How long the first table took to show, from the start of navigation (read by the browser test).
    view.tableShown = true;
    document.body.dataset.firstTableMilliseconds = Math.round(performance.now());
  }
}

async function confirmRemove(record) {
  const dialog = $('confirm-remove');
  $('confirm-text').textContent = 'Stop indexing ' + record.path + '? Its index entries are removed; the files ' +
    'stay as they are.';
  dialog.returnValue = '';
  dialog.showModal();
  $('confirm-remove-no').focus();
  await new Promise((resolve) => dialog.addEventListener('close', resolve, { once: true }));
  if (dialog.returnValue === 'remove' &&
      await change('folders/remove', [{ path_bytes: record.path_bytes }], () => 'Removed ' + record.path)) {
    await loadFolders();
  }
}

// ---- Live state ----

let pollTimer = null;

function pauseText(resumeTime) {
  if (resumeTime === -1) {
    return '';
  }
  if (resumeTime === 0) {
    return 'until resumed';
  }
  return 'resumes at ' + new Date(resumeTime * 1000).toLocaleString();
}

function showShares(status) {
  const marked = status.shares.filter((share) => share.no_space || share.need_reindex);
  $('no-marks').hidden = marked.length !== 0;
  $('shares').hidden = marked.length === 0;
  $('shares').tBodies[0].replaceChildren(...marked.map((share) => {
    const marks = [share.no_space ? 'out of space' : null, share.need_reindex ? 'needs a reindex' : null];
    const actions = element('td', { className: 'actions' });
    if (share.no_space) {
      const revive = element('button', { type: 'button', text: 'Revive', 'aria-label': 'Revive ' + share.share_name });
      revive.addEventListener('click', () => change('shares/revive', { share_name: share.share_name },
        () => 'Share ' + share.share_name + ' revived'));
      actions.append(revive);
    }
    const prefix = '/' + share.share_name_bytes;
    const folders = status.folders.filter((folder) =>
      folder.path_bytes === prefix || folder.path_bytes.startsWith(prefix + '/'));
    if (share.need_reindex && folders.length !== 0) {
      const reindex = element('button', { type: 'button', className: 'quiet', text: 'Reindex its folders',
        'aria-label': 'Reindex the folders of ' + share.share_name });
      reindex.addEventListener('click', () => change('reindex',
        folders.map((folder) => ({ path_bytes: folder.path_bytes })), () => 'Reindex queued for ' + share.share_name));
      actions.append(reindex);
    }
    return element('tr', {}, [element('td', { text: share.share_name }),
      element('td', { text: marks.filter(Boolean).join(', ') }), actions]);
  }));
}

function showStatus(status) {
  const overall = $('overall');
  overall.dataset.state = status.status;
  overall.textContent = kStateWords[status.status] || status.status;
  // The overall word already says "paused" while paused work waits; the badge says it otherwise.
  $('paused').hidden = status.resume_time === -1 || status.status === 'paused';
  $('pause-text').textContent = pauseText(status.resume_time);
  $('resume').disabled = status.resume_time === -1;
  const daemon = $('daemon');
  daemon.hidden = status.daemon.reachable;
  daemon.textContent = status.daemon.reachable ? '' : 'fileindexd: ' + status.daemon.problem;
  let unseen = status.folders.length !== view.total;
  const states = new Map(status.folders.map((folder) => [folder.path_bytes, folder.status]));
  for (const row of $('folders').tBodies[0].rows) {
    const folderState = states.get(row.dataset.pathBytes);
    const badge = row.querySelector('td.state .badge');
    if (folderState === undefined) {
      unseen = true;
    } else if (badge.dataset.state !== folderState) {
      badge.replaceWith(stateBadge(folderState));
    }
  }
  showShares(status);
  return unseen;
}

async function poll() {
  clearTimeout(pollTimer);
  const answer = await api('GET', 'status');
  if (answer.status === 200) {
    if (showStatus(answer.document)) {
      await loadFolders();
    }
  } else {
    show(answer.status === 503 ? 'busy' : 'error', 'The state cannot be read: ' + errorText(answer.document));
  }
  pollTimer = setTimeout(poll, answer.status === 503 ? answer.retryAfter * 1000 : kPollMilliseconds);
}

function pollSoon() {
  clearTimeout(pollTimer);
  pollTimer = setTimeout(poll, 50);
}

// ---- The forms ----

let checkTimer = null;

async function checkTypedPath() {
  const path = $('add-path').value;
  const verdict = $('add-check');
  if (path === '') {
    verdict.textContent = '';
    delete verdict.dataset.verdict;
    return;
  }
  const answer = await api('GET', 'check?' + new URLSearchParams({ path }));
  if (path !== $('add-path').value) {
    return;  // typed on meanwhile; a newer check follows
  }
  if (answer.status !== 200) {
    verdict.dataset.verdict = 'no';
    verdict.textContent = errorText(answer.document);
    return;
  }
  const check = answer.document;
  verdict.dataset.verdict = check.may_be_indexed ? 'yes' : 'no';
  verdict.textContent = check.may_be_indexed
    ? (check.indexed ? 'May be indexed; it is already inside an indexed folder.' : 'May be indexed.')
    : 'May not be indexed: ' + check.refusal_text + '.';
}

function lastComponent(path) {
  const parts = path.split('/').filter((part) => part !== '');
  return parts.length === 0 ? '' : parts[parts.length - 1];
}

async function addFolder(event) {
  event.preventDefault();
  const path = $('add-path').value.trim();
  const setting = { path, name: $('add-name').value.trim() || lastComponent(path) };
  for (const [medium] of kMedia) {
    setting[medium] = $('add-' + medium).checked;
  }
  if (await change('folders', [setting], () => 'Added ' + path)) {
    $('add-path').value = '';
    $('add-name').value = '';
    $('add-check').textContent = '';
    delete $('add-check').dataset.verdict;
    await loadFolders();
  }
}

async function pause(event) {
  event.preventDefault();
  const choice = $('pause-length').value;
  const hours = choice === 'custom' ? Number($('pause-hours').value) : Number(choice);
  if (!Number.isInteger(hours) || hours < 0) {
    show('error', 'Give the pause in whole hours.');
    return;
  }
  await change('pause', { hours }, (document) => 'Indexing paused; ' + pauseText(document.resume_time));
}

function start() {
  $('add-path').addEventListener('input', () => {
    clearTimeout(checkTimer);
    checkTimer = setTimeout(checkTypedPath, 250);
  });
  $('add-form').addEventListener('submit', addFolder);
  $('pause-form').addEventListener('submit', pause);
  $('pause-length').addEventListener('change', () => {
    $('pause-hours-field').hidden = $('pause-length').value !== 'custom';
  });
  $('resume').addEventListener('click', () => change('resume', undefined, () => 'Indexing runs again'));
  $('page-size').addEventListener('change', () => {
    view.limit = Number($('page-size').value);
    view.offset = 0;
    loadFolders();
  });
  $('previous-page').addEventListener('click', () => {
    view.offset = Math.max(0, view.offset - view.limit);
    loadFolders();
  });
  $('next-page').addEventListener('click', () => {
    view.offset += view.limit;
    loadFolders();
  });
  for (const header of $('folders').tHead.rows[0].cells) {
    if (header.dataset.sort) {
      header.querySelector('button').addEventListener('click', () => {
        view.direction = view.sortBy === header.dataset.sort && view.direction === 'ASC' ? 'DESC' : 'ASC';
        view.sortBy = header.dataset.sort;
        view.offset = 0;
        loadFolders();
      });
    }
  }
  view.limit = Number($('page-size').value);
  loadFolders().then(poll);
}

start();
