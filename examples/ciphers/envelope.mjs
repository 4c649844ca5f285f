// Enciphers parameter lines for the web API, with what browsers and node bring along. See
// docs/ciphers.md for what an envelope is, and what it is good for.
//
//   import { encipherForHost, encipherWithToken, hostKey } from './envelope.mjs';
//   const { key, now } = await hostKey('/webapi/entry.cgi');
//   fetch('/webapi/entry.cgi', { method: 'POST', body: new URLSearchParams({
//     __cIpHeRtExT: await encipherForHost(key, 'api=...&version=1&method=...', now()) }) });

const { subtle } = globalThis.crypto;
const bytesOf = (text) => new TextEncoder().encode(text);

function base64url(bytes) {
  let text = '';
  for (const byte of bytes) text += String.fromCharCode(byte);
  return btoa(text).replaceAll('+', '-').replaceAll('/', '_').replaceAll('=', '');
}

function joined(...parts) {
  const whole = new Uint8Array(parts.reduce((size, part) => size + part.length, 0));
  let place = 0;
  for (const part of parts) {
    whole.set(part, place);
    place += part.length;
  }
  return whole;
}

async function derive(hash, secret, info, size) {
  const key = await subtle.importKey('raw', secret, 'HKDF', false, ['deriveBits']);
  const how = { name: 'HKDF', hash, salt: new Uint8Array(), info: bytesOf(info) };
  return new Uint8Array(await subtle.deriveBits(how, key, size * 8));
}

/** A256CBC-HS512: the first half of the key authenticates, the second enciphers. */
async function seal(algorithm, enciphered, key, line, seconds) {
  const header = base64url(bytesOf(
    JSON.stringify({ alg: algorithm, enc: 'A256CBC-HS512', iat: seconds })));
  const iv = globalThis.crypto.getRandomValues(new Uint8Array(16));
  const cipher = await subtle.importKey('raw', key.slice(32), 'AES-CBC', false, ['encrypt']);
  const text = new Uint8Array(await subtle.encrypt({ name: 'AES-CBC', iv }, cipher, bytesOf(line)));
  const length = new Uint8Array(8);
  new DataView(length.buffer).setBigUint64(0, BigInt(header.length * 8));
  const hmac = { name: 'HMAC', hash: 'SHA-512' };
  const proof = await subtle.importKey('raw', key.slice(0, 32), hmac, false, ['sign']);
  const tag = new Uint8Array(
    await subtle.sign('HMAC', proof, joined(bytesOf(header), iv, text, length))).slice(0, 32);
  return [header, ...[enciphered, iv, text, tag].map(base64url)].join('.');
}

const now = () => Math.floor(Date.now() / 1000);

/**
 * The host's public key, and its clock. Whoever can change the answer on its way can give another key:
 * ask by https, or compare the key with one that is known.
 * @param {string} url  of the host's entry.cgi
 * @return {Promise<{key: string, now: function(): number}>}
 */
export async function hostKey(url) {
  const call = new URLSearchParams({ api: 'QELO.Access.Cipher', version: 1, method: 'get' });
  const answer = await (await fetch(url, { method: 'POST', body: call })).json();
  if (!answer.success) throw new Error(`the host has no key: error ${answer.error.code}`);
  const ahead = answer.data.time - now();
  return { key: answer.data.key, now: () => now() + ahead };
}

/**
 * The value of "__cIpHeRtExT".
 * @param {string} publicKeyPem  the host's public key
 * @param {string} line          parameters, as "a=1&b=2"
 * @param {number} seconds       the host's time, seconds since the epoch
 */
export async function encipherForHost(publicKeyPem, line, seconds = now()) {
  const der = Uint8Array.from(atob(publicKeyPem.replace(/-----[^-]+-----|\s/g, '')),
                              (letter) => letter.charCodeAt(0));
  const rsa = await subtle.importKey('spki', der, { name: 'RSA-OAEP', hash: 'SHA-256' }, false,
                                     ['encrypt']);
  const key = globalThis.crypto.getRandomValues(new Uint8Array(64));
  const enciphered = new Uint8Array(await subtle.encrypt({ name: 'RSA-OAEP' }, rsa, key));
  return seal('RSA-OAEP-256', enciphered, key, line, seconds);
}

/**
 * The value of "__tXeTrEhPiC", which goes with the token's number as "__nEkOtReHpIc".
 * @param {string} token  the access token
 */
export async function encipherWithToken(token, line, seconds = now()) {
  const hash = new Uint8Array(await subtle.digest('SHA-256', bytesOf(token)));
  const text = base64url(await derive('SHA-256', hash, 'webapi parameter key', 24));
  const key = await derive('SHA-512', bytesOf(text), 'webapi parameter cipher', 64);
  return seal('dir', new Uint8Array(), key, line, seconds);
}
