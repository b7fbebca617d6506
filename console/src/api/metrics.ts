import { bearer } from '../session/credential';

/** The figures for monitoring, in the text format of Prometheus; null if the box does not give them. */
export async function readMetrics(): Promise<string | null> {
  const token = bearer();
  try {
    const response = await fetch('/metrics', { headers: token ? { Authorization: `Bearer ${token}` } : {} });
    return response.ok ? await response.text() : null;
  } catch {
    return null;
  }
}
