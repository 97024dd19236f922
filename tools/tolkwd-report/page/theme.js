// Light or dark: as the system has it, until somebody chooses. The choice is kept where the browser
// lets a page from a disk keep something.

const kThemeKey = 'tolkwd-report-theme';

function storedtheme() {
    try {
        return localStorage.getItem(kThemeKey);
    } catch {
        return null;
    }
}

function storetheme(theme) {
    try {
        localStorage.setItem(kThemeKey, theme);
    } catch {
        // It lasts as long as the page then.
    }
}

function followtheme(choices) {
    const system = matchMedia('(prefers-color-scheme: dark)');
    const buttons = [...choices.querySelectorAll('input')];
    const apply = () => {
        const {value} = buttons.find(({checked}) => checked);
        const dark = value === 'system' ? system.matches : value === 'dark';
        document.documentElement.dataset.theme = dark ? 'dark' : 'light';
    };
    const stored = buttons.find(({value}) => value === storedtheme());
    if (stored) {
        stored.checked = true;
    }
    system.addEventListener('change', apply);
    choices.addEventListener('change', (event) => {
        storetheme(event.target.value);
        apply();
    });
    apply();
}
