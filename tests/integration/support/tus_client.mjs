// Uploads a file with the stock client: node tus_client.mjs MODULES ENDPOINT FILE NAME BREAK-AT
// Prints the upload's address at the end. BREAK-AT: bytes after which it gives up and begins anew
// with what the server has; 0: never.
import fs from 'node:fs';
import {createRequire} from 'node:module';

const [modules, endpoint, file, name, breakAt] = process.argv.slice(2);
const tus = createRequire(`${modules}/`)('tus-js-client');

function upload(options, limit) {
  return new Promise((resolve, reject) => {
    const sent = new tus.Upload(fs.createReadStream(file), {
      endpoint,
      uploadSize: fs.statSync(file).size,
      metadata: {filename: name},
      retryDelays: [0, 100, 200, 400, 800, 1600],
      onError: reject,
      onSuccess: () => resolve(sent.url),
      onProgress: (bytes) => {
        if (limit > 0 && bytes >= limit) {
          limit = 0;
          sent.abort().then(() => resolve(sent.url));
        }
      },
      ...options,
    });
    sent.start();
  });
}

let url = await upload({}, Number(breakAt));
if (Number(breakAt) > 0) {
  url = await upload({uploadUrl: url}, 0);
}
console.log(url);
