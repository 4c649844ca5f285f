// The page of a sharing link. The link's id stands behind the "#" of the page's address, so that no
// server gets it, and none logs it, before the visitor opens the link. Opening is a use of the link:
// the page waits for the visitor to ask for it, and a visit outlasts a reload of the page.
'use strict';

const entry = new URL('../entry.cgi', location.href);
const link = location.hash.slice(1);
const pageSize = 500;
const reasons = {  // of opening and of calls by the link
  open: {
    400: 'There is no such link.',
    402: 'The link has expired or is used up.',
    404: 'The password is wrong.',
  },
  call: {
    124: 'The link has expired, or the file is larger than it takes.',
    127: 'The link does not allow this.',
    150: 'The link was opened from another address.',
    404: 'It is not there any more.',
    405: 'Its owner has no right to it.',
    406: 'There is a file of this name already.',
    413: 'There is no room for it.',
  },
};
// The visit has ended, or is another link's: opening the link anew helps.
const endings = [122, 123, 125, 126, 150];

const at = (id) => document.getElementById(id);
let visit = null;  // {link, sid, path, upload}
let folder = '';
let shown = 0;
let turn = 0;  // what is shown last wins, however long an answer takes

function say(text) {
  at('status').textContent = text;
}

function make(name, text) {
  const element = document.createElement(name);
  element.textContent = text;
  return element;
}

function makeButton(text, action) {
  const button = make('button', text);
  button.type = 'button';
  button.addEventListener('click', () => attempt(action));
  return button;
}

function nameOf(path) {
  return path.slice(path.lastIndexOf('/') + 1) || 'Shared files';
}

/// Parameters of a call by the link. A path in quotes is a text, whatever it looks like.
function byLink(method, path, more = {}) {
  return new URLSearchParams({api: 'QELO.Files.Item', version: 1, method, _sharing_id: link,
    _sharing_sid: visit.sid, path: JSON.stringify(path), ...more});
}

function addressOf(parameters) {
  return `${entry.href}?${parameters}`;
}

function readAnswer(text) {
  const answer = JSON.parse(text);
  if (!answer.success) {
    throw answer.error;
  }
  return answer.data;
}

async function call(parameters) {
  const answer = await fetch(entry, {method: 'POST', body: parameters});
  return readAnswer(await answer.text());
}

/// Does something by the link, and says what goes wrong.
async function attempt(action) {
  try {
    await action();
  } catch (error) {
    const code = error && error.code;
    say(reasons.call[code] || (endings.includes(code) ? 'The visit has ended. Please open the link again.'
      : code ? `It did not work (error ${code}).` : 'The server does not answer.'));
    if (endings.includes(code)) {
      leave();
    }
  }
}

function leave() {
  visit = null;
  sessionStorage.removeItem('visit');
  at('files').hidden = true;
  at('open').hidden = false;
  at('password').focus();
}

async function openLink(event) {
  event.preventDefault();
  say('Opening …');
  const password = at('password').value;
  const parameters = new URLSearchParams({api: 'QELO.Share.Link', version: 1, method: 'open', link,
    ...(password ? {password: JSON.stringify(password)} : {})});
  try {
    const {sid, project, path, upload} = await call(parameters);
    if (project !== 'files') {
      say('This link leads to no files.');
      return;
    }
    visit = {link, sid, path: path.replace(/\/+$/, '') || '/', upload};
  } catch (error) {
    const code = error && error.code;
    say(reasons.open[code] || (code === 407
      ? `Too many wrong passwords. Please wait ${error.errors.retry_after} seconds.`
      : code ? `The link cannot be opened (error ${code}).` : 'The server does not answer.'));
    at('password').focus();
    return;
  }
  at('password').value = '';
  sessionStorage.setItem('visit', JSON.stringify(visit));
  attempt(enter);
}

/// Shows what the link leads to: a folder, or a single file.
async function enter() {
  const {items: [item]} = await call(byLink('stat', visit.path));
  if (item.type === 'file') {
    begin(visit.path, false);
    addItems([item]);
  } else {
    await show(visit.path);
  }
}

/// Empties the list, for a folder or a file.
function begin(path, isFolder) {
  say('');
  folder = path;
  shown = 0;
  at('title').textContent = nameOf(path);
  document.title = nameOf(path);
  at('items').replaceChildren();
  at('way').replaceChildren(...(isFolder ? waySteps(path) : []));
  at('all').parentNode.hidden = !isFolder;
  prepareDownload(at('all'), path);
  at('more').hidden = true;
  at('bring').hidden = !(isFolder && visit.upload);
  at('open').hidden = true;
  at('files').hidden = false;
  at('title').focus();
}

