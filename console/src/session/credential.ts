// Without TLS the session is a bearer token, which lives as long as the browser's tab. With TLS it is a cookie that
// scripts cannot read, and nothing is stored here.
const KEY = 'session';

export const bearer = () => sessionStorage.getItem(KEY);
export const keepBearer = (token: string) => {
  sessionStorage.setItem(KEY, token);
};
export const forgetBearer = () => {
  sessionStorage.removeItem(KEY);
};

const CODE = /^#code=(vornc_[0-9a-f]+)$/;

// A link with a code that is opened while the console is shown changes only the part behind "#".
window.addEventListener('hashchange', () => {
  if (CODE.test(location.hash)) location.reload();
});

/** Takes the one-time code out of the address, so that it stays neither in the address line nor in the history. */
export function takeCode(): string | null {
  const code = CODE.exec(location.hash)?.[1] ?? null;
  if (code) history.replaceState(null, '', '#/');
  return code;
}
