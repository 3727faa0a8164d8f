import { ApiError, ConnectionError } from '../api/client';
import type { Translate } from '../texts/translate';

/** What a person is told about a failure: the API's code and message, or that nobody answered. */
export function errorText(error: unknown, t: Translate): string {
    if (error instanceof ApiError) {
        return error.message
            ? t('error.api', { code: error.code, message: error.message })
            : t('error.code', { code: error.code });
    }
    if (error instanceof ConnectionError) {
        return t('error.connection');
    }
    return error instanceof Error ? error.message : String(error);
}
