// Calls the server by a client whose types are made from the document: node client.js BASE SID
import createClient from 'openapi-fetch';
import type {paths} from './api.js';

declare const process: {argv: string[]};

const [base, sid] = process.argv.slice(2);
const client = createClient<paths>({baseUrl: base});
const session = (request: Request) => fetch(new Request(`${request.url}?_sid=${sid}`, request));

const told = await client.POST('/QELO.Catalog.API/v1/describe', {
  body: {name: 'QELO.Catalog.API'}, fetch: session});
const echoed = await client.POST('/QELO.Test.Good/v1/echo', {body: {name: 'ann'}});
const wrong = await client.POST('/QELO.Test.Good/v1/echo', {body: {name: 'much too long a name'}});
const refused = await client.POST('/QELO.Catalog.API/v1/describe', {body: {name: 'x'}});

console.log(JSON.stringify({
  api: (told.data?.data as {api: string}).api,
  name: echoed.data?.data?.name,
  status: wrong.response.status,
  path: (wrong.error?.error.errors as {path: string}[])[0].path,
  refused: refused.response.status,
}));
