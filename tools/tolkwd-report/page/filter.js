// Which services are shown: those whose name has a text in it and that are now in a certain state.

class Filter {
    // `changed` is called when others are to be shown.
    constructor({name, states}, services, changed) {
        this.states = new Set();
        this.text = '';
        this.name = name;
        this.chips = states;
        this.changed = changed;
        const counts = new Map();
        for (const {now: {word}} of services) {
            counts.set(word, (counts.get(word) ?? 0) + 1);
        }
        Object.keys(kLooks).reverse().filter((word) => counts.has(word))
            .forEach((word) => states.append(this.chip(word, counts.get(word))));
        name.addEventListener('input', () => {
            this.text = name.value.trim().toLowerCase();
            changed();
        });
    }

    chip(word, count) {
        const button = element('button', 'chip');
        button.type = 'button';
        button.dataset.state = word;
        button.setAttribute('aria-pressed', 'false');
        button.append(swatch(word, false), element('span', '', word),
            element('b', '', counttext(count)));
        button.addEventListener('click', () => this.toggle(button, word));
        return button;
    }

    toggle(button, word) {
        if (!this.states.delete(word)) {
            this.states.add(word);
        }
        button.setAttribute('aria-pressed', String(this.states.has(word)));
        this.changed();
    }

    clear() {
        this.states.clear();
        this.text = '';
        this.name.value = '';
        for (const button of this.chips.children) {
            button.setAttribute('aria-pressed', 'false');
        }
        this.changed();
    }

    get idle() {
        return this.states.size === 0 && this.text === '';
    }

    chosen(services) {
        return services.filter(({folded, now}) => folded.includes(this.text) &&
            (this.states.size === 0 || this.states.has(now.word)));
    }
}
