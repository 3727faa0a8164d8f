import {
    Button,
    Masthead,
    MastheadBrand,
    MastheadContent,
    MastheadLogo,
    MastheadMain,
    Nav,
    NavItem,
    NavList,
    Page,
    PageSection,
    SkipToContent,
    Toolbar,
    ToolbarContent,
    ToolbarGroup,
    ToolbarItem,
} from '@patternfly/react-core';
import ClockIcon from '@patternfly/react-icons/dist/esm/icons/clock-icon';
import OutlinedSignOutIcon from '@patternfly/react-icons/dist/esm/icons/sign-out-alt-icon';
import { type MouseEvent, useEffect, useState } from 'react';

import { useLive } from '../live/live';
import { useTexts } from '../texts/TextsProvider';
import { CurrentView } from './CurrentView';
import { Preferences } from './Preferences';
import { useRoute } from './route';
import { Notice } from '../ui/Notice';

const MAIN = 'main';

/** What a lost connection or a scheduler that does not run means for the person in front. */
function Notices() {
    const { t } = useTexts();
    const { online, info } = useLive();
    return (
        <div aria-live="polite">
            {!online && (
                <Notice variant="danger" title={t('notice.offline')}>
                    {t('notice.offlineBody')}
                </Notice>
            )}
            {online && info?.scheduler === false && (
                <Notice variant="warning" title={t('notice.noScheduler')}>
                    {t('notice.noSchedulerBody')}
                </Notice>
            )}
        </div>
    );
}

function Sections() {
    const { t } = useTexts();
    const section = useRoute().path[0] ?? 'tasks';
    return (
        <Nav variant="horizontal" aria-label={t('nav.label')}>
            <NavList>
                <NavItem to="#/tasks" isActive={section === 'tasks'}>
                    {t('nav.tasks')}
                </NavItem>
                <NavItem to="#/history" isActive={section === 'history'}>
                    {t('nav.history')}
                </NavItem>
            </NavList>
        </Nav>
    );
}

function Header({ onLeave }: { onLeave(): void }) {
    const { t } = useTexts();
    const { info } = useLive();
    return (
        <Masthead>
            <MastheadMain>
                <MastheadBrand>
                    <MastheadLogo component="a" href="#/tasks" className="orva-logo">
                        <ClockIcon aria-hidden />
                        <span>{info?.name ?? t('app.title')}</span>
                    </MastheadLogo>
                </MastheadBrand>
            </MastheadMain>
            <MastheadContent>
                <Toolbar isStatic className="orva-masthead">
                    <ToolbarContent>
                        <ToolbarItem>
                            <Sections />
                        </ToolbarItem>
                        <ToolbarGroup align={{ default: 'alignEnd' }} gap={{ default: 'gapNone' }}>
                            <Preferences />
                            <Button
                                variant="plain"
                                icon={<OutlinedSignOutIcon />}
                                title={t('action.signOut')}
                                aria-label={t('action.signOut')}
                                onClick={onLeave}
                            />
                        </ToolbarGroup>
                    </ToolbarContent>
                </Toolbar>
            </MastheadContent>
        </Masthead>
    );
}

export function Shell({ onLeave }: { onLeave(): void }) {
    const { t, language } = useTexts();
    const { info } = useLive();
    const [title, setTitle] = useState('');

    useEffect(() => {
        document.title = [title, info?.name ?? t('app.title')].filter(Boolean).join(' · ');
    }, [title, info?.name, language, t]);

    // The fragment is the page's address, so the link moves the focus itself.
    const skip = (event: MouseEvent) => {
        event.preventDefault();
        document.getElementById(MAIN)?.focus();
    };

    return (
        <Page
            masthead={<Header onLeave={onLeave} />}
            mainContainerId={MAIN}
            mainTabIndex={-1}
            skipToContent={
                <SkipToContent href={`#${MAIN}`} onClick={skip}>
                    {t('nav.skip')}
                </SkipToContent>
            }
        >
            <PageSection hasBodyWrapper={false} isFilled className="orva-section">
                <Notices />
                <CurrentView onTitle={setTitle} />
            </PageSection>
        </Page>
    );
}
