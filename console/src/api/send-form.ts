/** Sends a form as fetch() does, and tells how much of it is sent, from 0 to 1, which fetch() cannot. */
export function sendForm(
  path: string,
  { headers, form, signal }: { headers: Headers; form: FormData; signal: AbortSignal | null },
  onProgress: (share: number) => void,
): Promise<Response> {
  return new Promise((resolve, reject) => {
    const request = new XMLHttpRequest();
    request.open('POST', path);
    headers.forEach((value, name) => {
      request.setRequestHeader(name, value);
    });
    request.upload.onprogress = ({ loaded, total }) => {
      onProgress(loaded / total);
    };
    request.onload = () => {
      const { status, statusText, responseText } = request;
      const tag = request.getResponseHeader('ETag');
      resolve(new Response(responseText, { status, statusText, headers: tag ? { ETag: tag } : {} }));
    };
    request.onerror = () => {
      reject(new TypeError('Failed to send the form'));
    };
    request.onabort = () => {
      reject(new DOMException('The form is not sent', 'AbortError'));
    };
    signal?.addEventListener('abort', () => {
      request.abort();
    });
    request.send(form);
    if (signal?.aborted) request.abort();
  });
}
