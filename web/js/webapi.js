// The device's web API: one POST to /webapi per call, with the access token
// as a bearer token. A refused token (401) asks for a new one and sends the
// same request again.

const ENDPOINT = '/webapi';
const VERSION = '1';
// On the answer to a call that installed a certificate: which one the web
// server presents now ('new', 'previous' when the new one did not load, or
// 'none' without HTTPS).
const CERTIFICATE_HEADER = 'X-Web-Certificate';

// Why a call failed. `kind` is 'module' (the method answered an error code),
// 'host' (the server refused the request; `code` is the HTTP status),
// 'network' (no answer arrived) or 'answer' (an answer the page cannot read).
// `data`: what a failed method told besides its code (null when nothing).
export class ApiError extends Error {
  constructor(kind, code = 0, data = null) {
    super(kind === 'network' ? 'no answer' : `error ${code}`);
    this.name = 'ApiError';
    this.kind = kind;
    this.code = code;
    this.data = data;
  }
}

// Builds the request body, always multipart: the server stops urlencoded
// forms at 8 KiB, which a long list of names can pass. `files` maps a
// parameter name to a File or null; the server stores each file part and
// hands its path to the method.
function requestBody(api, method, params, files) {
  const form = new FormData();
  for (const [name, value] of Object.entries({ api, method, version: VERSION, ...params })) {
    form.append(name, value);
  }
  for (const [name, file] of Object.entries(files)) if (file) form.append(name, file, file.name);
  return form;
}

async function readAnswer(response) {
  let answer = null;
  try {
    answer = await response.json();
  } catch {
    // Not JSON: judged by the HTTP status below.
  }
  if (answer !== null && answer.success === true) return answer.data ?? null;
  const code = answer?.success === false ? answer.error?.code : undefined;
  if (Number.isInteger(code)) {
    throw new ApiError(response.ok ? 'module' : 'host', code, answer.data ?? null);
  }
  if (!response.ok) throw new ApiError('host', response.status);
  throw new ApiError('answer');
}

function offeredFileName(disposition) {
  const match = /filename="([^"]*)"/i.exec(disposition) || /filename=([^;]+)/i.exec(disposition);
  const name = match ? match[1].trim() : '';
  return name !== '' ? name : 'download';
}

export class WebApi {
  // `tokens`: current() gives the token in use ('' when none); request(reason,
  // staleToken) resolves with a token to try.
  constructor(tokens) {
    this.tokens = tokens;
  }

  // Resolves with the method's data, with `web_certificate` added from the
  // header when the device sent it; rejects with an ApiError.
  async call(api, method, params = {}, files = {}) {
    const response = await this.send(requestBody(api, method, params, files));
    const data = await readAnswer(response);
    const certificate = response.headers.get(CERTIFICATE_HEADER);
    return certificate && data !== null && typeof data === 'object'
      ? { ...data, web_certificate: certificate } : data;
  }

  // Calls a method that answers with a file (the export methods). Resolves
  // with { blob, fileName }; rejects with an ApiError when the device sends
  // no file.
  async download(api, method, params) {
    const response = await this.send(requestBody(api, method, params, {}));
    const disposition = response.headers.get('content-disposition') || '';
    if (response.ok && /attachment/i.test(disposition)) {
      return { blob: await response.blob(), fileName: offeredFileName(disposition) };
    }
    await readAnswer(response);
    throw new ApiError('answer');
  }

  async send(body) {
    let token = this.tokens.current() || (await this.tokens.request('missing'));
    for (;;) {
      let response;
      try {
        response = await fetch(ENDPOINT, {
          method: 'POST',
          headers: { Authorization: `Bearer ${token}` },
          body,
          cache: 'no-store',
          credentials: 'omit',
        });
      } catch {
        throw new ApiError('network');
      }
      if (response.status !== 401) return response;
      token = await this.tokens.request('refused', token);
    }
  }
}
