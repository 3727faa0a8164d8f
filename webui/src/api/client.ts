/** An answer of the web API that says no: the code and the short text that it gave. */
export class ApiError extends Error {
    constructor(
        readonly code: number,
        message: string,
    ) {
        super(message);
        this.name = 'ApiError';
    }
}

/** The server could not be reached, or what answered was not it. */
export class ConnectionError extends Error {
    constructor(message: string) {
        super(message);
        this.name = 'ConnectionError';
    }
}

/** The session is over, or there never was one. */
export class SignedOutError extends Error {
    constructor() {
        super('signed out');
        this.name = 'SignedOutError';
    }
}

interface Answer {
    success: boolean;
    data?: unknown;
    error?: { code?: number; details?: { msg?: string } | null };
}

type Listener = () => void;

let language = 'en';
const signedOutListeners = new Set<Listener>();

/** The language of the texts that the API answers with. */
export function setApiLanguage(code: string): void {
    language = code;
}

/** Calls `listener` whenever a call finds the session over; gives the function that ends that. */
export function onSignedOut(listener: Listener): () => void {
    signedOutListeners.add(listener);
    return () => signedOutListeners.delete(listener);
}

export async function readAnswer(response: Response): Promise<Answer> {
    try {
        const answer = (await response.json()) as Answer;
        if (typeof answer === 'object' && typeof answer.success === 'boolean') {
            return answer;
        }
    } catch {
        // Told below.
    }
    throw new ConnectionError(`HTTP ${response.status}`);
}

export function errorOf(answer: Answer, status: number): ApiError {
    const details = answer.error?.details;
    const message = details && typeof details.msg === 'string' ? details.msg : '';
    return new ApiError(answer.error?.code ?? status, message);
}

/** fetch with failures told as ConnectionError; an abort stays what it is. */
export async function send(path: string, init: RequestInit): Promise<Response> {
    try {
        return await fetch(path, { ...init, credentials: 'same-origin', cache: 'no-store' });
    } catch (error) {
        if (error instanceof DOMException && error.name === 'AbortError') {
            throw error;
        }
        throw new ConnectionError(String(error));
    }
}

export function jsonRequest(method: string, body: unknown, signal?: AbortSignal): RequestInit {
    return {
        method,
        headers: { 'Content-Type': 'application/json' },
        body: JSON.stringify(body),
        signal: signal ?? null,
    };
}

/** One call of an API method; gives its success document. */
export async function call<T>(
    api: string,
    method: string,
    parameters: object = {},
    signal?: AbortSignal,
): Promise<T> {
    const path = `webapi/${api}/1/${method}?lang=${encodeURIComponent(language)}`;
    const response = await send(path, jsonRequest('POST', parameters, signal));
    if (response.status === 401) {
        signedOutListeners.forEach((listener) => listener());
        throw new SignedOutError();
    }
    const answer = await readAnswer(response);
    if (!answer.success) {
        throw errorOf(answer, response.status);
    }
    return answer.data as T;
}

export function isAbort(error: unknown): boolean {
    return error instanceof DOMException && error.name === 'AbortError';
}
