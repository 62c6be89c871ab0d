// Requests to the viewer's server. The key stands behind the # of the address, which a browser sends
// to nobody, and goes along as a header.

import {texts} from './texts.js';

const key = location.hash.slice(1);
export const hasKey = /^[0-9a-f]{32}$/.test(key);

/** A request that the server has refused or could not answer. */
export class Fault extends Error {
  constructor(status, message) {
    super(message);
    this.status = status;
  }
}

async function ask(path, options = {}) {
  let answer;
  try {
    answer = await fetch(path, {...options, headers: {'X-Vexg-Key': key}, cache: 'no-store'});
  } catch (error) {
    if (error.name === 'AbortError') throw error;
    throw new Fault(0, error.name === 'TimeoutError' ? texts.silent : texts.ended);
  }
  if (answer.ok) return answer;
  const told = await answer.json().catch(() => ({}));
  throw new Fault(answer.status, told.fault ?? `status ${answer.status}`);
}

/** Gives what the server answers as JSON. */
export async function get(path, options) {
  return (await ask(`/api/${path}`, options)).json();
}

/** Sends a value as JSON and gives the answer. */
export async function post(path, value) {
  const answer = await ask(`/api/${path}`, {method: 'POST', body: JSON.stringify(value ?? {})});
  return answer.json();
}

/** The bytes of a tile and its size in pixels; null where there is none. */
export async function getTile(path, signal) {
  try {
    const answer = await ask(`/api/tile/${path}`, {signal});
    const [width, height] = answer.headers.get('X-Vexg-Size').split(' ').map(Number);
    return {width, height, bytes: await answer.arrayBuffer()};
  } catch (fault) {
    if (fault.status === 404) return null;
    throw fault;
  }
}
