// Calls of the methods of the web API, typed by the OpenAPI document.
import type { components, operations } from './schema';
import { sendForm } from './send-form';
import { bearer } from '../session/credential';

export type Schemas = components['schemas'];
export type Method = Extract<keyof operations, `VORN.${string}`>;
export type Rehearsal = Schemas['Rehearsal'];

/** The parameters that a method takes as JSON. */
export type Parameters<M extends Method> = operations[M] extends {
  requestBody?: { content: { 'application/json': infer P } };
}
  ? P
  : Record<string, never>;

/** The data that a method answers. */
export type Data<M extends Method> = operations[M] extends {
  responses: { 200: { content: { 'application/json': { data: infer D } } } };
}
  ? D
  : null;

export interface Answer<T> {
  data: T;
  /** The entity tag, which a change sends back as If-Match; null if the method has none. */
  tag: string | null;
  warnings: string[];
  rehearsal: Rehearsal | null;
}

export interface Options {
  /** The change is carried out only if what it changes still has this entity tag. */
  ifMatch?: string | null;
  /** Nothing is changed; the answer tells what the call would have done. */
  rehearse?: boolean;
  /** A form with a file, which is sent instead of the parameters. */
  form?: FormData;
  /** How much of the form is sent, from 0 to 1. */
  onProgress?: (share: number) => void;
  signal?: AbortSignal;
}

/** The server refused a call, or could not carry it out. */
export class Failure extends Error {
  constructor(
    readonly status: number,
    readonly code: number,
    text: string,
    readonly reasons: string[] = [],
    readonly details?: unknown,
    /** Of a conflict: the entity tag of the present data, which are the details. */
    readonly tag: string | null = null,
  ) {
    super(text);
  }

  /** Somebody else has changed the data meanwhile. */
  get isConflict() {
    return this.status === 412;
  }

  /** The session has ended, or there was none. */
  get isUnauthenticated() {
    return this.status === 401;
  }
}

/** No answer arrived: the box is switched off, restarting, or cannot be reached. */
export class Unreachable extends Error {}

interface Envelope {
  success: boolean;
  data?: unknown;
  warnings?: string[];
  rehearsal?: Rehearsal;
  error?: { code: number; text: string; reasons?: string[]; details?: unknown };
}

function headersOf(options: Options): Headers {
  const headers = new Headers();
  const token = bearer();
  if (token) headers.set('Authorization', `Bearer ${token}`);
  if (options.ifMatch) headers.set('If-Match', options.ifMatch);
  if (!options.form) headers.set('Content-Type', 'application/json');
  return headers;
}

async function send(path: string, parameters: unknown, options: Options): Promise<Response> {
  const headers = headersOf(options);
  const { form, signal = null, onProgress = () => undefined } = options;
  try {
    if (form) return await sendForm(path, { headers, form, signal }, onProgress);
    return await fetch(path, { method: 'POST', headers, body: JSON.stringify(parameters), signal });
  } catch (error) {
    if (error instanceof DOMException && error.name === 'AbortError') throw error;
    throw new Unreachable(String(error));
  }
}

async function envelopeOf(response: Response): Promise<Envelope> {
  try {
    return (await response.json()) as Envelope;
  } catch {
    // A proxy answered, or the connection broke in the middle of the answer.
    if (response.status === 502 || response.status === 504 || response.ok) throw new Unreachable(response.statusText);
    return { success: false, error: { code: response.status, text: response.statusText } };
  }
}

/** Calls a method. Throws Failure if it fails and Unreachable if no answer arrives. */
export async function call<M extends Method>(
  method: M,
  parameters: Parameters<M>,
  options: Options = {},
): Promise<Answer<Data<M>>> {
  const query = options.rehearse ? '?rehearse=true' : '';
  const response = await send(`/api/${method}${query}`, parameters, options);
  const envelope = await envelopeOf(response);
  if (!envelope.success) {
    const error = envelope.error ?? { code: response.status, text: response.statusText };
    throw new Failure(
      response.status,
      error.code,
      error.text,
      error.reasons,
      error.details,
      response.headers.get('ETag'),
    );
  }
  return {
    data: envelope.data as Data<M>,
    tag: response.headers.get('ETag'),
    warnings: envelope.warnings ?? [],
    rehearsal: envelope.rehearsal ?? null,
  };
}
