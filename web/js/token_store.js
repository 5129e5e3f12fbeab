// Keeps the access token for the life of the browser tab (sessionStorage), so
// that it is asked once per session and never written to lasting storage.

const STORAGE_KEY = 'orva.webapi.token';

export function storedToken() {
  try {
    return sessionStorage.getItem(STORAGE_KEY) || '';
  } catch {
    // Storage can be switched off; the token then lasts until the page reloads.
    return '';
  }
}

export function storeToken(token) {
  try {
    sessionStorage.setItem(STORAGE_KEY, token);
  } catch {
    // See storedToken: keeping it in memory only is the fallback.
  }
}

export function forgetStoredToken() {
  try {
    sessionStorage.removeItem(STORAGE_KEY);
  } catch {
    // Nothing was stored.
  }
}
