import { type ChildProcess, execFileSync, spawn } from 'node:child_process';
import {
    appendFileSync,
    cpSync,
    mkdirSync,
    mkdtempSync,
    readFileSync,
    rmSync,
    writeFileSync,
} from 'node:fs';
import { tmpdir } from 'node:os';
import { join } from 'node:path';
import { createInterface } from 'node:readline';

import { sourceFolder, stageFolder } from './places';

const READY_MS = 30_000;
// One with clock changes, whatever the machine's is.
const ENVIRONMENT = { ...process.env, TZ: 'Europe/Berlin' };

export interface Call {
    success: boolean;
    data: object;
    error?: { code: number; details: unknown };
}

/** Waits for a line of the process's output that matches; gives the match. */
function lineOf(child: ChildProcess, pattern: RegExp): Promise<RegExpExecArray> {
    return new Promise((resolve, reject) => {
        const timer = setTimeout(() => reject(new Error(`no line ${pattern}`)), READY_MS);
        if (!child.stdout) {
            return;
        }
        createInterface({ input: child.stdout }).on('line', (line) => {
            const match = pattern.exec(line);
            if (match) {
                clearTimeout(timer);
                resolve(match);
            }
        });
        child.once('exit', (status) => {
            clearTimeout(timer);
            reject(new Error(`${child.spawnfile} ended with ${status}`));
        });
    });
}

function ended(child: ChildProcess | undefined): Promise<void> {
    return new Promise((resolve) => {
        if (!child || child.exitCode !== null || child.signalCode !== null) {
            resolve();
            return;
        }
        child.once('exit', () => resolve());
        child.kill('SIGTERM');
    });
}

/** An appliance in a folder of its own: store, scheduler, web-API server. */
export class Appliance {
    readonly root = mkdtempSync(join(tmpdir(), 'orva-page-'));
    url = '';
    private server: ChildProcess | undefined;
    private scheduler: ChildProcess | undefined;
    private port = '0';
    private tls: string[] = [];

    constructor() {
        cpSync(stageFolder, this.root, { recursive: true, verbatimSymlinks: true });
        for (const folder of ['usr/orva/etc', 'usr/orva/var', 'usr/orva/packages', 'run/orva']) {
            mkdirSync(join(this.root, folder), { recursive: true });
        }
        cpSync(join(sourceFolder, 'example/root'), this.root, { recursive: true });
    }

    private program(name: string): string {
        return join(this.root, 'usr/orva/bin', name);
    }

    /** Puts tasks into the store, from a file or as the documents that it would hold. */
    fill(tasks: string | object[]): void {
        const file = typeof tasks === 'string' ? tasks : join(this.root, 'import.json');
        if (typeof tasks !== 'string') {
            writeFileSync(file, JSON.stringify(tasks));
        }
        execFileSync(this.program('orvaschedtool'), ['--root', this.root, '--import', file]);
    }

    /** Lines for the appliance's settings, before it starts. */
    configure(lines: string): void {
        appendFileSync(join(this.root, 'usr/orva/etc/orva.conf'), lines);
    }

    /** Serves by TLS from the next start of the server on, with a certificate that nobody has signed. */
    useTls(): void {
        const [key, certificate] = ['key.pem', 'cert.pem'].map((name) => join(this.root, name));
        const made = ['req', '-x509', '-newkey', 'ec', '-pkeyopt', 'ec_paramgen_curve:P-256', '-nodes'];
        const subject = ['-subj', '/CN=127.0.0.1', '-addext', 'subjectAltName=IP:127.0.0.1'];
        execFileSync(
            'openssl',
            [...made, ...subject, '-days', '2', '-keyout', key ?? '', '-out', certificate ?? ''],
            { stdio: 'ignore' },
        );
        this.tls = ['--tls-cert', certificate ?? '', '--tls-key', key ?? ''];
    }

    fillWithExample(): void {
        this.fill(join(sourceFolder, 'example/tasks.json'));
    }

    async start(): Promise<void> {
        await this.startScheduler();
        await this.startServer();
    }

    async startScheduler(): Promise<void> {
        this.scheduler = spawn(this.program('orva-schedd'), ['--root', this.root], {
            stdio: ['ignore', 'pipe', 'inherit'],
            env: ENVIRONMENT,
        });
        await lineOf(this.scheduler, /^scheduling/);
    }

    async startServer(): Promise<void> {
        const listen = `127.0.0.1:${this.port}`;
        this.server = spawn(
            this.program('orva-webapid'),
            ['--root', this.root, '--listen', listen, ...this.tls],
            { stdio: ['ignore', 'pipe', 'ignore'], env: ENVIRONMENT },
        );
        const [, url = ''] = await lineOf(this.server, /^listening on (\S+)$/);
        this.url = url;
        this.port = new URL(url).port;
    }

    stopServer(): Promise<void> {
        return ended(this.server);
    }

    stopScheduler(): Promise<void> {
        return ended(this.scheduler);
    }

    async stop(): Promise<void> {
        await Promise.all([ended(this.server), ended(this.scheduler)]);
        rmSync(this.root, { recursive: true, force: true });
    }

    get token(): string {
        return readFileSync(join(this.root, 'usr/orva/etc/webapi.token'), 'utf8').trim();
    }

    /** A link that signs a browser in, once. */
    link(): string {
        const output = execFileSync(
            this.program('orva-webapid'),
            [
                '--root',
                this.root,
                '--listen',
                `127.0.0.1:${this.port}`,
                '--new-sign-in-link',
                ...this.tls,
            ],
            { encoding: 'utf8' },
        );
        const link = /http\S+#code=\S+/.exec(output)?.[0];
        if (!link) {
            throw new Error(`no link in: ${output}`);
        }
        return link;
    }

    /** A call by another client than the browser. */
    async call(method: string, parameters: object, api = 'TaskScheduler'): Promise<Call> {
        const response = await fetch(`${this.url}/webapi/ORVA.Core.${api}/1/${method}`, {
            method: 'POST',
            headers: {
                Authorization: `Bearer ${this.token}`,
                'Content-Type': 'application/json',
            },
            body: JSON.stringify(parameters),
        });
        return (await response.json()) as Call;
    }

    /** Makes a script task; gives its id. */
    async script(name: string, script: string, more: object = {}): Promise<number> {
        const answer = await this.call('create', {
            type: 'script',
            name,
            enable: true,
            owner: 'root',
            schedule: { hour: 3, minute: 0 },
            extra: { script },
            ...more,
        });
        if (!answer.success) {
            throw new Error(JSON.stringify(answer));
        }
        return (answer.data as { id: number }).id;
    }
}
