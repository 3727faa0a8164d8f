import { Pagination } from '@patternfly/react-core';

import { useTexts } from '../texts/TextsProvider';

interface Props {
    total: number;
    page: number;
    perPage: number;
    choices: readonly number[];
    variant: 'top' | 'bottom';
    onPage(page: number): void;
    onPerPage(perPage: number): void;
}

export function Pages({ total, page, perPage, choices, variant, onPage, onPerPage }: Props) {
    const { t, format } = useTexts();
    return (
        <Pagination
            variant={variant}
            isCompact={variant === 'top'}
            widgetId={`pages-${variant}`}
            itemCount={total}
            page={page}
            perPage={perPage}
            onSetPage={(_event, next) => onPage(next)}
            onPerPageSelect={(_event, next) => onPerPage(next)}
            perPageOptions={choices.map((count) => ({ title: String(count), value: count }))}
            toggleTemplate={({ firstIndex, lastIndex, itemCount }) => (
                <>
                    {t('pages.range', {
                        first: format.number(firstIndex ?? 0),
                        last: format.number(lastIndex ?? 0),
                        total: format.number(itemCount ?? 0),
                    })}
                </>
            )}
            titles={{
                items: '',
                page: '',
                pages: '',
                itemsPerPage: t('pages.perPage'),
                perPageSuffix: t('pages.suffix'),
                toFirstPageAriaLabel: t('pages.first'),
                toPreviousPageAriaLabel: t('pages.previous'),
                toLastPageAriaLabel: t('pages.last'),
                toNextPageAriaLabel: t('pages.next'),
                optionsToggleAriaLabel: '',
                currPageAriaLabel: t('pages.current'),
                paginationAriaLabel: t(`pages.${variant}`),
                ofWord: t('pages.of'),
            }}
        />
    );
}
