import { useState, type ReactNode } from 'react';
import { i18n } from '@lingui/core';
import {
  Button,
  FormSelect,
  FormSelectOption,
  Label,
  Masthead,
  MastheadBrand,
  MastheadContent,
  MastheadMain,
  MastheadToggle,
  Nav,
  NavItem,
  NavList,
  Page,
  PageSidebar,
  PageSidebarBody,
  PageToggleButton,
  SkipToContent,
  Toolbar,
  ToolbarContent,
  ToolbarGroup,
  ToolbarItem,
} from '@patternfly/react-core';
import BarsIcon from '@patternfly/react-icons/dist/esm/icons/bars-icon';
import MoonIcon from '@patternfly/react-icons/dist/esm/icons/moon-icon';
import SunIcon from '@patternfly/react-icons/dist/esm/icons/sun-icon';
import { useMutation, useQueryClient } from '@tanstack/react-query';
import { choose, languages, type Language } from './locale';
import { pages } from './pages';
import { signOut, useSession, WHO } from './session/session';
import { linkTo, partsOf, usePath } from './shared/router';
import { useSampling } from './traffic/sampling';

const DARK = 'pf-v6-theme-dark';

function ThemeButton() {
  const [dark, setDark] = useState(document.documentElement.classList.contains(DARK));
  const change = () => {
    document.documentElement.classList.toggle(DARK, !dark);
    localStorage.setItem('theme', dark ? 'light' : 'dark');
    setDark(!dark);
  };
  return (
    <Button
      variant="plain"
      icon={dark ? <SunIcon /> : <MoonIcon />}
      aria-label={dark ? i18n._('Light colours') : i18n._('Dark colours')}
      onClick={change}
    />
  );
}

function LanguageSelect() {
  return (
    <FormSelect
      className="language"
      aria-label={i18n._('Language')}
      value={i18n.locale}
      onChange={(_event, value) => void choose(value as Language)}
    >
      {Object.entries(languages).map(([value, label]) => (
        <FormSelectOption key={value} value={value} label={label} lang={value} />
      ))}
    </FormSelect>
  );
}

/** Who has signed in, in words. */
function useName(): string {
  const { caller } = useSession();
  const [kind, ...name] = caller.caller.split(' ');
  const text = name.join(' ');
  if (caller.caller === 'sign-in link') return i18n._('Administrator (one-time link)');
  if (kind === 'token') return i18n._('Token {name}', { name: text });
  return text || i18n._('Administrator');
}

function SignOut() {
  const client = useQueryClient();
  const { hasSession } = useSession();
  const leave = useMutation({
    mutationFn: signOut,
    onSuccess: () => {
      client.clear();
      client.setQueryData(WHO, null);
      location.hash = '#/';
      location.reload();
    },
  });
  if (!hasSession) return null;
  return (
    <Button
      variant="secondary"
      isLoading={leave.isPending}
      onClick={() => {
        leave.mutate();
      }}
    >
      {i18n._('Sign out')}
    </Button>
  );
}

function Head() {
  const name = useName();
  const { mayWrite } = useSession();
  return (
    <Masthead>
      <MastheadMain>
        <MastheadToggle>
          <PageToggleButton aria-label={i18n._('Navigation')}>
            <BarsIcon />
          </PageToggleButton>
        </MastheadToggle>
        <MastheadBrand>
          <a href="#/" className="brand">
            {i18n._('Storage console')}
          </a>
        </MastheadBrand>
      </MastheadMain>
      <MastheadContent>
        <Toolbar isStatic>
          <ToolbarContent>
            <ToolbarGroup align={{ default: 'alignEnd' }}>
              <ToolbarItem>
                <ThemeButton />
              </ToolbarItem>
              <ToolbarItem>
                <LanguageSelect />
              </ToolbarItem>
              <ToolbarItem className="who">
                {name} {!mayWrite && <Label isCompact>{i18n._('Reader')}</Label>}
              </ToolbarItem>
              <ToolbarItem>
                <SignOut />
              </ToolbarItem>
            </ToolbarGroup>
          </ToolbarContent>
        </Toolbar>
      </MastheadContent>
    </Masthead>
  );
}

function Navigation() {
  const [shown = ''] = partsOf(usePath());
  return (
    <PageSidebar>
      <PageSidebarBody>
        <Nav aria-label={i18n._('Pages')}>
          <NavList>
            {pages.map(({ name, title }) => (
              <NavItem key={name} isActive={name === shown} to={name ? linkTo(name) : '#/'}>
                {i18n._(title)}
              </NavItem>
            ))}
          </NavList>
        </Nav>
      </PageSidebarBody>
    </PageSidebar>
  );
}

/** Head, navigation and main part of every page. */
export function Shell({ children }: { children: ReactNode }) {
  useSampling();
  const skip = (event: React.MouseEvent) => {
    event.preventDefault();
    document.getElementById('main')?.focus();
  };
  return (
    <Page
      isManagedSidebar
      masthead={<Head />}
      sidebar={<Navigation />}
      mainContainerId="main"
      mainTabIndex={0}
      skipToContent={
        <SkipToContent href="#main" onClick={skip}>
          {i18n._('Skip to the content')}
        </SkipToContent>
      }
    >
      {children}
    </Page>
  );
}