/// The folders from the shared one down to a path.
function waySteps(path) {
  const top = visit.path === '/' ? '' : visit.path;
  const below = path.slice(top.length).split('/').slice(1).filter((name) => name);
  let step = top;
  const steps = [visit.path, ...below.map((name) => (step += `/${name}`))];
  return steps.map((each, index) => {
    const isHere = index === steps.length - 1;
    const part = isHere ? make('span', nameOf(each)) : makeButton(nameOf(each), () => show(each));
    if (isHere) {
      part.setAttribute('aria-current', 'location');
    }
    const element = document.createElement('li');
    element.append(part);
    return element;
  });
}

async function show(path) {
  const mine = ++turn;
  const page = await list(path, 0);
  if (mine === turn) {
    begin(path, true);
    add(page);
  }
}

async function showMore() {
  const mine = turn;
  const page = await list(folder, shown);
  if (mine === turn) {
    add(page);
  }
}

function list(path, offset) {
  return call(byLink('list', path, {offset, limit: pageSize}));
}

function add(page) {
  addItems(page.items);
  shown = page.offset + page.items.length;
  at('more').hidden = page.items.length === 0 || shown >= page.total;
  say(page.total === 0 ? 'The folder is empty.' : '');
}

function addItems(items) {
  at('items').append(...items.map(rowOf));
}

function rowOf(item) {
  const row = document.createElement('tr');
  const name = document.createElement('th');
  name.scope = 'row';
  name.append(nameCell(item));
  const changed = item.mtime === undefined ? '' : new Date(item.mtime * 1000).toLocaleString();
  row.append(name, make('td', item.size === undefined ? '' : sizeText(item.size)), make('td', changed));
  return row;
}

/// An item whose name is no text cannot be called by it; links and the like are not followed.
function nameCell(item) {
  if (item.path && item.type === 'folder') {
    return makeButton(`${item.name}/`, () => show(item.path));
  }
  if (item.path && item.type === 'file') {
    return prepareDownload(make('a', item.name), item.path);
  }
  return make('span', item.name);
}

function sizeText(bytes) {
  const units = ['byte', 'kilobyte', 'megabyte', 'gigabyte', 'terabyte'];
  const power = Math.min(Math.floor(Math.log10(Math.max(bytes, 1)) / 3), units.length - 1);
  return (bytes / 1000 ** power).toLocaleString(undefined, {style: 'unit', unit: units[power],
    unitDisplay: 'short', maximumFractionDigits: 1});
}

/// Asks before it leads there, since an error would take this page's place.
function prepareDownload(anchor, path) {
  const address = addressOf(byLink('download', path));
  anchor.href = address;
  anchor.onclick = (event) => {
    if (event.button === 0 && !event.ctrlKey && !event.metaKey && !event.shiftKey && !event.altKey) {
      event.preventDefault();
      say('');
      attempt(async () => {
        await call(byLink('stat', path));
        location.assign(address);
      });
    }
  };
  return anchor;
}

function send(file, path, report) {
  return new Promise((resolve, reject) => {
    const form = new FormData();
    form.append('file', file);
    const request = new XMLHttpRequest();
    request.upload.onprogress = (event) => report(event.lengthComputable ? event.loaded / event.total : 0);
    request.onerror = () => reject(new Error('no answer'));
    request.onload = () => {
      try {
        resolve(readAnswer(request.responseText));
      } catch (error) {
        reject(error);
      }
    };
    request.open('POST', addressOf(byLink('upload', path)));
    request.send(form);
  });
}

async function bring(event) {
  event.preventDefault();
  const files = Array.from(at('chosen').files);
  const path = folder;
  at('send').disabled = true;
  at('progress').hidden = false;
  await attempt(async () => {
    for (const [index, file] of files.entries()) {
      say(`Uploading ${file.name} (${index + 1} of ${files.length}) …`);
      await send(file, path, (part) => {
        at('progress').value = part;
      });
    }
    at('chosen').value = '';
    if (path === folder) {
      await show(path);
    }
    say(files.length === 1 ? `${files[0].name} is uploaded.` : `${files.length} files are uploaded.`);
  });
  at('progress').hidden = true;
  at('send').disabled = false;
}

function start() {
  at('open').addEventListener('submit', openLink);
  at('bring').addEventListener('submit', bring);
  at('more').addEventListener('click', () => attempt(showMore));
  window.addEventListener('hashchange', () => location.reload());
  if (!/^[\w-]{43}$/.test(link)) {
    say('The address of this page is not whole: the link is missing.');
    return;
  }
  const before = JSON.parse(sessionStorage.getItem('visit'));
  if (before && before.link === link) {
    visit = before;
    attempt(enter);
  } else {
    leave();
  }
}

start();
