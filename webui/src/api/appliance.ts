import { call } from './client';

const API = 'ORVA.Core.Appliance';

export interface Share {
    name: string;
    recycle: boolean;
}

export interface ApplianceInfo {
    name: string;
    version: string;
    time: string;
    zone: string;
    scheduler: boolean;
    buzzer: boolean;
}

/** Texts of the appliance's own catalogue: section, key, text. */
export type Catalogue = Record<string, Record<string, string>>;

export interface CleanRules {
    shares: string[];
    days: number | null;
    bytes: number | null;
    order: 'oldest' | 'largest';
    extensions: string[];
    keep_larger: number | null;
    keep_smaller: number | null;
}

export interface CleanFile {
    share: string;
    path: string;
    bytes: number;
    since: string;
    rule?: string;
}

export interface CleanPreview {
    complete: boolean;
    remove: { count: number; bytes: number };
    keep: { count: number; bytes: number };
    removed: CleanFile[];
    kept: CleanFile[];
    /** What could not be looked at, in English. */
    problems?: string[];
}

export interface Revision {
    revision: number;
    /** Whether one is alive. */
    scheduler: boolean;
}

export function listShares(signal?: AbortSignal) {
    return call<{ shares: Share[] }>(API, 'shares', {}, signal);
}

export function listOwners(signal?: AbortSignal) {
    return call<{ owners: string[] }>(API, 'owners', {}, signal);
}

export function readTexts(signal?: AbortSignal) {
    return call<{ language: string; texts: Catalogue }>(API, 'texts', {}, signal);
}

export function readInfo(signal?: AbortSignal) {
    return call<ApplianceInfo>(API, 'info', {}, signal);
}

export function readRevision(signal?: AbortSignal) {
    return call<Revision>(API, 'revision', {}, signal);
}

export function previewClean(rules: CleanRules, signal?: AbortSignal) {
    return call<CleanPreview>(API, 'clean_preview', rules, signal);
}
