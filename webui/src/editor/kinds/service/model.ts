import { collect, type Problems } from '../../problems';

export interface Service {
    type: 'service' | 'package';
    id: string;
    name: string;
    enable: boolean;
}

export interface ServiceForm {
    action: 'start' | 'stop';
    services: Service[];
}

export function serviceForm(extra: unknown): ServiceForm {
    const { action, services } = (extra ?? {}) as { action?: unknown; services?: unknown };
    return {
        action: action === 'start' ? 'start' : 'stop',
        services: Array.isArray(services) ? (services as Service[]) : [],
    };
}

/** Only choices are sent: the appliance knows the services, and takes none that it does not offer. */
export function serviceExtra(form: ServiceForm): unknown {
    return {
        action: form.action,
        services: form.services.map(({ id, enable }) => ({ id, enable })),
    };
}

export function serviceProblems(form: ServiceForm): Problems {
    const some = form.services.some((service) => service.enable);
    return collect({ 'extra.services': some ? undefined : { key: 'problem.services' } });
}

/** Where the appliance's catalogue names a built-in service. */
const NAMES: Record<string, readonly [section: string, key: string, addition?: string]> = {
    Samba: ['network', 'wnds_file_service'],
    AFP: ['network', 'apple_subject'],
    NFS: ['nfs', 'nfs_title'],
    BonjourPrinter: ['network', 'bonjourPrinter_subject'],
    AutoBlock: ['tree', 'leaf_autoblock'],
    FTPES: ['tree', 'leaf_ftpes'],
    SFTP: ['tree', 'leaf_sftp'],
    FTP: ['tree', 'leaf_ftp'],
    WebDeck: ['tree', 'leaf_service'],
    SecureWebDAV: ['tree', 'leaf_webdav', ' (HTTPS)'],
    WebDAV: ['tree', 'leaf_webdav'],
    SecureFileDeck: ['tree', 'leaf_filedeck', ' (HTTPS)'],
    FileDeck: ['tree', 'leaf_filedeck'],
    NTP: ['time', 'ntp_service'],
};

export function serviceName(
    service: Service,
    catalogue: (section: string, key: string) => string | null,
): string {
    const place = service.type === 'service' ? NAMES[service.id] : undefined;
    const text = place && catalogue(place[0], place[1]);
    return text ? text + (place[2] ?? '') : service.name;
}
